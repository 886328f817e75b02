#include <gtest/gtest.h>

#include <random>
#include <regex>

#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"
#include "SQLiteTestSupport.h"
#include "platform/core/OxText.h"

using OxSQLiteTest::Database;

namespace {
std::wstring rewrite(const std::wstring& text) {
    OxQelConnectionSQLite c;
    return c.formatBeforeExecute(text);
}

std::wstring key(const std::wstring& text) {
    return OxQelConnectionSQLite::_getStringForNaturalSort(text);
}

std::vector<std::wstring> column(OxQelConnectionSQLite& c, const std::wstring& sql) {
    OxQelRecordsetSQLite rs;
    EXPECT_TRUE(rs.openSQL(&c, sql)) << OxText::toUtf8(sql);
    std::vector<std::wstring> out;
    for (; !rs.getEOF(); rs.moveNext())
        out.push_back(rs.isFieldNull(0L) ? L"NULL" : rs.getlFieldString(0));
    return out;
}
}  // namespace

TEST(SQLiteRewrite, SemicolonsApostrophesAndMarkers) {
    EXPECT_EQ(rewrite(L""), L"");
    EXPECT_EQ(rewrite(L";"), L"");
    EXPECT_EQ(rewrite(L"DELETE FROM t;;"), L"DELETE FROM t;");
    // Apostrophes are doubled everywhere, so host text writes its literals with markers.
    EXPECT_EQ(rewrite(L"SELECT 'x' FROM t"), L"SELECT ''x'' FROM t");
    EXPECT_EQ(rewrite(L"SELECT a FROM t WHERE b = ]]O'Brien[["),
              L"SELECT a FROM t WHERE b =  'O''Brien' ");
    EXPECT_EQ(rewrite(L"WHERE a = ]]]x[[[ AND b = ]]y[["), L"WHERE a =   'x'   AND b =  'y' ");
    // A parameter marker run unprepared becomes a literal holding its number.
    EXPECT_EQ(rewrite(L"VALUES (]]]1[[[)"), L"VALUES (  '1'  )");
}

TEST(SQLiteRewrite, TopBecomesATrailingLimit) {
    EXPECT_EQ(rewrite(L"SELECT TOP 10 a FROM t"), L"SELECT  a FROM t LIMIT 10");
    EXPECT_EQ(rewrite(L"SELECT TOP(5) a FROM t"), L"SELECT  a FROM t LIMIT 5");
    EXPECT_EQ(rewrite(L"select top (5) a from t ORDER BY a;"),
              L"select  a from t ORDER BY a LIMIT 5");
    EXPECT_EQ(rewrite(L"SELECT topic FROM t"), L"SELECT topic FROM t");
    EXPECT_EQ(rewrite(L"SELECT\tTOP 5 a FROM t"), L"SELECT\tTOP 5 a FROM t")
        << "a TOP after a tab alone is not looked for";
    EXPECT_EQ(rewrite(L"SELECT TOP 1 a FROM (SELECT TOP 2 b FROM t)"),
              L"SELECT  a FROM (SELECT TOP 2 b FROM t) LIMIT 1");
    EXPECT_EQ(rewrite(L"SELECT a FROM t WHERE b = ]]x TOP 3[["),
              L"SELECT a FROM t WHERE b =  'x '  LIMIT 3");
    EXPECT_EQ(rewrite(L"SELECT TOP x FROM t"), L"SELECT TOP x FROM t");
}

// The TOP clause is defined by this expression; the rewriter finds it without a
// backtracking engine and must agree with one on every text.
TEST(SQLiteRewrite, TopMatchAgreesWithTheDefiningExpression) {
    const std::wregex top(L"(\\s+(TOP)\\s*(\\((\\d+)\\)))|(\\s+(TOP)\\s+(\\d+))",
                          std::regex::ECMAScript | std::regex::icase);
    const std::wstring alphabet = L" \tTOPtop()12x;";
    std::mt19937 random(7);
    for (int n = 0; n < 20000; ++n) {
        std::wstring text = L"SELECT";
        const size_t length = random() % 14;
        for (size_t i = 0; i < length; ++i) text += alphabet[random() % alphabet.size()];
        std::wstring expected = text;
        std::wsmatch m;
        if (text.find(L' ') != std::wstring::npos &&
            OxText::findNoCase(text, L" TOP") != std::wstring::npos &&
            std::regex_search(text, m, top)) {
            std::wstring digits;
            for (size_t g = m.size(); g-- > 1;)
                if (m[g].matched) {
                    digits = m[g].str();
                    break;
                }
            expected = text.substr(0, static_cast<size_t>(m.position(0))) + L" " +
                       text.substr(static_cast<size_t>(m.position(0) + m.length(0))) + L" LIMIT " +
                       digits;
        }
        std::wstring input = text;
        if (!input.empty() && input.back() == L';')
            continue;  // the rewriter drops it first
        ASSERT_EQ(rewrite(input), expected) << OxText::toUtf8(text);
    }
}

