#include <gtest/gtest.h>

#include <chrono>

#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "OxQelLib/sqlite/OxQelPreparedQuerySQLite.h"
#include "SQLiteTestSupport.h"

using OxSQLiteTest::Database;
using OxSQLiteTest::LogCapture;

namespace {
std::unique_ptr<OxQelPreparedQuerySQLite> prepared(OxQelConnectionSQLite& c,
                                                   const std::wstring& sql) {
    auto q = std::make_unique<OxQelPreparedQuerySQLite>();
    EXPECT_TRUE(q->setConnection(&c));
    EXPECT_TRUE(q->prepareQuery(sql));
    return q;
}
}  // namespace

TEST(SQLitePreparedQuery, MarkersBecomeNumberedParameters) {
    Database db("CREATE TABLE t(a, b, c);");
    OxQelConnectionSQLite& c = db.connection();
    OxQelPreparedQuerySQLite q;
    EXPECT_EQ(q.formatParametersInQuery(L"VALUES (]]]1[[[, ]]]12[[[, ]]x[[)"),
              L"VALUES (?1, ?12, ]]x[[)");
    EXPECT_FALSE(q.setConnection(nullptr));
    OxQelConnectionDefault other;
    EXPECT_FALSE(q.setConnection(&other));
    OxQelConnectionSQLite closed;
    EXPECT_FALSE(q.setConnection(&closed));

    LogCapture log;
    auto two = prepared(c, L"INSERT INTO t (b, a) VALUES (]]]2[[[, ]]]1[[[)");
    EXPECT_FALSE(two->bindParameter(0, 1));
    EXPECT_FALSE(two->bindParameter(3, 1));
    EXPECT_EQ(log.text(), "") << "a bad index is refused without a report";
    EXPECT_TRUE(two->bindParameter(1, std::wstring(L"first")));
    EXPECT_TRUE(two->bindParameter(2, L"second"));
    ASSERT_TRUE(two->executePreparedQuery());
    // Unchanged bindings run again as they are.
    ASSERT_TRUE(two->executePreparedQuery());
    EXPECT_EQ(db.raw().rows("SELECT a, b FROM t"),
              (std::vector<std::string>{"first|second", "first|second"}));

    // The largest number counts: parameters the text never names may still be bound.
    auto third = prepared(c, L"INSERT INTO t (c) VALUES (]]]3[[[)");
    EXPECT_TRUE(third->bindParameter(1, 1));
    EXPECT_TRUE(third->bindParameter(2, 2));
    EXPECT_TRUE(third->bindParameter(3, 3));
    EXPECT_FALSE(third->bindParameter(4, 4));
}

TEST(SQLitePreparedQuery, TypedBindingsKeepTheirValues) {
    Database db("CREATE TABLE t(k, v);");
    OxQelConnectionSQLite& c = db.connection();
    auto q = prepared(c, L"INSERT INTO t VALUES (]]]1[[[, ]]]2[[[)");
    auto row = [&](const wchar_t* k, auto value) {
        EXPECT_TRUE(q->bindParameter(1, k));
        EXPECT_TRUE(q->bindParameter(2, value));
        EXPECT_TRUE(q->executePreparedQuery());
    };
    row(L"true", true);
    row(L"big", 1099511627776L);
    row(L"min", static_cast<long>(INT64_MIN));
    row(L"double", 0.1);
    row(L"date", OxDateTime(2024, 2, 29, 13, 5, 9));
    OxDateTime invalid;
    invalid.setStatus(OxDateTime::invalid);
    row(L"invalid", invalid);
    EXPECT_EQ(db.raw().rows("SELECT k, typeof(v), quote(v), length(v) FROM t"),
              (std::vector<std::string>{"true|integer|1|1", "big|integer|1099511627776|13",
                                        "min|integer|-9223372036854775808|20", "double|real|0.1|3",
                                        "date|text|'20240229 13:05:09 '|18", "invalid|text|''|0"}));
}

