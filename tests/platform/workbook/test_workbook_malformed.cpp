// Odd, damaged and hostile files: odd ones read right, broken ones fail clearly.
#include <gtest/gtest.h>

#include <cstring>
#include <random>

#include "WorkbookTestSupport.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookOutputFile.h"
#include "platform/workbook/OxZipWriter.h"
#include "support/TestSupport.h"

using namespace OxWorkbookTest;

namespace {
std::string bof(uint16_t dt) {
    return record(0x0809,
                  le16(0x0600) + le16(dt) + le16(0x0DBB) + le16(0x07CC) + le32(1) + le32(6));
}
std::string cell(uint16_t row, uint16_t col, uint16_t xf) {
    return le16(row) + le16(col) + le16(xf);
}
std::string number(uint16_t row, uint16_t col, double v, uint16_t xf = 0) {
    char b[8];
    std::memcpy(b, &v, 8);
    return record(0x0203, cell(row, col, xf) + std::string(b, 8));
}
std::string xfRecord(uint16_t format) {
    return record(0x00E0, le16(0) + le16(format) + le16(1) + std::string(14, '\0'));
}
std::string format(uint16_t id, const std::string& code) {
    return record(0x041E, le16(id) + le16(static_cast<uint32_t>(code.size())) + '\0' + code);
}

// A BIFF8 workbook stream: globals (with the records given), one sheet of the cells given.
std::string book(const std::string& globals, const std::string& cells, int offsetSkew = 0) {
    const std::string name = "S";
    auto head = [&](uint32_t offset) {
        return bof(0x0005) + globals +
               record(0x0085, le32(offset) + '\0' + '\0' + '\1' + '\0' + name) + record(0x000A, "");
    };
    const uint32_t offset = static_cast<uint32_t>(head(0).size());
    return head(offset + offsetSkew) + bof(0x0010) + cells + record(0x000A, "");
}

std::unique_ptr<OxWorkbookReader> openBytes(const std::string& bytes, OxWorkbookError& error) {
    return OxWorkbookReader::openMemory(bytes, error);
}

std::vector<OxWorkbookRow> readAll(OxWorkbookReader& r, size_t sheet = 0) {
    std::vector<OxWorkbookRow> rows;
    EXPECT_TRUE(r.beginSheet(sheet));
    OxWorkbookRow row;
    while (r.nextRow(row)) rows.push_back(row);
    return rows;
}

// Reads everything; the answer may be an error, never a crash or a hang.
void readEverything(const std::string& bytes) {
    OxWorkbookError error;
    auto r = OxWorkbookReader::openMemory(bytes, error);
    if (!r) {
        EXPECT_TRUE(error) << "a failed open must say why";
        return;
    }
    for (size_t i = 0; i < r->sheetCount(); ++i) {
        OxWorkbookRow row;
        if (r->beginSheet(i))
            while (r->nextRow(row)) {
            }
    }
}

std::string xlsx(const std::vector<std::pair<std::string, std::string>>& parts) {
    OxTest::TempDir dir;
    const auto path = dir.file("p.zip");
    OxWorkbookOutputFile out;
    out.create(path.wstring());
    OxZipWriter zip(out);
    for (const auto& [name, data] : parts) zip.addEntry(name, data);
    zip.finish();
    out.commit();
    return OxTest::readFile(path);
}

const std::string kMain = "http://schemas.openxmlformats.org/spreadsheetml/2006/main";
const std::string kRels = "http://schemas.openxmlformats.org/officeDocument/2006/relationships";

// A package with one sheet part: the workbook, its relationships and the given parts.
std::string package(const std::string& sheetXml, const std::string& extraRels = {},
                    std::vector<std::pair<std::string, std::string>> extra = {},
                    const std::string& workbookPr = {},
                    const std::string& sheetTarget = "worksheets/sheet1.xml") {
    std::vector<std::pair<std::string, std::string>> parts{
        {"_rels/.rels",
         "<Relationships xmlns=\"http://schemas.openxmlformats.org/package/2006/relationships\">"
         "<Relationship Id=\"rId1\" Type=\"" +
             kRels + "/officeDocument\" Target=\"xl/workbook.xml\"/></Relationships>"},
        {"xl/workbook.xml", "<x:workbook xmlns:x=\"" + kMain + "\" xmlns:r=\"" + kRels + "\">" +
                                workbookPr +
                                "<x:sheets><x:sheet name=\"Data\" sheetId=\"1\" r:id=\"rId1\"/>"
                                "</x:sheets></x:workbook>"},
        {"xl/_rels/workbook.xml.rels",
         "<Relationships xmlns=\"http://schemas.openxmlformats.org/package/2006/relationships\">"
         "<Relationship Id=\"rId1\" Type=\"" +
             kRels + "/worksheet\" Target=\"" + sheetTarget + "\"/>" + extraRels +
             "</Relationships>"},
        {"xl/worksheets/sheet1.xml",
         "<worksheet xmlns=\"" + kMain + "\"><sheetData>" + sheetXml + "</sheetData></worksheet>"},
    };
    for (auto& e : extra) parts.push_back(std::move(e));
    return xlsx(parts);
}

std::wstring textAt(const std::vector<OxWorkbookRow>& rows, size_t r, size_t c) {
    return r < rows.size() && c < rows[r].cells.size() ? rows[r].cells[c].text : L"<none>";
}
}  // namespace

