// Files we write: read back by us with the same values, and opened by independent readers.
#include <gtest/gtest.h>

#include <cfloat>
#include <cmath>
#include <filesystem>

#include "WorkbookTestSupport.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxCompoundFileReader.h"
#include "platform/workbook/OxWorkbook.h"
#include "platform/workbook/OxWorkbookWriter.h"
#include "support/TestSupport.h"

namespace fs = std::filesystem;
using OxWorkbookTest::run;

namespace {
OxWorkbookRow rowOf(uint32_t index, std::vector<OxWorkbookCell> cells) {
    for (uint32_t c = 0; c < cells.size(); ++c) cells[c].column = c;
    return OxWorkbookRow{index, std::move(cells)};
}

OxWorkbookCell num(double v) {
    return OxWorkbookCell::makeNumber(0, v);
}
OxWorkbookCell text(const std::wstring& v) {
    return OxWorkbookCell::makeText(0, v);
}
OxWorkbookCell date(int y, int m, int d, int h = 0, int mi = 0, int s = 0) {
    return OxWorkbookCell::fromDateTime(0, OxDateTime(y, m, d, h, mi, s));
}

// The awkward values both formats must keep.
OxWorkbook edgeBook() {
    OxWorkbook wb;
    OxWorkbookSheet s;
    s.info.name = L"Edge values";
    s.rows.push_back(
        rowOf(0, {text(L"plain"), text(L"\U0001F600 beyond the BMP \U0001D11E"), text(L"中文 Ж é"),
                  text(L""), text(L"  padded  "), text(L"ctl\x01\x1f end"), text(L"cr\r\nlf"),
                  text(L"tab\there"), text(L"_x0041_ literal"), text(L"a&b<c>\"d'")}));
    s.rows.push_back(rowOf(
        1, {num(DBL_MAX), num(-DBL_MAX), num(DBL_MIN), num(4.9e-324), num(-0.0), num(0.1 + 0.2),
            num(9007199254740993.0), num(1e-300), num(123456789.123456789), num(0)}));
    s.rows.push_back(rowOf(
        2, {date(1900, 1, 1), date(1900, 2, 28), date(1900, 3, 1), date(2009, 5, 7, 11, 1, 2),
            date(9999, 12, 31, 23, 59, 59), OxWorkbookCell::fromDateTime(0, OxDateTime(0.5))}));
    s.rows.push_back(
        rowOf(3, {OxWorkbookCell::makeBoolean(0, true), OxWorkbookCell::makeBoolean(0, false),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrNull),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrDiv0),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrValue),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrRef),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrName),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrNum),
                  OxWorkbookCell::makeError(0, OxWorkbookCell::ErrNA)}));
    // Dates no 1900-system date can show stay numbers (the platform serial).
    s.rows.push_back(
        rowOf(4, {date(1850, 6, 1), date(1899, 12, 31), OxWorkbookCell::makeDate(0, 3000000.5)}));
    std::wstring wide;
    while (wide.size() < 32767) wide += L"Жé";
    wide.resize(32767);
    std::wstring pairs;
    for (int i = 0; i < 16383; ++i) pairs += L"\U0001F600";
    pairs += L"a";  // 32,767 UTF-16 units
    s.rows.push_back(rowOf(6, {text(std::wstring(32767, L'x')), text(wide), text(pairs)}));
    wb.sheets.push_back(s);

    OxWorkbookSheet empty;
    empty.info.name = L"Empty";
    wb.sheets.push_back(empty);

    OxWorkbookSheet many;
    many.info.name = L"abcdefghijklmnopqrstuvwxyz01234";  // 31 characters
    many.info.visibility = OxWorkbookSheetInfo::Hidden;
    for (uint32_t r = 0; r < 3000; ++r) {
        std::wstring t = std::to_wstring(r) + L":";
        t += std::wstring(r % 300, r % 2 ? L'Ж' : L'q');
        many.rows.push_back(rowOf(r, {text(t), text(L"repeated"), num(r)}));
    }
    wb.sheets.push_back(many);

    OxWorkbookSheet named;
    named.info.name = L"Unicodé Ж \U0001F600 it's";
    named.info.visibility = OxWorkbookSheetInfo::VeryHidden;
    named.rows.push_back(rowOf(65535 - 1, {num(1)}));
    named.rows.back().cells[0].column = 255;
    wb.sheets.push_back(named);
    return wb;
}

