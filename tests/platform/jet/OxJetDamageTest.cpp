// Damaged copies of the shared files: truncated, with bytes flipped, with rows broken on
// purpose. Each read runs in a child process with a time limit, so a hang or a crash fails
// the test instead of stopping the suite.
#include <gtest/gtest.h>

#include <algorithm>
#include <random>

#include "JetTestTools.h"
#include "platform/core/OxText.h"
#include "platform/jet/OxJetUsageMap.h"
#include "support/TestSupport.h"

namespace {
constexpr auto kLimit = std::chrono::seconds(20);  // generous for sanitizer builds

std::vector<uint8_t> bytesOf(const std::filesystem::path& path) {
    const std::string s = OxTest::readFile(path);
    return std::vector<uint8_t>(s.begin(), s.end());
}

// Opens the copy and reads every definition and row of every table, both ways of
// treating bad rows; whatever fails must fail with a message.
void readEverything(const std::vector<uint8_t>& bytes) {
    for (OxJetBadRows policy : {OxJetBadRows::Fail, OxJetBadRows::Skip}) {
        OxJetOpenOptions options;
        options.badRows = policy;
        std::wstring error;
        auto db = OxJetDatabase::openBuffer(bytes, options, error);
        if (!db) {
            if (error.empty())
                std::_Exit(3);
            continue;
        }
        for (const auto& e : db->catalog()) {
            auto def = db->tableDef(e, error);
            if (!def)
                continue;
            auto cursor = db->openCursor(def);
            size_t texts = 0;
            while (cursor->next())
                for (const auto& v : cursor->values()) texts += v.toText().size();
            if (cursor->failed() && cursor->error().empty())
                std::_Exit(4);
            (void)texts;
        }
    }
}

void expectSurvives(const std::vector<uint8_t>& bytes, const std::string& what) {
    const auto r = JetTest::runInChild([&] { readEverything(bytes); }, kLimit);
    EXPECT_EQ(r.outcome, JetTest::ChildOutcome::Finished)
        << what << (r.outcome == JetTest::ChildOutcome::TimedOut ? ": hangs" : ": crashes")
        << " (status " << r.status << ")";
}

std::vector<std::filesystem::path> readableFiles() {
    std::vector<std::filesystem::path> files;
    for (const auto& f : JetTest::accessFiles())
        if (f.filename() != "ace14_db2007-enc.accdb")
            files.push_back(f);
    return files;
}

TEST(OxJetDamage, TruncatedCopiesNeitherCrashNorHang) {
    for (const auto& path : readableFiles()) {
        const auto bytes = bytesOf(path);
        const size_t page = bytes[0x14] == 0 ? 2048 : 4096;
        for (size_t cut : {page * 3 + 100, bytes.size() / 4, bytes.size() / 2, bytes.size() * 3 / 4,
                           bytes.size() - page / 2, bytes.size() - 1}) {
            if (cut >= bytes.size())
                continue;
            expectSurvives(std::vector<uint8_t>(bytes.begin(), bytes.begin() + long(cut)),
                           path.filename().string() + " cut at " + std::to_string(cut));
        }
    }
}

TEST(OxJetDamage, FlippedBytesNeitherCrashNorHang) {
    for (const auto& path : readableFiles()) {
        const auto bytes = bytesOf(path);
        const size_t page = bytes[0x14] == 0 ? 2048 : 4096;
        std::mt19937 random(static_cast<unsigned>(bytes.size()));
        for (int variant = 0; variant < 6; ++variant) {
            auto copy = bytes;
            // Half the variants hit the catalog's and the first tables' definitions, where
            // one byte changes every size that follows.
            const size_t from = variant % 2 ? page : page * 2;
            const size_t span = variant % 2 ? copy.size() - page : page * 8;
            for (int n = 0; n < 40; ++n) {
                const size_t at = from + random() % std::min(span, copy.size() - from);
                copy[at] = static_cast<uint8_t>(random());
            }
            expectSurvives(copy, path.filename().string() + " variant " + std::to_string(variant));
        }
    }
}

// The pages of a table's rows, from the file itself.
std::vector<uint32_t> dataPages(const OxJetDatabase& db, const std::wstring& table,
                                const std::filesystem::path& path) {
    std::wstring error;
    auto def = db.tableDef(table, error);
    EXPECT_TRUE(def);
    auto file = OxJetPageFile::openFile(path.string());
    return OxJetUsageMap::pages(*file, def->ownedPagesMap).pages;
}

size_t readRows(const std::vector<uint8_t>& bytes, OxJetBadRows policy,
                std::unique_ptr<OxJetRowCursor>& cursor) {
    OxJetOpenOptions options;
    options.badRows = policy;
    std::wstring error;
    auto db = OxJetDatabase::openBuffer(bytes, options, error);
    EXPECT_TRUE(db) << OxText::toUtf8(error);
    if (!db)
        return 0;
    auto def = db->tableDef(L"data", error);
    EXPECT_TRUE(def) << OxText::toUtf8(error);
    if (!def)
        return 0;
    cursor = db->openCursor(def);
    size_t rows = 0;
    while (cursor->next()) ++rows;
    return rows;
}

TEST(OxJetDamage, LostPagesAreReportedNotDropped) {
    const auto path = JetTest::accessFile("ace14_testEmoticonsV2010.accdb");
    auto db = JetTest::open(path);
    ASSERT_TRUE(db);
    std::wstring error;
    auto def = db->tableDef(L"data", error);
    ASSERT_TRUE(def);
    const auto pages = dataPages(*db, L"data", path);
    ASSERT_FALSE(pages.empty());
    const auto bytes = bytesOf(path);
    std::unique_ptr<OxJetRowCursor> cursor;

    // Cut before the table's last pages: whichever policy, the reader says so.
    auto cut = bytes;
    cut.resize(pages.back() * 4096ull);
    for (auto policy : {OxJetBadRows::Fail, OxJetBadRows::Skip}) {
        const size_t rows = readRows(cut, policy, cursor);
        ASSERT_TRUE(cursor);
        EXPECT_LT(rows, 80u);
        const bool reported = cursor->failed() || cursor->skippedPages() > 0;
        EXPECT_TRUE(reported);
        const std::wstring why = cursor->failed() ? cursor->error() : cursor->firstSkipReason();
        EXPECT_NE(why.find(L"past the end"), std::wstring::npos) << OxText::toUtf8(why);
    }

    // A map bit for a page the file does not hold.
    auto marked = bytes;
    const uint32_t mapPage = def->ownedPagesMap >> 8;
    uint8_t* page = marked.data() + mapPage * 4096ull;
    const uint32_t row = def->ownedPagesMap & 0xFF;
    const uint16_t start = (page[14 + 2 * row] | page[15 + 2 * row] << 8) & 0x1FFF;
    const uint32_t word = page[start + 1] | page[start + 2] << 8 | page[start + 3] << 16;
    if (page[start] == 0) {  // inline: start page, then the bits
        const size_t bit = marked.size() / 4096 + 5 - word;
        page[start + 5 + bit / 8] |= static_cast<uint8_t>(1u << (bit % 8));
    } else {  // the first bitmap page covers the first pages of the file
        const size_t bit = marked.size() / 4096 + 5;
        marked[word * 4096ull + 4 + bit / 8] |= static_cast<uint8_t>(1u << (bit % 8));
    }
    EXPECT_EQ(readRows(marked, OxJetBadRows::Fail, cursor), 0u);
    EXPECT_TRUE(cursor->failed());
    EXPECT_EQ(readRows(marked, OxJetBadRows::Skip, cursor), 80u);
    EXPECT_EQ(cursor->skippedPages(), 1u);

    // A data page wiped to zeros: its rows are gone, and the cursor counts the page.
    auto wiped = bytes;
    std::fill(wiped.begin() + long(pages.back() * 4096ull),
              wiped.begin() + long((pages.back() + 1) * 4096ull), 0);
    EXPECT_LT(readRows(wiped, OxJetBadRows::Fail, cursor), 80u);
    EXPECT_FALSE(cursor->failed());
    EXPECT_EQ(cursor->strayPages(), 1u);
}

TEST(OxJetDamage, BrokenRowsAreErrorsOrCounted) {
    const auto path = JetTest::accessFile("ace14_testEmoticonsV2010.accdb");
    auto db = JetTest::open(path);
    ASSERT_TRUE(db);
    const auto pages = dataPages(*db, L"data", path);
    ASSERT_FALSE(pages.empty());
    auto bytes = bytesOf(path);
    // The first row's variable-column count now claims more columns than the row holds.
    uint8_t* page = bytes.data() + pages.front() * 4096ull;
    const uint16_t start = (page[14] | page[15] << 8) & 0x1FFF;
    const uint16_t end = 4096;
    const uint16_t cols = page[start] | page[start + 1] << 8;
    const size_t countAt = end - (cols + 7) / 8 - 2;
    page[countAt] = 0xFF;
    page[countAt + 1] = 0x7F;

    std::wstring error;
    auto strict = OxJetDatabase::openBuffer(bytes, {}, error);
    ASSERT_TRUE(strict);
    auto cursor = strict->openCursor(strict->tableDef(L"data", error));
    EXPECT_FALSE(cursor->next());
    EXPECT_TRUE(cursor->failed());
    EXPECT_NE(cursor->error().find(L"damaged row"), std::wstring::npos);

    OxJetOpenOptions skipping;
    skipping.badRows = OxJetBadRows::Skip;
    auto tolerant = OxJetDatabase::openBuffer(bytes, skipping, error);
    auto counted = tolerant->openCursor(tolerant->tableDef(L"data", error));
    size_t rows = 0;
    while (counted->next()) ++rows;
    EXPECT_EQ(rows, 79u);
    EXPECT_EQ(counted->skippedRows(), 1u);
}

TEST(OxJetDamage, LostPropertiesCostOnlyTheProperties) {
    const auto path = JetTest::accessFile("ace14_testV2010.accdb");
    auto db = JetTest::open(path);
    ASSERT_TRUE(db);
    const auto& blob = db->find(L"Table1")->propertyBlob;
    ASSERT_GT(blob.size(), 64u);
    auto bytes = bytesOf(path);
    const auto at = std::search(bytes.begin(), bytes.end(), blob.begin(), blob.begin() + 64);
    ASSERT_NE(at, bytes.end());
    const size_t page = size_t(at - bytes.begin()) / 4096;
    ASSERT_EQ(
        std::string(bytes.begin() + long(page * 4096 + 4), bytes.begin() + long(page * 4096 + 8)),
        "LVAL")
        << "the blob lives on a long-value page";
    bytes[page * 4096] = 0;  // no longer a data page

    std::wstring error;
    auto damaged = OxJetDatabase::openBuffer(bytes, {}, error);
    ASSERT_TRUE(damaged) << OxText::toUtf8(error);
    auto def = damaged->tableDef(L"Table1", error);
    ASSERT_TRUE(def) << OxText::toUtf8(error);
    EXPECT_NE(def->propertyError.find(L"properties"), std::wstring::npos)
        << OxText::toUtf8(def->propertyError);
    EXPECT_FALSE(def->column(L"C")->defaultValue);
    EXPECT_EQ(JetTest::readAll(*damaged, L"Table1").size(), 2u);
}

TEST(OxJetDamage, TruncatedFileOnDisk) {
    OxTest::TempDir dir;
    const std::string bytes = OxTest::readFile(JetTest::accessFile("jet4_queryTestV2003.mdb"));
    OxTest::writeFile(dir.file("cut.mdb"), bytes.substr(0, 30 * 1024 + 7));
    const auto r = JetTest::runInChild(
        [&] {
            std::wstring error;
            auto db = OxJetDatabase::open(dir.wfile("cut.mdb"), {}, error);
            if (db) {
                for (const auto& e : db->catalog())
                    if (auto def = db->tableDef(e, error)) {
                        auto c = db->openCursor(def);
                        while (c->next()) {
                        }
                    }
            } else if (error.empty()) {
                std::_Exit(3);
            }
        },
        kLimit);
    EXPECT_EQ(r.outcome, JetTest::ChildOutcome::Finished);
}
}  // namespace