TEST(WorkbookXlsOdd, StringTableSplitsAndWrongCounts) {
    // String 0 is cut mid-text by a CONTINUE that switches to UTF-16, after an empty
    // CONTINUE; string 1 has rich-text runs and phonetic data that spill over a record
    // end; the table claims 100 strings but holds 3.
    std::string sst0 = le32(3) + le32(100) + le16(6) + '\0' + "abc";
    std::string cont1 = std::string(1, '\1') + le16(0x0416) + le16(0x0417) + le16('f');
    std::string s1 = le16(2) + '\x0C' + le16(2) + le32(6) + "hi" + std::string(8, 'R') + "PH";
    std::string cont2 = "ONET" + le16(1) + '\0' + "z";
    const std::string globals = record(0x00FC, sst0) + record(0x003C, "") +
                                record(0x003C, cont1 + s1) + record(0x003C, cont2);
    const std::string cells = record(0x00FD, cell(0, 0, 0) + le32(0)) +
                              record(0x00FD, cell(0, 1, 0) + le32(1)) +
                              record(0x00FD, cell(0, 2, 0) + le32(2));
    OxWorkbookError error;
    auto r = openBytes(compoundFile(book(globals, cells)), error);
    ASSERT_TRUE(r) << OxText::toUtf8(error.message());
    const auto rows = readAll(*r);
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(textAt(rows, 0, 0), L"abcЖЗf");
    EXPECT_EQ(textAt(rows, 0, 1), L"hi");
    EXPECT_EQ(textAt(rows, 0, 2), L"z");

    auto bad =
        openBytes(compoundFile(book(globals, record(0x00FD, cell(0, 0, 0) + le32(3)))), error);
    ASSERT_TRUE(bad);
    readAll(*bad);
    EXPECT_EQ(bad->error().code(), OxWorkbookError::Corrupt);
}