// What reading the edge book back must give: dates out of range come back as numbers.
OxWorkbook expectedBack(OxWorkbook wb) {
    for (auto& s : wb.sheets)
        for (auto& r : s.rows)
            for (auto& c : r.cells) {
                double platform = 0;
                if (c.type == OxWorkbookCell::Date &&
                    !OxWorkbookCell::workbookToPlatformSerial(c.number, false, platform))
                    c.type = OxWorkbookCell::Number;
            }
    return wb;
}

void expectSame(const OxWorkbook& want, const OxWorkbook& got) {
    ASSERT_EQ(got.sheets.size(), want.sheets.size());
    for (size_t i = 0; i < want.sheets.size(); ++i) {
        const auto& w = want.sheets[i];
        const auto& g = got.sheets[i];
        EXPECT_EQ(g.info.name, w.info.name);
        EXPECT_EQ(g.info.visibility, w.info.visibility);
        ASSERT_EQ(g.rows.size(), w.rows.size()) << OxText::toUtf8(w.info.name);
        for (size_t r = 0; r < w.rows.size(); ++r) {
            ASSERT_EQ(g.rows[r].index, w.rows[r].index);
            ASSERT_EQ(g.rows[r].cells.size(), w.rows[r].cells.size());
            for (size_t c = 0; c < w.rows[r].cells.size(); ++c)
                EXPECT_TRUE(g.rows[r].cells[c] == w.rows[r].cells[c])
                    << OxText::toUtf8(w.info.name) << " row " << w.rows[r].index << " col "
                    << w.rows[r].cells[c].column << ": type " << int(g.rows[r].cells[c].type) << " "
                    << g.rows[r].cells[c].number << " '"
                    << OxText::toUtf8(g.rows[r].cells[c].text.substr(0, 40)) << "'";
        }
    }
}

void expectReadersAgree(const fs::path& file) {
    const auto o = OxWorkbookTest::oracle(
        file, file.extension() == ".xls" ? std::string("xlrd") : std::string("openpyxl"));
    ASSERT_TRUE(o.ok) << "the independent reader rejected " << file;
    const auto problems = OxWorkbookTest::compare(file, o);
    std::string text;
    for (size_t i = 0; i < problems.size() && i < 10; ++i) text += "  " + problems[i] + "\n";
    EXPECT_TRUE(problems.empty()) << problems.size() << " differences:\n" << text;
    OxTest::TempDir out;
    const auto ss = run({"ssconvert", "-S", file.string(), (out.path() / "s_%n.csv").string()});
    EXPECT_EQ(ss.status, 0) << "ssconvert rejected " << file;
}

class WorkbookWrite : public testing::TestWithParam<OxWorkbookInfo::Format> {
protected:
    std::string ext() const { return GetParam() == OxWorkbookInfo::Xls ? ".xls" : ".xlsx"; }
};

std::unique_ptr<OxWorkbookWriter> writer(const fs::path& path, OxWorkbookInfo::Format f) {
    OxWorkbookError error;
    auto w = OxWorkbookWriter::create(path.wstring(), f, error);
    EXPECT_TRUE(w) << OxText::toUtf8(error.message());
    return w;
}

std::vector<std::string> filesIn(const fs::path& dir) {
    std::vector<std::string> names;
    for (const auto& e : fs::directory_iterator(dir)) names.push_back(e.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}
}  // namespace

TEST_P(WorkbookWrite, EdgeValuesRoundTripAndOpenElsewhere) {
    OxTest::TempDir dir;
    const fs::path file = dir.file("edge" + ext());
    const OxWorkbook wb = edgeBook();
    OxWorkbookError error;
    ASSERT_TRUE(wb.save(file.wstring(), GetParam(), error)) << OxText::toUtf8(error.message());
    OxWorkbook back;
    ASSERT_TRUE(OxWorkbook::load(file.wstring(), back, error)) << OxText::toUtf8(error.message());
    expectSame(expectedBack(wb), back);
    expectReadersAgree(file);
}

