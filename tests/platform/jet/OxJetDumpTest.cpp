// NULL against empty text, through the cursor and through "oxqel dump" (CSV, JSON, schema,
// errors). The shared files hold no empty text, so a copy is edited to hold one.
#include <gtest/gtest.h>

#include "JetTestTools.h"
#include "platform/core/OxText.h"
#include "platform/jet/OxJetUsageMap.h"
#include "support/TestSupport.h"

namespace {
// testV2010's Table1 with its first row's A emptied and its B set to NULL.
std::string editedCopy() {
    const auto path = JetTest::accessFile("ace14_testV2010.accdb");
    std::string bytes = OxTest::readFile(path);
    auto db = JetTest::open(path);
    std::wstring error;
    auto def = db->tableDef(L"Table1", error);
    auto file = OxJetPageFile::openFile(path.string());
    const auto pages = OxJetUsageMap::pages(*file, def->ownedPagesMap).pages;
    auto* page = reinterpret_cast<uint8_t*>(bytes.data()) + pages.front() * 4096ull;
    const uint32_t start = (page[14] | page[15] << 8) & 0x1FFF;
    const uint32_t end = 4096;
    uint8_t* row = page + start;
    const uint32_t cols = row[0] | row[1] << 8;
    const uint32_t mask = (cols + 7) / 8;
    const uint32_t tableEnd = end - start - mask - 2;
    auto offset = [&](uint32_t i) { return row + tableEnd - 2 * (i + 1); };
    const OxJetColumn& a = *def->column(L"A");
    const OxJetColumn& b = *def->column(L"B");
    // A starts where its neighbour does: present, zero bytes long.
    uint8_t* next = offset(a.varIndex + 1u);
    uint8_t* self = offset(a.varIndex);
    self[0] = next[0];
    self[1] = next[1];
    row[end - start - mask + b.number / 8] &= static_cast<uint8_t>(~(1u << (b.number % 8)));
    return bytes;
}

TEST(OxJetNulls, EmptyTextIsNotNull) {
    const std::string bytes = editedCopy();
    std::wstring error;
    auto db =
        OxJetDatabase::openBuffer(std::vector<uint8_t>(bytes.begin(), bytes.end()), {}, error);
    ASSERT_TRUE(db) << OxText::toUtf8(error);
    const auto rows = JetTest::readAll(*db, L"Table1");
    ASSERT_EQ(rows.size(), 2u);
    EXPECT_EQ(rows[0][0].kind, OxJetValue::Text);
    EXPECT_EQ(rows[0][0].text, L"");
    EXPECT_EQ(rows[0][0].toVariant().vt(), VT_BSTR);
    EXPECT_TRUE(rows[0][1].isNull());
    EXPECT_TRUE(rows[0][1].toVariant().isNull());
    EXPECT_EQ(rows[1][0].text, L"abcdefg");  // the next row is untouched
}

JetTest::ProcessResult dump(const std::vector<std::string>& args) {
    std::vector<std::string> argv{OXQEL_TOOL, "dump"};
    argv.insert(argv.end(), args.begin(), args.end());
    return JetTest::run(argv);
}

TEST(OxJetDumpTool, CsvAndJsonKeepNullApartFromEmpty) {
    OxTest::TempDir dir;
    OxTest::writeFile(dir.file("edited.accdb"), editedCopy());
    const std::string path = dir.file("edited.accdb").string();

    const auto csv = dump({path, "Table1", "--csv"});
    EXPECT_EQ(csv.exitCode, 0) << csv.err;
    EXPECT_EQ(
        csv.out,
        "A,B,C,D,E,F,G,H,I\n"
        "\"\",,0,0,0,0,1981-12-12T00:00:00,0.0000,FALSE\n"
        "\"abcdefg\",\"hijklmnop\",2,222,333333333,444.555,1974-09-21T00:00:00,3.5000,TRUE\n");

    const auto json = dump({path, "Table1", "--json"});
    EXPECT_EQ(json.exitCode, 0) << json.err;
    EXPECT_EQ(
        json.out,
        "[\n"
        "{\"A\":\"\",\"B\":null,\"C\":0,\"D\":0,\"E\":0,\"F\":0,\"G\":\"1981-12-12T00:00:00\","
        "\"H\":0.0000,\"I\":false},\n"
        "{\"A\":\"abcdefg\",\"B\":\"hijklmnop\",\"C\":2,\"D\":222,\"E\":333333333,"
        "\"F\":444.555,\"G\":\"1974-09-21T00:00:00\",\"H\":3.5000,\"I\":true}\n"
        "]\n");
}

TEST(OxJetDumpTool, ListsSchemasAndQuotes) {
    const auto list = dump({JetTest::accessFile("jet4_linked.mdb").string()});
    EXPECT_EQ(list.exitCode, 0) << list.err;
    EXPECT_NE(list.out.find("table2\tlinked table\t-\t-\ttable2 in C:\\db\\linkee2.mdb\n"),
              std::string::npos)
        << list.out;

    // Rows are counted: this file's definition still says 3.
    const auto stale = dump({JetTest::accessFile("ace14_calcFieldTestV2010.accdb").string()});
    EXPECT_NE(stale.out.find("\nTable1\ttable\t4\t17\t\n"), std::string::npos) << stale.out;

    const auto schema =
        dump({JetTest::accessFile("ace14_testV2010.accdb").string(), "Table1", "--schema"});
    EXPECT_EQ(schema.exitCode, 0);
    EXPECT_NE(schema.out.find("  B\tText(100)\n"), std::string::npos) << schema.out;
    EXPECT_NE(schema.out.find("  I\tYes/No NOT NULL\n"), std::string::npos);
    EXPECT_NE(schema.out.find("  PrimaryKey (A) PRIMARY KEY\n"), std::string::npos);

    // Every control character and both quote kinds survive a CSV round.
    const auto csv =
        dump({JetTest::accessFile("jet4_testUnicodeCompV2003.mdb").string(), "Table", "--csv"});
    EXPECT_EQ(csv.exitCode, 0);
    EXPECT_NE(csv.out.find("\n3,\"\xD0\x9C\xD0\xB8\xD1\x80\"\n"), std::string::npos);
    EXPECT_NE(csv.out.find("!\"\"#$%"), std::string::npos);  // the quote doubled

    const auto unsupported =
        dump({JetTest::accessFile("ace12_unsupportedFieldsTestV2007.accdb").string(), "Test"});
    EXPECT_EQ(unsupported.exitCode, 0);
    EXPECT_EQ(unsupported.out, "ID,UnknownVar,UnknownFix,UnknownComplex\n1,,,\n2,,,\n3,,,\n");
    EXPECT_NE(unsupported.err.find("unsupported type"), std::string::npos);
}

TEST(OxJetDumpTool, FailuresSayWhy) {
    const auto encrypted = dump({JetTest::accessFile("ace14_db2007-enc.accdb").string()});
    EXPECT_EQ(encrypted.exitCode, 1);
    EXPECT_NE(encrypted.err.find("encrypted"), std::string::npos);
    const auto missing = dump({JetTest::accessFile("ace14_testV2010.accdb").string(), "Nope"});
    EXPECT_EQ(missing.exitCode, 1);
    EXPECT_NE(missing.err.find("no table or query named Nope"), std::string::npos);
    const auto query =
        dump({JetTest::accessFile("jet4_queryTestV2003.mdb").string(), "SelectQuery", "--csv"});
    EXPECT_EQ(query.exitCode, 1);
    EXPECT_NE(query.err.find("saved query"), std::string::npos);
    const auto both =
        dump({JetTest::accessFile("ace14_testV2010.accdb").string(), "Table1", "--csv", "--json"});
    EXPECT_EQ(both.exitCode, 1);
}
}  // namespace