TEST(WorkbookXlsOdd, CellRecordsFormulasAndDates) {
    std::string globals = record(0x0022, le16(1));  // 1904 date system
    globals += format(164, "yyyy\\-mm\\-dd") + format(165, "0.00\"d\"") + format(166, "[h]:mm");
    globals += xfRecord(0) + xfRecord(14) + xfRecord(164) + xfRecord(165) + xfRecord(166);
    auto rk = [](uint32_t v) { return le32(v); };
    std::string cells;
    cells += record(0x027E, cell(0, 0, 0) + rk((1234u << 2) | 2));  // integer
    cells += record(0x027E, cell(0, 1, 0) + rk((1234u << 2) | 3));  // integer / 100
    cells += record(0x00BD, le16(0) + le16(2) + le16(1) + rk((5u << 2) | 2) + le16(0) +
                                rk((6u << 2) | 2) + le16(3));                  // MULRK, cols 2-3
    cells += record(0x0201, cell(0, 4, 0));                                    // BLANK
    cells += record(0x00BE, le16(0) + le16(5) + le16(0) + le16(0) + le16(6));  // MULBLANK
    cells += record(0x0205, cell(1, 0, 0) + '\1' + '\0');                      // TRUE
    cells += record(0x0205, cell(1, 1, 0) + '\x07' + '\1');                    // #DIV/0!
    // Formulas: text (with the STRING record after a shared-formula record), bool,
    // error, empty text, number.
    auto formula = [](uint16_t row, uint16_t col, const std::string& val, uint16_t xf = 0) {
        return record(0x0006, cell(row, col, xf) + val + le16(0) + le32(0) + le16(0));
    };
    const std::string special = le16(0xFFFF);
    cells += formula(2, 0, std::string("\0\0\0\0\0\0", 6) + special);
    cells += record(0x04BC, std::string(10, '\0'));
    cells += record(0x0207, le16(5) + '\0' + "hello");
    cells += formula(2, 1, std::string("\1\0\1\0\0\0", 6) + special);
    cells += formula(2, 2, std::string("\2\0\x2A\0\0\0", 6) + special);
    cells += formula(2, 3, std::string("\3\0\0\0\0\0", 6) + special);
    double d = 40000.5;
    char b[8];
    std::memcpy(b, &d, 8);
    cells += formula(2, 4, std::string(b, 8), 1);
    // Dates by format: built-in, custom, quoted letters (not a date), elapsed time.
    cells += number(3, 0, 40000, 1) + number(3, 1, 40000, 2) + number(3, 2, 40000, 3) +
             number(3, 3, 1.5, 4) + number(3, 4, -5, 1);
    // A chart embedded in the sheet: its records are not cells of the sheet.
    cells += bof(0x0020) + number(3, 7, 99) + record(0x000A, "");
    cells += number(4, 0, 7);
    cells += record(0x0002, le16(4) + le16(1) + std::string(3, '\0') + le16(77));  // INTEGER

    OxWorkbookError error;
    auto r = openBytes(compoundFile(book(globals, cells)), error);
    ASSERT_TRUE(r) << OxText::toUtf8(error.message());
    EXPECT_TRUE(r->info().date1904);
    const auto rows = readAll(*r);
    ASSERT_FALSE(r->error()) << OxText::toUtf8(r->error().message());
    ASSERT_EQ(rows.size(), 5u);
    const auto& r0 = rows[0].cells;
    ASSERT_EQ(r0.size(), 4u);  // formatted blanks are empty
    EXPECT_EQ(r0[0].number, 1234);
    EXPECT_DOUBLE_EQ(r0[1].number, 12.34);
    EXPECT_EQ(r0[2].number, 5);
    EXPECT_EQ(r0[3].column, 3u);
    EXPECT_EQ(rows[1].cells[0].type, OxWorkbookCell::Boolean);
    EXPECT_EQ(rows[1].cells[1].type, OxWorkbookCell::Error);
    EXPECT_EQ(rows[1].cells[1].errorCode(), OxWorkbookCell::ErrDiv0);
    const auto& f = rows[2].cells;
    ASSERT_EQ(f.size(), 5u);
    EXPECT_EQ(f[0].text, L"hello");
    EXPECT_TRUE(f[1].type == OxWorkbookCell::Boolean && f[1].boolean());
    EXPECT_EQ(f[2].errorCode(), OxWorkbookCell::ErrNA);
    EXPECT_TRUE(f[3].type == OxWorkbookCell::Text && f[3].text.empty());
    EXPECT_EQ(f[4].type, OxWorkbookCell::Date);
    const auto& dates = rows[3].cells;
    ASSERT_EQ(dates.size(), 5u);
    EXPECT_EQ(dates[0].type, OxWorkbookCell::Date);
    EXPECT_EQ(dates[1].type, OxWorkbookCell::Date);
    EXPECT_EQ(dates[2].type, OxWorkbookCell::Number);
    EXPECT_EQ(dates[3].type, OxWorkbookCell::Date);
    EXPECT_EQ(dates[4].type, OxWorkbookCell::Number);  // negative: no date
    // 1904 system: serial 40000 is 40000 + 1462 days after 1899-12-30.
    EXPECT_EQ(dates[0].toDateTime(true).serial(), 41462);
    ASSERT_EQ(rows[4].cells.size(), 2u);
    EXPECT_EQ(rows[4].index, 4u);
    EXPECT_EQ(rows[4].cells[1].number, 77);
}