TEST_P(WorkbookWrite, RefusesWhatTheFormatCannotHold) {
    OxTest::TempDir dir;
    const auto f = GetParam();
    auto w = writer(dir.file("a" + ext()), f);
    ASSERT_TRUE(w);
    const uint32_t rows = f == OxWorkbookInfo::Xls ? 65536 : 1048576;
    const uint32_t cols = f == OxWorkbookInfo::Xls ? 256 : 16384;
    EXPECT_EQ(w->maxRows(), rows);
    ASSERT_TRUE(w->addSheet(L"S"));
    OxWorkbookRow last{rows - 1, {OxWorkbookCell::makeNumber(cols - 1, 1)}};
    EXPECT_TRUE(w->writeRow(last)) << OxText::toUtf8(w->error().message());
    ASSERT_TRUE(w->commit());

    struct Case {
        const char* what;
        OxWorkbookRow row;
        OxWorkbookError::Code code;
    };
    const Case cases[] = {
        {"row past the limit", {rows, {num(1)}}, OxWorkbookError::Limit},
        {"column past the limit",
         {0, {OxWorkbookCell::makeNumber(cols, 1)}},
         OxWorkbookError::Limit},
        {"text too long", {0, {text(std::wstring(32768, L'x'))}}, OxWorkbookError::Limit},
        {"text too long in UTF-16",
         {0, {text(std::wstring(16384, L'\U0001F600'))}},
         OxWorkbookError::Limit},
        {"not a number", {0, {num(NAN)}}, OxWorkbookError::Invalid},
        {"infinite", {0, {num(INFINITY)}}, OxWorkbookError::Invalid},
        {"columns out of order",
         {0, {OxWorkbookCell::makeNumber(2, 1), OxWorkbookCell::makeNumber(1, 1)}},
         OxWorkbookError::Invalid},
    };
    for (const auto& c : cases) {
        const fs::path file = dir.file(std::string("bad") + ext());
        auto bad = writer(file, f);
        ASSERT_TRUE(bad->addSheet(L"S"));
        EXPECT_FALSE(bad->writeRow(c.row)) << c.what;
        EXPECT_EQ(bad->error().code(), c.code) << c.what;
        EXPECT_FALSE(bad->commit()) << c.what;
        EXPECT_FALSE(fs::exists(file)) << c.what << ": a failed writer left a file";
    }
    auto order = writer(dir.file("order" + ext()), f);
    ASSERT_TRUE(order->addSheet(L"S"));
    ASSERT_TRUE(order->writeRow({5, {num(1)}}));
    EXPECT_FALSE(order->writeRow({5, {num(2)}}));
    EXPECT_EQ(order->error().code(), OxWorkbookError::Invalid);
    order.reset();
    EXPECT_EQ(filesIn(dir.path()), std::vector<std::string>{"a" + ext()});
}

TEST_P(WorkbookWrite, SheetNamesAndSheetRules) {
    OxTest::TempDir dir;
    auto w = writer(dir.file("n" + ext()), GetParam());
    ASSERT_TRUE(w->addSheet(L"Data"));
    for (const wchar_t* bad :
         {L"", L"   ", L"a:b", L"a\\b", L"a/b", L"a?b", L"a*b", L"a[b", L"a]b", L"'quoted",
          L"quoted'", L"DATA", L"abcdefghijklmnopqrstuvwxyz012345"}) {
        OxWorkbookError error;
        EXPECT_FALSE(OxWorkbookWriter::checkSheetName(bad, {L"Data"}, error))
            << OxText::toUtf8(bad);
        EXPECT_EQ(error.code(), OxWorkbookError::Invalid);
    }
    EXPECT_FALSE(w->addSheet(L"a:b"));
    EXPECT_EQ(w->error().code(), OxWorkbookError::Invalid);
    // 30 characters and one beyond the Basic Multilingual Plane: 32 UTF-16 units.
    OxWorkbookError error;
    EXPECT_FALSE(
        OxWorkbookWriter::checkSheetName(std::wstring(30, L'a') + L"\U0001F600", {}, error));

    auto none = writer(dir.file("none" + ext()), GetParam());
    EXPECT_FALSE(none->commit());
    auto hidden = writer(dir.file("hidden" + ext()), GetParam());
    ASSERT_TRUE(hidden->addSheet(L"H", OxWorkbookSheetInfo::Hidden));
    EXPECT_FALSE(hidden->commit());
    EXPECT_EQ(hidden->error().code(), OxWorkbookError::Invalid);
}

