// What the Access reader answers for the shared files, checked against the values the
// files are known to hold (including those the command-line reader gets wrong).
#include <gtest/gtest.h>

#include <algorithm>

#include "JetTestTools.h"
#include "platform/core/OxText.h"
#include "support/TestSupport.h"

namespace {
std::wstring openError(const std::filesystem::path& path) {
    std::wstring error;
    auto db = OxJetDatabase::open(path.wstring(), {}, error);
    EXPECT_FALSE(db);
    return error;
}

std::vector<std::wstring> names(const OxJetDatabase& db, OxJetObjectKind kind) {
    std::vector<std::wstring> list;
    for (const auto& e : db.catalog())
        if (e.kind == kind)
            list.push_back(e.name);
    return list;
}

TEST(OxJetOpen, RefusesWhatItCannotRead) {
    EXPECT_NE(openError(JetTest::accessFile("ace14_db2007-enc.accdb")).find(L"encrypted"),
              std::wstring::npos);
    EXPECT_NE(
        openError(OxTest::testdata("sqlite/Chinook_Sqlite.sqlite")).find(L"not an Access database"),
        std::wstring::npos);
    EXPECT_NE(openError(OxTest::testdata("access/no-such-file.mdb")).find(L"cannot open"),
              std::wstring::npos);
    EXPECT_NE(openError(OxTest::testdata("access")).find(L"not a regular file"),
              std::wstring::npos);

    OxTest::TempDir dir;
    OxTest::writeFile(dir.file("empty.mdb"), "");
    EXPECT_NE(openError(dir.file("empty.mdb")).find(L"too short"), std::wstring::npos);
    // The right signature on a file of zeros: the catalog is missing.
    std::string zeros(8192, '\0');
    std::string header = OxTest::readFile(JetTest::accessFile("jet4_password.mdb")).substr(0, 4096);
    OxTest::writeFile(dir.file("zeros.mdb"), header + zeros);
    EXPECT_NE(openError(dir.file("zeros.mdb")).find(L"catalog"), std::wstring::npos);
}

TEST(OxJetOpen, ReportsFormatPasswordAndEncoding) {
    auto jet3 = JetTest::open(JetTest::accessFile("jet3_db97-enc.mdb"));
    ASSERT_TRUE(jet3);
    EXPECT_EQ(jet3->format(), OxJetFormat::Jet3);
    EXPECT_NE(jet3->header().pageKey, 0u);  // scrambled pages, read all the same
    const auto rows = JetTest::readAll(*jet3, L"Table1");
    ASSERT_EQ(rows.size(), 2u);
    EXPECT_EQ(rows[0][1].text, L"hello");
    EXPECT_EQ(rows[1][1].text, L"world");
    EXPECT_EQ(rows[1][2].integer, 42);

    auto protectedDb = JetTest::open(JetTest::accessFile("jet4_password.mdb"));
    ASSERT_TRUE(protectedDb);
    EXPECT_TRUE(protectedDb->hasPassword());
    EXPECT_TRUE(protectedDb->checkPassword(L"ucanaccess"));
    EXPECT_FALSE(protectedDb->checkPassword(L"UCANACCESS"));
    auto open = JetTest::open(JetTest::accessFile("ace14_testV2010.accdb"));
    ASSERT_TRUE(open);
    EXPECT_EQ(open->format(), OxJetFormat::Ace14);
    EXPECT_FALSE(open->hasPassword());
}

TEST(OxJetCatalog, ListsTablesQueriesAndLinks) {
    auto queries = JetTest::open(JetTest::accessFile("jet4_queryTestV2003.mdb"));
    ASSERT_TRUE(queries);
    EXPECT_EQ(names(*queries, OxJetObjectKind::Table),
              (std::vector<std::wstring>{L"Table1", L"Table2", L"Table3"}));
    auto q = names(*queries, OxJetObjectKind::Query);
    std::sort(q.begin(), q.end());
    EXPECT_EQ(q,
              (std::vector<std::wstring>{L"AppendQuery", L"CrosstabQuery", L"DataDefinitionQuery",
                                         L"DeleteQuery", L"MakeTableQuery", L"PassthroughQuery",
                                         L"SelectQuery", L"UnionQuery", L"UpdateQuery"}));
    auto system = names(*queries, OxJetObjectKind::SystemTable);
    EXPECT_NE(std::find(system.begin(), system.end(), L"MSysObjects"), system.end());
    std::wstring error;
    EXPECT_FALSE(queries->tableDef(L"SelectQuery", error));
    EXPECT_NE(error.find(L"saved query"), std::wstring::npos);
    EXPECT_TRUE(queries->tableDef(L"msysobjects", error)) << OxText::toUtf8(error);

    auto linked = JetTest::open(JetTest::accessFile("jet4_linked.mdb"));
    ASSERT_TRUE(linked);
    EXPECT_TRUE(names(*linked, OxJetObjectKind::Table).empty());
    const OxJetCatalogEntry* t2 = linked->find(L"TABLE2");
    ASSERT_TRUE(t2);
    EXPECT_EQ(t2->kind, OxJetObjectKind::LinkedTable);
    EXPECT_EQ(t2->linkedDatabase, L"C:\\db\\linkee2.mdb");
    EXPECT_EQ(t2->foreignName, L"table2");
    EXPECT_FALSE(linked->tableDef(*t2, error));
    EXPECT_NE(error.find(L"linked table"), std::wstring::npos);
    EXPECT_NE(error.find(L"linkee2.mdb"), std::wstring::npos);
    EXPECT_EQ(linked->find(L"Table1")->linkedDatabase, L"C:\\db\\linkee1.mdb");
}

TEST(OxJetValues, EveryScalarTypeKeepsItsValue) {
    auto db = JetTest::open(JetTest::accessFile("ace14_testV2010.accdb"));
    ASSERT_TRUE(db);
    const auto rows = JetTest::readAll(*db, L"Table1");
    ASSERT_EQ(rows.size(), 2u);
    const auto& r = rows[1];
    EXPECT_EQ(r[0].text, L"abcdefg");
    EXPECT_EQ(r[1].text, L"hijklmnop");
    EXPECT_EQ(r[2].toVariant().vt(), VT_UI1);
    EXPECT_EQ(r[2].byte, 2);
    EXPECT_EQ(r[3].toVariant().vt(), VT_I2);
    EXPECT_EQ(r[3].integer, 222);
    EXPECT_EQ(r[4].toVariant().vt(), VT_I4);
    EXPECT_EQ(r[4].longValue, 333333333);
    EXPECT_EQ(r[5].toVariant().vt(), VT_R8);
    EXPECT_EQ(r[5].real, 444.555);
    EXPECT_EQ(r[6].toVariant().vt(), VT_DATE);
    EXPECT_EQ(r[6].toText(), L"1974-09-21T00:00:00");
    const OxVariant cy = r[7].toVariant();
    EXPECT_EQ(cy.vt(), VT_CY);
    EXPECT_EQ(cy.cyVal(), 35000);  // 3.5 exactly, never through a double
    EXPECT_EQ(r[8].toVariant().vt(), VT_BOOL);
    EXPECT_TRUE(r[8].boolean);
    EXPECT_FALSE(rows[0][8].boolean);
}

TEST(OxJetValues, DecimalsAreExact) {
    auto db = JetTest::open(JetTest::accessFile("ace14_calcFieldTestV2010.accdb"));
    ASSERT_TRUE(db);
    std::wstring error;
    auto def = db->tableDef(L"Table1", error);
    ASSERT_TRUE(def);
    const int col = def->columnIndex(L"Popularity");
    ASSERT_GE(col, 0);
    EXPECT_EQ(def->columns[size_t(col)].precision, 18);
    EXPECT_EQ(def->columns[size_t(col)].scale, 6);
    std::vector<std::wstring> texts;
    OxVariant last;
    for (const auto& row : JetTest::readAll(*db, L"Table1")) {
        texts.push_back(row[size_t(col)].toText());
        last = row[size_t(col)].toVariant();
    }
    EXPECT_EQ(texts, (std::vector<std::wstring>{L"50.325000", L"-36.222200", L"0.012300",
                                                L"102030405060.654321"}));
    ASSERT_EQ(last.vt(), VT_DECIMAL);
    EXPECT_EQ(last.decVal().scale, 6);
    EXPECT_EQ(last.decVal().lo64, 102030405060654321ull);
    EXPECT_EQ(last.decVal().sign, 0);
}

// The command-line reader prints these dates as "1900-01-00".
TEST(OxJetValues, DatesBefore1900) {
    auto db = JetTest::open(JetTest::accessFile("ace12_oldDatesV2007.accdb"));
    ASSERT_TRUE(db);
    std::vector<std::wstring> dates;
    for (const auto& row : JetTest::readAll(*db, L"Table1")) {
        EXPECT_LT(row[1].real, 0);
        dates.push_back(row[1].toText());
    }
    EXPECT_EQ(dates, (std::vector<std::wstring>{L"1582-10-15T00:00:00", L"1582-10-14T00:00:00",
                                                L"1492-01-10T00:00:00", L"1392-01-10T00:00:00"}));

    auto ext = JetTest::open(JetTest::accessFile("ace17_extDateTestV2019.accdb"));
    ASSERT_TRUE(ext);
    const auto rows = JetTest::readAll(*ext, L"Table1");
    ASSERT_EQ(rows.size(), 9u);
    // The text column repeats the date the way the writer saw it.
    EXPECT_EQ(rows[8][4].text, L"6/14/1265 12:45:00.0000000 PM");
    EXPECT_EQ(rows[8][3].toText(), L"1265-06-14T12:45:00");
}

// The command-line reader turns each of these characters into "??".
TEST(OxJetValues, CharactersBeyondTheBmpStayWhole) {
    auto db = JetTest::open(JetTest::accessFile("ace14_testEmoticonsV2010.accdb"));
    ASSERT_TRUE(db);
    const auto rows = JetTest::readAll(*db, L"data");
    ASSERT_EQ(rows.size(), 80u);
    for (const auto& row : rows) {
        // Each row's key is the code point its text holds between two letters.
        const std::wstring expected = std::wstring(L"a") + wchar_t(row[0].longValue) + L"a";
        EXPECT_EQ(row[1].text, expected) << row[0].longValue;
    }
    EXPECT_EQ(OxText::toUtf8(rows[0][1].text),
              "a\xF0\x9F\x98\x80"
              "a");
}

TEST(OxJetValues, CompressedAndCodePageText) {
    auto db = JetTest::open(JetTest::accessFile("jet4_testUnicodeCompV2003.mdb"));
    ASSERT_TRUE(db);
    const auto rows = JetTest::readAll(*db, L"Table");
    ASSERT_EQ(rows.size(), 8u);
    EXPECT_EQ(rows[2][1].text, L"\u041C\u0438\u0440");
    EXPECT_EQ(rows[4][1].text, L"\u6F22\u5B57\u4EEE\u540D\u4EA4\u3058\u308A\u6587");
    for (wchar_t c = 0x20; c <= 0xFF; ++c)  // every Latin-1 character, stored compressed
        EXPECT_NE(rows[7][1].text.find(c), std::wstring::npos) << int(c);

    // Written on a GBK system, the file names code page 1252: the caller knows better.
    OxJetOpenOptions gbk;
    gbk.codePage = 936;
    auto chinese = JetTest::open(JetTest::accessFile("jet3_charsetGBK.mdb"), gbk);
    ASSERT_TRUE(chinese);
    EXPECT_EQ(JetTest::readAll(*chinese, L"table1")[0][1].text, L"GBK\u7F16\u7801");
    auto asNamed = JetTest::open(JetTest::accessFile("jet3_charsetGBK.mdb"));
    ASSERT_TRUE(asNamed);
    EXPECT_EQ(asNamed->codePage(), 1252);
    EXPECT_EQ(JetTest::readAll(*asNamed, L"table1")[0][1].text, L"GBK\u00B1\u00E0\u00C2\u00EB");

    OxJetOpenOptions unknown;
    unknown.codePage = 12345;
    std::wstring error;
    EXPECT_FALSE(
        OxJetDatabase::open(JetTest::accessFile("jet3_charsetGBK.mdb").wstring(), unknown, error));
    EXPECT_NE(error.find(L"code page 12345"), std::wstring::npos);
}

TEST(OxJetValues, MovedRowsKeepTheirPlace) {
    auto db = JetTest::open(JetTest::accessFile("jet4_overflowTestV2003.mdb"));
    ASSERT_TRUE(db);
    std::vector<std::wstring> seen;
    for (const auto& row : JetTest::readAll(*db, L"Table1"))
        for (const auto& v : row)
            if (!v.isNull()) {
                seen.push_back(v.text.substr(0, 4));
                break;
            }
    EXPECT_EQ(seen, (std::vector<std::wstring>{L"row1", L"row2", L"row3", L"row4", L"row5", L"row6",
                                               L"row7"}));
}

TEST(OxJetSchemaRead, UnsupportedTypesAreMarked) {
    auto db = JetTest::open(JetTest::accessFile("ace12_unsupportedFieldsTestV2007.accdb"));
    ASSERT_TRUE(db);
    std::wstring error;
    auto def = db->tableDef(L"Test", error);
    ASSERT_TRUE(def);
    ASSERT_EQ(def->columns.size(), 4u);
    EXPECT_TRUE(def->columns[0].supported);
    for (size_t i = 1; i < 4; ++i) {
        EXPECT_FALSE(def->columns[i].supported) << i;
        EXPECT_FALSE(def->columns[i].unsupportedReason.empty());
    }
    EXPECT_EQ(def->columns[1].type, 0x46);
    for (const auto& row : JetTest::readAll(*db, L"Test")) {
        EXPECT_EQ(row[0].kind, OxJetValue::Long);
        for (size_t i = 1; i < 4; ++i) {
            EXPECT_EQ(row[i].kind, OxJetValue::Unsupported);
            EXPECT_EQ(row[i].toVariant().vt(), VT_ERROR);
        }
    }

    auto calc = JetTest::open(JetTest::accessFile("ace14_calcFieldTestV2010.accdb"));
    ASSERT_TRUE(calc);
    auto calcDef = calc->tableDef(L"Table1", error);
    ASSERT_TRUE(calcDef);
    EXPECT_TRUE(calcDef->column(L"LastFirst")->calculated);
    EXPECT_FALSE(calcDef->column(L"LastFirst")->supported);
    EXPECT_TRUE(calcDef->column(L"FirstName")->supported);

    auto ext = JetTest::open(JetTest::accessFile("ace17_extDateTestV2019.accdb"));
    ASSERT_TRUE(ext);
    auto extDef = ext->tableDef(L"Table1", error);
    ASSERT_TRUE(extDef);
    EXPECT_EQ(extDef->column(L"DateExt")->type, uint8_t(OxJetType::DateTimeExtended));
    EXPECT_FALSE(extDef->column(L"DateExt")->supported);
}

TEST(OxJetSchemaRead, ColumnsAndIndexes) {
    auto db = JetTest::open(JetTest::accessFile("ace14_testV2010.accdb"));
    ASSERT_TRUE(db);
    std::wstring error;
    auto def = db->tableDef(L"Table1", error);
    ASSERT_TRUE(def);
    EXPECT_EQ(def->column(L"A")->type, uint8_t(OxJetType::Text));
    EXPECT_EQ(def->column(L"A")->size, 50u);
    EXPECT_EQ(def->column(L"B")->size, 100u);
    EXPECT_EQ(def->column(L"C")->defaultValue.value_or(L"?"), L"0");
    EXPECT_FALSE(def->column(L"G")->defaultValue);
    EXPECT_FALSE(def->column(L"A")->required);
    EXPECT_TRUE(def->column(L"I")->required);  // a yes/no field is never NULL
    const OxJetIndex* pk = nullptr;
    for (const auto& ix : def->indexes)
        if (ix.primary)
            pk = &ix;
    ASSERT_TRUE(pk);
    EXPECT_TRUE(pk->unique);
    ASSERT_EQ(pk->columns.size(), 1u);
    EXPECT_EQ(def->columns[pk->columns[0].column].name, L"A");

    // Definitions spread over several pages.
    auto wide = db->tableDef(L"Table2", error);
    ASSERT_TRUE(wide) << OxText::toUtf8(error);
    ASSERT_EQ(wide->columns.size(), 89u);
    EXPECT_EQ(wide->columns[88].name, L"column89");

    auto big = JetTest::open(JetTest::accessFile("ace14_indexTestV2010.accdb"));
    ASSERT_TRUE(big);
    auto t2 = big->tableDef(L"Table2", error);
    ASSERT_TRUE(t2);
    bool foreign = false;
    for (const auto& ix : t2->indexes)
        foreign = foreign || (ix.foreignKey && ix.columns.size() == 1);
    EXPECT_TRUE(foreign) << "the relationship's index keeps its column";

    std::vector<OxJetRelationship> relationships;
    ASSERT_TRUE(big->relationships(relationships, error));
    ASSERT_EQ(relationships.size(), 2u);
    const OxJetRelationship& del = relationships[0];
    EXPECT_EQ(del.name, L"Table2Table1");
    EXPECT_EQ(del.table, L"Table1");
    EXPECT_EQ(del.referencedTable, L"Table2");
    EXPECT_EQ(del.columns,
              (std::vector<std::pair<std::wstring, std::wstring>>{{L"otherfk1", L"id"}}));
    EXPECT_TRUE(del.enforced);
    EXPECT_TRUE(del.cascadeDeletes);
    EXPECT_FALSE(del.cascadeUpdates);
    EXPECT_TRUE(relationships[1].cascadeUpdates);
    EXPECT_FALSE(relationships[1].cascadeDeletes);
    ASSERT_TRUE(db->relationships(relationships, error));  // testV2010 has none
    EXPECT_TRUE(relationships.empty());

    auto counter = JetTest::open(JetTest::accessFile("ace12_unsupportedFieldsTestV2007.accdb"));
    ASSERT_TRUE(counter);
    auto test = counter->tableDef(L"Test", error);
    ASSERT_TRUE(test);
    EXPECT_TRUE(test->column(L"ID")->autoNumber);
    EXPECT_EQ(test->nextAutoNumber, 3u);
}
}  // namespace