TEST(SQLitePreparedQuery, VariantsBindByColumnType) {
    Database db("CREATE TABLE t(k, v);");
    OxQelConnectionSQLite& c = db.connection();
    auto q = prepared(c, L"INSERT INTO t (k, v) VALUES (]]]1[[[, ]]]2[[[)");
    auto bind = [&](const wchar_t* k, const OxVariant& value, OxQel::FieldType type) {
        EXPECT_TRUE(q->bindParameter(1, k));
        const bool ok = q->bindParameterVariant(2, value, type);
        EXPECT_TRUE(!ok || q->executePreparedQuery());
        return ok;
    };
    const std::vector<uint8_t> bytes{0, 1, 0, 2};
    EXPECT_TRUE(bind(L"int-i8", OxVariant(5000000000LL), OxQel::Integer));
    EXPECT_TRUE(bind(L"int-text", OxVariant(L"12abc"), OxQel::Integer));
    EXPECT_TRUE(bind(L"int-null", OxVariant::null(), OxQel::Integer));
    EXPECT_TRUE(bind(L"text-int", OxVariant(42), OxQel::WString));
    EXPECT_TRUE(bind(L"text-null", OxVariant::null(), OxQel::WString));
    EXPECT_TRUE(bind(L"date-null", OxVariant::null(), OxQel::Date));
    EXPECT_TRUE(bind(L"date", OxVariant(OxDateTime(2020, 12, 31)), OxQel::Date));
    EXPECT_TRUE(bind(L"bool", OxVariant(true), OxQel::Bool));
    EXPECT_TRUE(bind(L"binary", OxVariant::fromBytes(bytes), OxQel::Binary));
    EXPECT_TRUE(bind(L"bytes-as-text", OxVariant::fromBytes(bytes), OxQel::WString));
    EXPECT_TRUE(bind(L"unknown-i4", OxVariant(7), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-i8", OxVariant(-5000000000LL), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-r8", OxVariant(2.5), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-text", OxVariant(L"it's"), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-bytes", OxVariant::fromBytes(bytes), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-null", OxVariant::null(), OxQel::Unknown));
    EXPECT_TRUE(bind(L"unknown-bool", OxVariant(true), OxQel::Unknown));
    EXPECT_TRUE(
        bind(L"unknown-date", OxVariant(OxDateTime(2020, 12, 31, 8, 0, 0)), OxQel::Unknown));
    EXPECT_FALSE(bind(L"beyond", OxVariant(1), static_cast<OxQel::FieldType>(12)));
    EXPECT_FALSE(bind(L"below", OxVariant(1), static_cast<OxQel::FieldType>(-2)));
    EXPECT_EQ(
        db.raw().rows("SELECT k, typeof(v), quote(v) FROM t"),
        (std::vector<std::string>{
            "int-i8|integer|5000000000", "int-text|integer|12", "int-null|null|NULL",
            "text-int|text|'42'", "text-null|null|NULL", "date-null|null|NULL",
            "date|text|'20201231 00:00:00 '", "bool|integer|1", "binary|blob|X'00010002'",
            "bytes-as-text|blob|X'00010002'", "unknown-i4|integer|7",
            "unknown-i8|integer|-5000000000", "unknown-r8|real|2.5", "unknown-text|text|'it''s'",
            "unknown-bytes|blob|X'00010002'", "unknown-null|null|NULL", "unknown-bool|integer|1",
            "unknown-date|text|'20201231 08:00:00 '"}));
}

TEST(SQLitePreparedQuery, ColumnsOfNoKnownTypeTakeEveryValue) {
    // The declared types of most real files are no exact type name: the library type is
    // Unknown, and a copy of such a table binds every value by its own type.
    Database db(
        "CREATE TABLE t(v VARCHAR(40), d DATETIME, n NUMERIC(10,2), w NVARCHAR, i INT, "
        "b BOOLEAN);");
    OxQelConnectionSQLite& c = db.connection();
    OxQelFieldDefArray fields;
    ASSERT_TRUE(c.getFieldDef(L"t", L"*", fields));
    for (const auto& f : fields) EXPECT_EQ(f.getFieldType(), OxQel::Unknown);
    auto q = prepared(c,
                      L"INSERT INTO t VALUES (]]]1[[[, ]]]2[[[, ]]]3[[[, ]]]4[[[, ]]]5[[[, "
                      L"]]]6[[[)");
    const std::vector<OxVariant> row = {OxVariant(L"name"),      OxVariant(L"2020-01-02"),
                                        OxVariant(12.25),        OxVariant(L"wide ü"),
                                        OxVariant(7000000000LL), OxVariant(true)};
    for (size_t i = 0; i < row.size(); ++i)
        ASSERT_TRUE(
            q->bindParameterVariant(static_cast<int>(i + 1), row[i], fields[i].getFieldType()));
    ASSERT_TRUE(q->executePreparedQuery());
    EXPECT_EQ(db.raw().rows("SELECT * FROM t"),
              std::vector<std::string>{"name|2020-01-02|12.25|wide ü|7000000000|1"});
}

TEST(SQLitePreparedQuery, LifecycleAndFailures) {
    Database db("CREATE TABLE t(a); CREATE TABLE u(b); INSERT INTO t VALUES (1);");
    OxQelConnectionSQLite& c = db.connection();
    LogCapture log;
    OxQelPreparedQuerySQLite q;
    ASSERT_TRUE(q.setConnection(&c));
    EXPECT_FALSE(q.executePreparedQuery());
    EXPECT_FALSE(q.prepareQuery(L"INSERT INTO missing VALUES (]]]1[[[)"));
    EXPECT_TRUE(log.contains("FUNCTION: OxQelPreparedQuerySQLite::prepareQuery"));
    EXPECT_TRUE(log.contains("INSERT INTO missing VALUES (]]]1[[[)"));

    // A prepared SELECT fails, and leaves no read lock behind that would stall writers.
    log.clear();
    ASSERT_TRUE(q.prepareQuery(L"SELECT a FROM t"));
    EXPECT_FALSE(q.executePreparedQuery());
    EXPECT_TRUE(log.contains("Impossible to execute query"));
    {
        OxSQLiteTest::RawDb writer = db.raw();
        const auto start = std::chrono::steady_clock::now();
        writer.exec("INSERT INTO t VALUES (2)");
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(2));
    }

    // Preparing again releases the old statement first.
    ASSERT_TRUE(q.prepareQuery(L"INSERT INTO u VALUES (]]]1[[[)"));
    EXPECT_TRUE(q.bindParameter(1, 5));
    EXPECT_TRUE(q.executePreparedQuery());
    EXPECT_EQ(db.raw().scalar("SELECT b FROM u"), "5");
    EXPECT_TRUE(q.deletePreparedQuery());
    EXPECT_FALSE(q.executePreparedQuery());
    EXPECT_FALSE(q.bindParameter(1, 5));

    // A statement of a closed or reopened connection is not run.
    ASSERT_TRUE(q.prepareQuery(L"INSERT INTO u VALUES (]]]1[[[)"));
    ASSERT_TRUE(c.closeDatabase());
    EXPECT_FALSE(q.bindParameter(1, 6));
    EXPECT_FALSE(q.executePreparedQuery());
    ASSERT_TRUE(c.openConnection(db.wpath(), L"", L"", L""));
    EXPECT_FALSE(q.bindParameter(1, 6));
    EXPECT_FALSE(q.executePreparedQuery());
    EXPECT_TRUE(q.prepareQuery(L"INSERT INTO u VALUES (]]]1[[[)"));
    EXPECT_TRUE(q.bindParameter(1, 6));
    EXPECT_TRUE(q.executePreparedQuery());
    EXPECT_EQ(db.raw().scalar("SELECT group_concat(b) FROM u"), "5,6");
}

TEST(SQLitePreparedQuery, TextsArriveWholeInEitherEncoding) {
    Database utf8("CREATE TABLE t(v);");
    Database utf16;
    ASSERT_TRUE(utf16.connection().execute(L"CREATE TABLE t(v)"));
    for (Database* db : {&utf8, &utf16}) {
        auto q = prepared(db->connection(), L"INSERT INTO t VALUES (]]]1[[[)");
        // Every length of UTF-8 sequence, an embedded zero, and a lone surrogate.
        std::wstring text = L"a\u00e9\u4e2d\U0001F600";
        text.push_back(L'\0');
        text += L"z";
        text.push_back(static_cast<wchar_t>(0xD800));
        ASSERT_TRUE(q->bindParameter(1, text));
        ASSERT_TRUE(q->executePreparedQuery());
        ASSERT_TRUE(q->bindParameter(1, std::wstring(300, L'\u00fc')));
        ASSERT_TRUE(q->executePreparedQuery());
        EXPECT_EQ(db->raw().rows("SELECT v = 'aé中😀' || char(0) || 'z' || char(65533), "
                                 "v = printf('%.300c', 'ü') FROM t ORDER BY rowid"),
                  (std::vector<std::string>{"1|0", "0|1"}));
    }
}