TEST_P(WorkbookWrite, ReplacesTheTargetOnlyWhenComplete) {
    OxTest::TempDir dir;
    const fs::path file = dir.file("book" + ext());
    OxTest::writeFile(file, "old content");
    {
        auto w = writer(file, GetParam());
        ASSERT_TRUE(w->addSheet(L"S"));
        ASSERT_TRUE(w->writeRow({0, {num(1)}}));
        EXPECT_EQ(OxTest::readFile(file), "old content");
        // Dropped without commit: the old file stays, the temporary goes.
    }
    EXPECT_EQ(OxTest::readFile(file), "old content");
    EXPECT_EQ(filesIn(dir.path()), std::vector<std::string>{"book" + ext()});
    {
        auto w = writer(file, GetParam());
        ASSERT_TRUE(w->addSheet(L"S"));
        EXPECT_FALSE(w->writeRow({0, {num(NAN)}}));
        EXPECT_FALSE(w->commit());
    }
    EXPECT_EQ(OxTest::readFile(file), "old content");
    auto w = writer(file, GetParam());
    ASSERT_TRUE(w->addSheet(L"S"));
    ASSERT_TRUE(w->writeRow({0, {num(42)}}));
    ASSERT_TRUE(w->commit());
    EXPECT_EQ(filesIn(dir.path()), std::vector<std::string>{"book" + ext()});
    OxWorkbook back;
    OxWorkbookError error;
    ASSERT_TRUE(OxWorkbook::load(file.wstring(), back, error));
    ASSERT_NE(back.sheets[0].cell(0, 0), nullptr);
    EXPECT_EQ(back.sheets[0].cell(0, 0)->number, 42);

    OxWorkbookError e;
    EXPECT_FALSE(
        OxWorkbookWriter::create(dir.file("missing/dir/x" + ext()).wstring(), GetParam(), e));
    EXPECT_EQ(e.code(), OxWorkbookError::Io);
}

INSTANTIATE_TEST_SUITE_P(BothFormats, WorkbookWrite,
                         testing::Values(OxWorkbookInfo::Xls, OxWorkbookInfo::Xlsx),
                         [](const auto& info) {
                             return info.param == OxWorkbookInfo::Xls ? "xls" : "xlsx";
                         });

namespace {
uint16_t u16(const std::string& s, size_t at) {
    return static_cast<uint16_t>(static_cast<uint8_t>(s[at]) | static_cast<uint8_t>(s[at + 1])
                                                                   << 8);
}
uint32_t u32(const std::string& s, size_t at) {
    return u16(s, at) | static_cast<uint32_t>(u16(s, at + 2)) << 16;
}
}  // namespace

// The record structure readers do not all check: sizes, offsets, string-table index.
TEST(WorkbookWriteXls, RecordStructureHoldsTogether) {
    OxTest::TempDir dir;
    const fs::path file = dir.file("s.xls");
    OxWorkbookError error;
    ASSERT_TRUE(edgeBook().save(file.wstring(), OxWorkbookInfo::Xls, error));
    OxWorkbookSource src;
    ASSERT_TRUE(src.openFile(file.wstring(), error));
    OxCompoundFileReader cfb;
    ASSERT_TRUE(cfb.open(src, error));
    std::string s;
    ASSERT_TRUE(cfb.readRootStream(L"Workbook", s, error));

    std::vector<uint32_t> sheetOffsets;
    std::vector<size_t> recordStarts;
    size_t extsst = 0, sst = 0;
    for (size_t p = 0; p + 4 <= s.size();) {
        const uint16_t type = u16(s, p), size = u16(s, p + 2);
        ASSERT_LE(size, 8224u) << "record " << type << " at " << p;
        ASSERT_LE(p + 4 + size, s.size());
        recordStarts.push_back(p);
        if (type == 0x0085)
            sheetOffsets.push_back(u32(s, p + 4));
        if (type == 0x00FC)
            sst = p;
        if (type == 0x00FF)
            extsst = p;
        p += 4 + size;
    }
    ASSERT_EQ(sheetOffsets.size(), 4u);
    for (uint32_t off : sheetOffsets) {
        ASSERT_LT(off + 8u, s.size());
        EXPECT_EQ(u16(s, off), 0x0809) << "BOUNDSHEET offset " << off << " misses a BOF";
        EXPECT_EQ(u16(s, off + 6), 0x0010);
    }
    ASSERT_NE(sst, 0u);
    ASSERT_NE(extsst, 0u);
    // Each index entry points at a string start inside an SST or CONTINUE record.
    const uint16_t size = u16(s, extsst + 2);
    const uint16_t dsst = u16(s, extsst + 4);
    const uint32_t unique = u32(s, sst + 8);
    EXPECT_EQ(dsst, std::max<uint32_t>(unique / 128 + 1, 8));
    EXPECT_EQ((size - 2) / 8u, (unique + dsst - 1) / dsst);
    for (size_t k = 0; k < (size - 2) / 8u; ++k) {
        const uint32_t ib = u32(s, extsst + 6 + 8 * k);
        const uint16_t cb = u16(s, extsst + 10 + 8 * k);
        const size_t rec = ib - cb;
        EXPECT_TRUE(std::find(recordStarts.begin(), recordStarts.end(), rec) != recordStarts.end())
            << "bucket " << k;
        EXPECT_TRUE(u16(s, rec) == 0x00FC || u16(s, rec) == 0x003C) << "bucket " << k;
    }
}