TEST(WorkbookXlsOdd, EncryptionWrongOffsetsAndTruncation) {
    OxWorkbookError error;
    EXPECT_FALSE(openBytes(compoundFile(book(record(0x002F, std::string(6, '\0')), "")), error));
    EXPECT_EQ(error.code(), OxWorkbookError::Encrypted);

    // A BOUNDSHEET offset that misses the sheet: the sheet in that place is read.
    auto r = openBytes(compoundFile(book("", number(0, 0, 1), 7)), error);
    ASSERT_TRUE(r);
    EXPECT_EQ(readAll(*r).size(), 1u);

    const std::string full = book("", number(0, 0, 1) + number(1, 0, 2));
    EXPECT_FALSE(openBytes(compoundFile(full.substr(0, 30)), error));
    EXPECT_EQ(error.code(), OxWorkbookError::Corrupt);
    r = openBytes(compoundFile(full.substr(0, full.size() - 10)), error);
    ASSERT_TRUE(r) << OxText::toUtf8(error.message());
    readAll(*r);
    EXPECT_EQ(r->error().code(), OxWorkbookError::Corrupt);

    EXPECT_FALSE(openBytes(compoundFile(full, L"Other"), error));
    EXPECT_EQ(error.code(), OxWorkbookError::Unsupported);
    EXPECT_FALSE(openBytes("not a workbook at all", error));
    EXPECT_EQ(error.code(), OxWorkbookError::Unsupported);
    EXPECT_FALSE(openBytes("", error));
}

TEST(WorkbookXlsOdd, DamagedContainersFailWithoutHanging) {
    std::string bytes = compoundFile(book("", number(0, 0, 1)));
    // Allocation table entries pointing at themselves: a chain that never ends.
    const uint32_t fatSector = static_cast<uint8_t>(bytes[0x4C]);
    std::string looped = bytes;
    const size_t fat = (fatSector + 1) * 512;
    for (int i = 0; i < 8; ++i) std::memcpy(&looped[fat + 4 * i], le32(i).data(), 4);
    OxWorkbookError error;
    EXPECT_FALSE(openBytes(looped, error));
    EXPECT_EQ(error.code(), OxWorkbookError::Corrupt) << OxText::toUtf8(error.message());
    // A header that claims a huge allocation table.
    std::string huge = bytes;
    std::memcpy(&huge[0x2C], le32(0x7FFFFFFF).data(), 4);
    EXPECT_FALSE(openBytes(huge, error));
    EXPECT_EQ(error.code(), OxWorkbookError::Corrupt);
    for (size_t cut = 0; cut < bytes.size(); cut += 97) readEverything(bytes.substr(0, cut));
}

TEST(WorkbookXlsxOdd, PackagesWithoutReferencesStylesOrSlashes) {
    // Rows and cells without "r" follow the previous ones; formatted empty cells are
    // empty; texts are inline, formula results, rich runs (phonetic text dropped).
    const std::string sheet =
        "<row><c><v>1</v></c><c s=\"1\"/><c><v>3</v></c></row>"
        "<row r=\"4\"><c r=\"C4\" t=\"str\"><f>A1</f><v>x_x000D_y</v></c><c t=\"b\"><v>1</v></c>"
        "<c t=\"inlineStr\"><is><r><t>ab</t></r><r><t>cd</t></r><rPh><t>PH</t></rPh></is></c>"
        "</row><row><c t=\"e\"><v>#REF!</v></c><c t=\"d\"><v>2021-01-01T12:00:00</v></c>"
        "<c t=\"s\"><v>1</v></c></row>";
    const std::string strings = "<sst xmlns=\"" + kMain +
                                "\"><si><t>zero</t></si><si><r><t>o</t></r><r><t>ne</t></r>"
                                "<rPh sb=\"0\" eb=\"1\"><t>X</t></rPh></si></sst>";
    const std::string rel = "<Relationship Id=\"rId9\" Type=\"" + kRels +
                            "/sharedStrings\" Target=\"/xl\\strings.xml\"/>";
    OxWorkbookError error;
    auto r = openBytes(package(sheet, rel, {{"xl\\strings.xml", strings}},
                               "<x:workbookPr date1904=\"true\"/>", "/xl/worksheets/sheet1.xml"),
                       error);
    ASSERT_TRUE(r) << OxText::toUtf8(error.message());
    EXPECT_TRUE(r->info().date1904);
    const auto rows = readAll(*r);
    ASSERT_FALSE(r->error()) << OxText::toUtf8(r->error().message());
    ASSERT_EQ(rows.size(), 3u);
    EXPECT_EQ(rows[0].index, 0u);
    ASSERT_EQ(rows[0].cells.size(), 2u);
    EXPECT_EQ(rows[0].cells[1].column, 2u);
    EXPECT_EQ(rows[1].index, 3u);
    EXPECT_EQ(rows[1].cells[0].column, 2u);
    EXPECT_EQ(textAt(rows, 1, 0), L"x\ry");
    EXPECT_EQ(rows[1].cells[1].column, 3u);
    EXPECT_EQ(textAt(rows, 1, 2), L"abcd");
    EXPECT_EQ(rows[2].index, 4u);
    EXPECT_EQ(rows[2].cells[0].errorCode(), OxWorkbookCell::ErrRef);
    ASSERT_EQ(rows[2].cells[1].type, OxWorkbookCell::Date);
    EXPECT_EQ(rows[2].cells[1].toDateTime(true).serial(), OxDateTime(2021, 1, 1, 12).serial());
    EXPECT_EQ(textAt(rows, 2, 2), L"one");
}

