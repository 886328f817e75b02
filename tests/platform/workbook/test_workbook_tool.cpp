// "oxqel dump" on workbooks, run as a user runs it.
#include <gtest/gtest.h>

#include <filesystem>

#include "WorkbookTestSupport.h"
#include "support/TestSupport.h"

namespace fs = std::filesystem;
using OxWorkbookTest::run;

namespace {
OxWorkbookTest::Run oxqel(std::vector<std::string> args) {
    args.insert(args.begin(), OXQEL_TOOL);
    return run(args);
}
std::string data(const char* rel) {
    return OxTest::testdata(rel).string();
}
}  // namespace

TEST(WorkbookTool, ListsSheetsAndPrintsOne) {
    auto r = oxqel({"dump", data("xls/any_sheets.xls")});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.out,
              "sheet\tvisibility\trows\tcolumns\nVisible\tvisible\t5\t2\n"
              "Hidden\thidden\t0\t0\nVeryHidden\tveryhidden\t0\t0\n");

    r = oxqel({"dump", data("xls/Test_num_double_date_bool_string.xls"), "Sheet1", "--csv"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.out.substr(0, 100),
              "1,1.02,2009-05-11,1,next value is null,2009-05-07T11:01:02\n"
              "2,2.04,2009-05-18,1,,2009-05-08T11:01:02\n");

    r = oxqel({"dump", data("xlsx/errors.xlsx"), "feuil1", "--json"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.out,
              "{\"sheet\":\"Feuil1\",\"columns\":1,\"rows\":[[\"#DIV/0!\"],[\"#NAME?\"],"
              "[\"#VALUE!\"],[\"#NULL!\"],[\"#REF!\"],[\"#NUM!\"],[\"#N/A\"]]}\n");
}

TEST(WorkbookTool, FailuresExitNonZero) {
    EXPECT_EQ(oxqel({"dump", data("xls/Test_git_issue_242_xor_pwd_password.xls")}).status, 1);
    EXPECT_EQ(oxqel({"dump", data("xls/as3xls_BIFF2.xls")}).status, 1);
    EXPECT_EQ(oxqel({"dump", data("xls/any_sheets.xls"), "NoSuchSheet"}).status, 1);
    OxTest::TempDir dir;
    OxTest::writeFile(dir.file("in.csv"), "a,b\n");
    EXPECT_EQ(oxqel({"dump", "--write", dir.file("out.txt").string(), dir.file("in.csv").string()})
                  .status,
              1);
    EXPECT_EQ(oxqel({"dump", "--write", dir.file("out.xls").string(),
                     "a:b=" + dir.file("in.csv").string()})
                  .status,
              1);
    EXPECT_FALSE(fs::exists(dir.file("out.xls")));
    OxTest::writeFile(dir.file("broken.csv"), "\"open");
    EXPECT_EQ(
        oxqel({"dump", "--write", dir.file("out.xlsx").string(), dir.file("broken.csv").string()})
            .status,
        1);
    EXPECT_FALSE(fs::exists(dir.file("out.xlsx")));
}

TEST(WorkbookTool, WritesWorkbooksFromCsvThatDumpBackTheSame) {
    OxTest::TempDir dir;
    // Quoted fields stay texts; unquoted ones are typed. The dump quotes the texts that
    // would otherwise read as another type, so the text comes back unchanged.
    const std::string csv =
        "name,when,n,flag,err,empty\n"
        "\"123\",2021-01-01,1.5,TRUE,#N/A,\n"
        "\"say \"\"hi\"\", then go\",2021-01-01T10:10:10,-0,FALSE,#DIV/0!,\"\"\n"
        ",,\n"
        "ünï,10:30:00,1e+300,\"TRUE\",x,\" padded \"\n";
    OxTest::writeFile(dir.file("first.csv"), csv);
    OxTest::writeFile(dir.file("second.csv"), "only\n");
    for (const char* out : {"book.xls", "book.xlsx"}) {
        const std::string path = dir.file(out).string();
        auto w = oxqel({"dump", "--write", path, dir.file("first.csv").string(),
                        "Named Sheet=" + dir.file("second.csv").string()});
        ASSERT_EQ(w.status, 0) << out;
        auto list = oxqel({"dump", path});
        EXPECT_EQ(list.out,
                  "sheet\tvisibility\trows\tcolumns\nfirst\tvisible\t5\t6\n"
                  "Named Sheet\tvisible\t1\t1\n")
            << out;
        auto back = oxqel({"dump", path, "first", "--csv"});
        EXPECT_EQ(back.status, 0);
        // The empty third row comes back as a row of empty fields across the sheet.
        std::string expected = csv;
        expected.replace(expected.find(",,\n"), 3, ",,,,,\n");
        EXPECT_EQ(back.out, expected) << out;
    }
}
