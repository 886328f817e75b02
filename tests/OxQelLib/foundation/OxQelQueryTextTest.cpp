#include <gtest/gtest.h>

#include "OxQelLib/foundation/OxQelQueryText.h"

using namespace OxQel;

namespace {
TEST(MarkersTest, ByColumnType) {
    for (FieldType t : {String, Memo, Guid, Char}) {
        EXPECT_EQ(getQueryCharacterBegin(t), L"]]");
        EXPECT_EQ(getQueryCharacterEnd(t), L"[[");
    }
    for (FieldType t : {WString, WMemo, WChar}) {
        EXPECT_EQ(getQueryCharacterBegin(t), L"]]]");
        EXPECT_EQ(getQueryCharacterEnd(t), L"[[[");
    }
    for (FieldType t : {Unknown, Integer, Double, Date, Bool, Binary, static_cast<FieldType>(99)})
        EXPECT_EQ(getQueryCharacterBegin(t), L"");
}

TEST(MarkersTest, TripleBrace) {
    EXPECT_TRUE(Util::haveTripleBrace(L"x]]]y", 1));
    EXPECT_FALSE(Util::haveTripleBrace(L"x]]y", 1));
    EXPECT_FALSE(Util::haveTripleBrace(L"x]]", 1));  // "]]" that ends the text
    EXPECT_FALSE(Util::haveTripleBrace(L"x]]", -1));
}

std::wstring sqliteStyle(std::wstring s) {
    Util::renderMarkers(s, {L" '", L"' ", L"  '", L"'  "});
    return s;
}

TEST(MarkersTest, SharedScanKeepsTheLength) {
    EXPECT_EQ(sqliteStyle(L"WHERE a = ]]x[[ AND b = ]]]y[[["), L"WHERE a =  'x'  AND b =   'y'  ");
    EXPECT_EQ(sqliteStyle(L"no markers [a]"), L"no markers [a]");
    EXPECT_EQ(sqliteStyle(L"]][["), L" '' ");
    // An identifier's closing bracket before a literal: the third "]" is not a wide marker.
    EXPECT_EQ(sqliteStyle(L"[a]]]x[["), L"[a] 'x' ");
    // Unmatched markers are left alone, and the scan ends.
    EXPECT_EQ(sqliteStyle(L"a ]] b"), L"a ]] b");
    EXPECT_EQ(sqliteStyle(L"]]]]]]"), L"]]]]]]");
    const std::wstring text = L"INSERT INTO t VALUES (]]a[[),(]]b[[),(]]]c[[[)";
    EXPECT_EQ(sqliteStyle(text).size(), text.size());
    EXPECT_EQ(Util::doubleApostrophes(L"it's ''"), L"it''s ''''");
}

TEST(RewriterTest, PostgreSql) {
    EXPECT_EQ(formatExprForPostGre(L"SELECT [a] FROM [t] WHERE [a] = ]]x[["),
              L"SELECT \"a\" FROM \"t\" WHERE \"a\" = 'x'");
    EXPECT_EQ(formatExprForPostGre(L"]]it's[["), L"'it's'");  // apostrophes are not doubled
}

TEST(RewriterTest, MySqlExample) {
    EXPECT_EQ(
        formatExprForMySQL(L"SELECT [A] FROM ([T] AS X INNER JOIN [U] ON X.[ID] = [U].[ID]) WHERE "
                           L"[A] = ]]Ab\\c[["),
        L"select `a` from `t`    x inner join `u` on x.`id` = `u`.`id` where `a` = n'Ab\\\\c'");
}

TEST(RewriterTest, MySqlClauses) {
    // A closing parenthesis that opened before the FROM clause ends it and is kept.
    EXPECT_EQ(formatExprForMySQL(L"SELECT * FROM [T] WHERE [A] IN (SELECT [B] FROM [U])"),
              L"select * from `t` where `a` in (select `b` from `u`)");
    EXPECT_EQ(formatExprForMySQL(L"SELECT COUNT([A]) FROM [T] GROUP BY [A] ORDER BY [A]"),
              L"select count(`a`) from `t` group by `a` order by `a`");
    EXPECT_EQ(formatExprForMySQL(L"UPDATE [T] SET [A] = ]]X[["), L"update `t` set `a` = n'X'");
}
}  // namespace