TEST(WorkbookXlsxOdd, HostileOrBrokenPackagesFailClearly) {
    struct Case {
        const char* what;
        std::string bytes;
        OxWorkbookError::Code code;
    };
    const std::string laughs =
        "<?xml version=\"1.0\"?><!DOCTYPE w [<!ENTITY a \"aaaaaaaaaa\"><!ENTITY b "
        "\"&a;&a;&a;&a;&a;&a;&a;&a;&a;&a;\">]><worksheet xmlns=\"" +
        kMain +
        "\"><sheetData><row><c t=\"inlineStr\"><is><t>&b;</t></is></c></row></sheetData>"
        "</worksheet>";
    const Case cases[] = {
        {"entity expansion", xlsx({{"xl/workbook.xml", laughs}}), OxWorkbookError::Corrupt},
        {"row out of range", package("<row r=\"1048577\"><c><v>1</v></c></row>"),
         OxWorkbookError::Corrupt},
        {"string index out of range", package("<row><c t=\"s\"><v>0</v></c></row>"),
         OxWorkbookError::Corrupt},
        {"no number", package("<row><c><v>12abc</v></c></row>"), OxWorkbookError::Corrupt},
        {"unclosed", package("<row><c><v>1</v></c>"), OxWorkbookError::Corrupt},
        {"no workbook", xlsx({{"a.txt", "hello"}}), OxWorkbookError::Unsupported},
        {"deep nesting", package([] {
             std::string deep;
             for (int i = 0; i < 5000; ++i) deep += "<x>";
             return deep;
         }()),
         OxWorkbookError::Corrupt},
        {"zip signature only", std::string("PK\x03\x04", 4) + std::string(100, 'x'),
         OxWorkbookError::Corrupt},
    };
    for (const auto& c : cases) {
        OxWorkbookError error;
        auto r = openBytes(c.bytes, error);
        if (r) {
            readAll(*r);
            error = r->error();
        }
        EXPECT_EQ(error.code(), c.code) << c.what << ": " << OxText::toUtf8(error.message());
        EXPECT_FALSE(error.message().empty()) << c.what;
    }
}

TEST(WorkbookOdd, MutatedRealFilesNeverCrash) {
    std::mt19937 rng(20240601);
    for (const char* name :
         {"xls/Test_num_double_date_bool_string.xls", "xls/sst_continue.xls",
          "xlsx/Test_num_double_date_bool_string.xlsx", "xlsx/richtext-after-plain.xlsx"}) {
        const std::string original = OxTest::readFile(OxTest::testdata(name));
        for (int round = 0; round < 150; ++round) {
            std::string bytes = original;
            const int flips = 1 + static_cast<int>(rng() % 8);
            for (int i = 0; i < flips; ++i) bytes[rng() % bytes.size()] = static_cast<char>(rng());
            readEverything(bytes);
        }
    }
}

TEST(WorkbookXlsOdd, RowsThatWouldExhaustMemoryAreRefused) {
    // One 60,000-character string, and a row of 400 cells that all show it.
    const size_t length = 60000;
    std::string sst = le32(400) + le32(1) + le16(length) + '\0';
    std::string records;
    size_t done = 0;
    bool first = true;
    while (done < length) {
        const size_t room = 8224 - (first ? sst.size() : 1);
        const size_t n = std::min(room, length - done);
        records += first ? record(0x00FC, sst + std::string(n, 'x'))
                         : record(0x003C, '\0' + std::string(n, 'x'));
        done += n;
        first = false;
    }
    std::string cells;
    for (uint16_t c = 0; c < 400; ++c) cells += record(0x00FD, cell(0, c, 0) + le32(0));
    OxWorkbookError error;
    auto r = openBytes(compoundFile(book(records, cells)), error);
    ASSERT_TRUE(r) << OxText::toUtf8(error.message());
    readAll(*r);
    EXPECT_EQ(r->error().code(), OxWorkbookError::Limit);
}