TEST(SQLiteRewrite, LongHostileTextsFinishQuickly) {
    // White space runs and half markers are scanned once, without backtracking.
    const std::wstring spaces(200000, L' ');
    EXPECT_EQ(rewrite(L"SELECT" + spaces + L"TOP 7 a FROM t"), L"SELECT  a FROM t LIMIT 7");
    std::wstring tops;
    for (int i = 0; i < 20000; ++i) tops += L" TOP";
    EXPECT_EQ(rewrite(tops), tops);
    std::wstring halves;
    for (int i = 0; i < 20000; ++i) halves += L"]]a";
    EXPECT_EQ(rewrite(halves).size(), halves.size());
}

TEST(SQLiteRewrite, RewrittenTextRunsOnTheEngine) {
    Database db("CREATE TABLE t(name TEXT); INSERT INTO t VALUES ('O''Brien'), ('b'), ('c');");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_TRUE(c.formatAndExecute(L"INSERT INTO [t] VALUES (]]it's[[)"));
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM t WHERE name = 'it''s'"), "1");
    EXPECT_EQ(column(c, c.formatBeforeExecute(L"SELECT TOP 2 name FROM [t] ORDER BY name;")),
              (std::vector<std::wstring>{L"O'Brien", L"b"}));
}

TEST(SQLiteNaturalSort, KeysWriteEveryDigitRunWithItsLength) {
    EXPECT_EQ(key(L"file9"), L"file0019");
    EXPECT_EQ(key(L"file12"), L"file00212");
    EXPECT_LT(key(L"file9"), key(L"file12"));
    EXPECT_EQ(key(L"42"), L"00242");
    EXPECT_EQ(key(L"abc"), L"abc");
    EXPECT_EQ(key(L""), L"");
    EXPECT_EQ(key(L"1a22b"), L"0011a00222b");
    EXPECT_GT(key(L"x007"), key(L"x7")) << "leading zeros count";
    EXPECT_EQ(key(L"\u0663\u0664"), L"\u0663\u0664") << "only ASCII digits are digits";
    const std::wstring run(1200, L'5');
    EXPECT_EQ(key(run), L"1200" + run);
}

TEST(SQLiteNaturalSort, SqlFunctionOrdersNaturallyInEitherEncoding) {
    const char* setup =
        "CREATE TABLE f(name); INSERT INTO f VALUES ('file12'), ('file9'), ('file100'), "
        "('Ä2'), ('Ä10');";
    Database utf8(setup);
    Database utf16;
    ASSERT_TRUE(utf16.connection().isUtf16());
    ASSERT_TRUE(utf16.connection().execute(OxText::fromUtf8(setup)));
    for (Database* db : {&utf8, &utf16}) {
        OxQelConnectionSQLite& c = db->connection();
        const std::wstring fn = c.getNameFunctionNaturalSort();
        EXPECT_EQ(fn, L"fn_OxNaturalSort");
        EXPECT_EQ(column(c, L"SELECT name FROM f ORDER BY " + fn + L"(name)"),
                  (std::vector<std::wstring>{L"file9", L"file12", L"file100", L"Ä2", L"Ä10"}));
        EXPECT_EQ(column(c, L"SELECT " + fn + L"('Ä10')"), std::vector<std::wstring>{L"Ä00210"});
    }
}

TEST(SQLiteNaturalSort, OtherStorageClasses) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(5)"), std::vector<std::wstring>{L"5"});
    // Integers are their own key, all 64 bits of them.
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(1099511627776)"),
              std::vector<std::wstring>{L"1099511627776"});
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(-5000000000)"),
              std::vector<std::wstring>{L"-5000000000"});
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(1.5)"), std::vector<std::wstring>{L"NULL"});
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(NULL)"), std::vector<std::wstring>{L"NULL"});
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort(x'01')"), std::vector<std::wstring>{L"NULL"});
    EXPECT_EQ(column(c, L"SELECT fn_OxNaturalSort('')"), std::vector<std::wstring>{L""});
}
