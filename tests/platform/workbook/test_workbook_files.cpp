// Every workbook in the shared test data, read by us and by an independent reader.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>

#include "WorkbookTestSupport.h"
#include "platform/core/OxText.h"
#include "support/TestSupport.h"

namespace fs = std::filesystem;
using OxWorkbookTest::compare;
using OxWorkbookTest::oracle;

namespace {
// Files no reader may read: the error each must give.
struct Refused {
    const char* file;
    OxWorkbookError::Code code;
};
const Refused kRefused[] = {
    {"xls/Test_git_issue_242_std_rc4_pwd_password.xls", OxWorkbookError::Encrypted},
    {"xls/Test_git_issue_242_xor_pwd_password.xls", OxWorkbookError::Encrypted},
    {"xlsx/agile_AES256_SHA512_CBC_pwd_password.xlsx", OxWorkbookError::Encrypted},
    {"xlsx/standard_AES128_SHA1_ECB_pwd_password.xlsx", OxWorkbookError::Encrypted},
    {"xls/as3xls_BIFF2.xls", OxWorkbookError::Unsupported},
    {"xls/as3xls_BIFF3.xls", OxWorkbookError::Unsupported},
    {"xls/as3xls_BIFF4.xls", OxWorkbookError::Unsupported},
};

bool refused(const std::string& rel) {
    return std::any_of(std::begin(kRefused), std::end(kRefused),
                       [&](const Refused& r) { return rel == r.file; });
}

std::vector<std::string> readableFiles() {
    std::vector<std::string> files;
    for (const char* dir : {"xls", "xlsx"}) {
        const fs::path base = fs::path(OXQEL_TESTDATA_DIR) / dir;
        std::error_code ec;
        for (const auto& e : fs::directory_iterator(base, ec)) {
            const std::string rel = std::string(dir) + "/" + e.path().filename().string();
            if (e.is_regular_file() && !refused(rel))
                files.push_back(rel);
        }
    }
    std::sort(files.begin(), files.end());
    return files;
}

std::string testName(const testing::TestParamInfo<std::string>& info) {
    std::string n = info.param;
    for (char& c : n)
        if (!std::isalnum(static_cast<unsigned char>(c)))
            c = '_';
    return n;
}
}  // namespace

class WorkbookRealFile : public testing::TestWithParam<std::string> {};

TEST_P(WorkbookRealFile, MatchesAnIndependentReader) {
    const fs::path file = OxTest::testdata(GetParam());
    const auto o = oracle(file);
    ASSERT_TRUE(o.ok) << "no independent reader could read " << file;
    const auto problems = compare(file, o);
    std::string text;
    for (size_t i = 0; i < problems.size() && i < 15; ++i) text += "  " + problems[i] + "\n";
    EXPECT_TRUE(problems.empty()) << problems.size() << " differences from " << o.reader << ":\n"
                                  << text;
}

INSTANTIATE_TEST_SUITE_P(SharedTestData, WorkbookRealFile, testing::ValuesIn(readableFiles()),
                         testName);

TEST(WorkbookFiles, EncryptedAndOldFilesGiveClearErrors) {
    for (const auto& r : kRefused) {
        OxWorkbookError error;
        auto reader = OxWorkbookReader::open(OxTest::testdata(r.file).wstring(), error);
        EXPECT_FALSE(reader) << r.file;
        EXPECT_EQ(error.code(), r.code) << r.file << ": " << OxText::toUtf8(error.message());
        EXPECT_FALSE(error.message().empty());
    }
}

TEST(WorkbookFiles, DateSystemsAndDefinedNames) {
    OxWorkbookError error;
    auto mac =
        OxWorkbookReader::open(OxTest::testdata("xls/utf8-sheet-names.xls").wstring(), error);
    ASSERT_TRUE(mac) << OxText::toUtf8(error.message());
    EXPECT_TRUE(mac->info().date1904);
    EXPECT_EQ(mac->info().biffVersion, 8);

    auto old = OxWorkbookReader::open(
        OxTest::testdata("xls/Test_git_issue_231_NoCodePage.xls").wstring(), error);
    ASSERT_TRUE(old) << OxText::toUtf8(error.message());
    EXPECT_EQ(old->info().biffVersion, 5);

    auto strict =
        OxWorkbookReader::open(OxTest::testdata("xlsx/strict_iso_paths.xlsx").wstring(), error);
    ASSERT_TRUE(strict) << OxText::toUtf8(error.message());
    ASSERT_EQ(strict->info().names.size(), 1u);
    EXPECT_EQ(strict->info().names[0].name, L"_xlnm._FilterDatabase");
    EXPECT_EQ(strict->info().names[0].formula, L"ml_out!$A$1:$R$76");
    EXPECT_EQ(strict->info().names[0].sheet, 0);
    EXPECT_TRUE(strict->info().names[0].hidden);
}

TEST(WorkbookFiles, SheetsAreReadOneRowAtATimeInOrder) {
    OxWorkbookError error;
    auto r = OxWorkbookReader::open(OxTest::testdata("xls/sst_continue.xls").wstring(), error);
    ASSERT_TRUE(r);
    ASSERT_TRUE(r->beginSheet(0));
    OxWorkbookRow row;
    int64_t last = -1;
    size_t rows = 0;
    while (r->nextRow(row)) {
        EXPECT_GT(static_cast<int64_t>(row.index), last);
        last = row.index;
        ++rows;
    }
    EXPECT_FALSE(r->error());
    EXPECT_EQ(rows, 136u);
    // A second pass over the same sheet gives the same rows.
    ASSERT_TRUE(r->beginSheet(0));
    size_t again = 0;
    while (r->nextRow(row)) ++again;
    EXPECT_EQ(again, rows);
    EXPECT_FALSE(r->beginSheet(5));
    EXPECT_EQ(r->error().code(), OxWorkbookError::Invalid);
}