TEST(WorkbookWriteXls, LargeFileNeedsMoreAllocationSectors) {
    // Over 7 MB the compound file's allocation table spills into DIFAT sectors.
    OxTest::TempDir dir;
    const fs::path file = dir.file("big.xls");
    OxWorkbookError error;
    auto w = OxWorkbookWriter::create(file.wstring(), OxWorkbookInfo::Xls, error);
    ASSERT_TRUE(w->addSheet(L"Big"));
    OxWorkbookRow row;
    for (uint32_t r = 0; r < 65536; ++r) {
        row.index = r;
        row.cells.clear();
        for (uint32_t c = 0; c < 7; ++c)
            row.cells.push_back(OxWorkbookCell::makeNumber(c, r * 10.0 + c));
        ASSERT_TRUE(w->writeRow(row));
    }
    ASSERT_TRUE(w->commit()) << OxText::toUtf8(w->error().message());
    EXPECT_GT(fs::file_size(file), 7u << 20);
    const auto check = run({OXQEL_PYTHON3, "-c",
                            "import sys,xlrd; b=xlrd.open_workbook(sys.argv[1], on_demand=True); "
                            "print(b.nsheets)",
                            file.string()});
    EXPECT_EQ(check.status, 0) << "xlrd rejected the container";
    auto r = OxWorkbookReader::open(file.wstring(), error);
    ASSERT_TRUE(r);
    uint32_t rows = 0, cols = 0;
    ASSERT_TRUE(r->sheetExtent(0, rows, cols));
    EXPECT_EQ(rows, 65536u);
    EXPECT_EQ(cols, 7u);
}

TEST(WorkbookWriteXlsx, DatesOfA1904WorkbookKeepTheirDay) {
    OxWorkbook wb;
    wb.date1904 = true;
    OxWorkbookSheet s;
    s.info.name = L"S";
    s.rows.push_back({0, {OxWorkbookCell::makeDate(0, 0), OxWorkbookCell::makeDate(1, 39000.25)}});
    wb.sheets.push_back(s);
    OxTest::TempDir dir;
    for (const char* name : {"d.xls", "d.xlsx"}) {
        const fs::path file = dir.file(name);
        OxWorkbookError error;
        OxWorkbookInfo::Format f;
        ASSERT_TRUE(OxWorkbookWriter::formatFromPath(file.wstring(), f));
        ASSERT_TRUE(wb.save(file.wstring(), f, error));
        OxWorkbook back;
        ASSERT_TRUE(OxWorkbook::load(file.wstring(), back, error));
        EXPECT_FALSE(back.date1904);
        for (uint32_t c = 0; c < 2; ++c)
            EXPECT_EQ(back.sheets[0].cell(0, c)->toDateTime(false).serial(),
                      wb.sheets[0].cell(0, c)->toDateTime(true).serial())
                << name;
    }
}

TEST(WorkbookWriteXls, TinyWorkbookLivesInTheMiniStream) {
    // Readers insist that a workbook stream under 4096 bytes sits in the mini stream.
    OxTest::TempDir dir;
    const fs::path file = dir.file("tiny.xls");
    OxWorkbook wb;
    OxWorkbookSheet s;
    s.info.name = L"T";
    s.rows.push_back(rowOf(0, {text(L"a"), num(1)}));
    wb.sheets.push_back(s);
    OxWorkbookError error;
    ASSERT_TRUE(wb.save(file.wstring(), OxWorkbookInfo::Xls, error));
    OxWorkbookSource src;
    ASSERT_TRUE(src.openFile(file.wstring(), error));
    OxCompoundFileReader cfb;
    ASSERT_TRUE(cfb.open(src, error));
    std::string stream;
    ASSERT_TRUE(cfb.readRootStream(L"Workbook", stream, error));
    EXPECT_LT(stream.size(), 4096u);
    expectReadersAgree(file);
}
