#include <gtest/gtest.h>

#include <memory>

#include "OxQelLib/ado/OxQelPreparedQueryADO.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "TestConnectionADO.h"
#include "platform/ado/OxAdoDefs.h"
#include "testprovider/OxAdoTestProvider.h"

using namespace OxAdo;

namespace {
class PreparedQueryADOTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(conn.openConnection(L"", OxAdoTest::kConnectionString, L"", L""));
        ASSERT_TRUE(query.setConnection(&conn));
    }

    const std::vector<OxAdoParamValue>& lastParameters() const { return script->parameters.back(); }

    std::shared_ptr<OxAdoTest::Script> script = std::make_shared<OxAdoTest::Script>();
    OxAdoTest::Install install{script};
    TestConnectionADO conn;
    OxQelPreparedQueryADO query;
};
}  // namespace

TEST_F(PreparedQueryADOTest, MarkersBecomePlaceholders) {
    EXPECT_EQ(query.formatParametersInQuery(L"INSERT INTO t VALUES (]]]1[[[, ]]]22[[[, ']]x[[')"),
              L"INSERT INTO t VALUES (?, ?, ']]x[[')");
    EXPECT_EQ(query.formatParametersInQuery(L"]]]]1[[[[ ]]][[[ ]]]1[["), L"]?[ ]]][[[ ]]]1[[");
    EXPECT_EQ(query.formatParametersInQuery(L""), L"");
}

TEST_F(PreparedQueryADOTest, FirstExecutionCreatesLaterOnesRevalue) {
    EXPECT_TRUE(query.deletePreparedQuery());  // never prepared
    EXPECT_FALSE(query.executePreparedQuery());
    ASSERT_TRUE(
        query.prepareQuery(L"INSERT INTO t (a, b, c, d) VALUES (]]]1[[[, ]]]2[[[, "
                           L"]]]3[[[, ]]]4[[[)"));
    EXPECT_FALSE(query.bindParameter(0, 5L));
    EXPECT_TRUE(query.bindParameter(1, 5L));
    EXPECT_TRUE(query.bindParameter(2, std::wstring(L"x")));
    EXPECT_TRUE(query.bindParameter(3, OxDateTime(2024, 1, 2, 13, 14, 15)));
    EXPECT_TRUE(query.bindParameter(4, true));
    ASSERT_TRUE(query.executePreparedQuery());
    EXPECT_EQ(script->statements.back(), L"INSERT INTO t (a, b, c, d) VALUES (?, ?, ?, ?)");
    ASSERT_EQ(lastParameters().size(), 4u);
    EXPECT_EQ(lastParameters()[0].type, adInteger);
    EXPECT_EQ(lastParameters()[0].value.lVal(), 5);
    EXPECT_EQ(lastParameters()[1].value.str(), L"x");
    // Dates keep their time of day.
    EXPECT_EQ(lastParameters()[2].type, adDBTimeStamp);
    EXPECT_EQ(lastParameters()[2].value.vt(), VT_DATE);
    EXPECT_EQ(OxDateTime(lastParameters()[2].value.date()).getHour(), 13);
    EXPECT_EQ(lastParameters()[3].value.boolVal(), VARIANT_TRUE);

    // Later executions give the same parameters new values.
    EXPECT_TRUE(query.bindParameter(2, std::wstring(L"y")));
    ASSERT_TRUE(query.executePreparedQuery());
    EXPECT_EQ(lastParameters()[0].value.lVal(), 5);
    EXPECT_EQ(lastParameters()[1].value.str(), L"y");
    // An index not bound before the first execution cannot be bound now.
    OxQel::Util::SilentReporting quiet;
    EXPECT_FALSE(query.bindParameter(5, 1L));

    EXPECT_TRUE(query.deletePreparedQuery());
    EXPECT_FALSE(query.executePreparedQuery());
}

TEST_F(PreparedQueryADOTest, GapsStopTheWalk) {
    ASSERT_TRUE(query.prepareQuery(L"INSERT INTO t VALUES (]]]1[[[, ]]]2[[[, ]]]3[[[)"));
    query.bindParameter(1, 1L);
    query.bindParameter(3, 3L);
    query.executePreparedQuery();
    ASSERT_EQ(lastParameters().size(), 1u);
    EXPECT_EQ(lastParameters()[0].value.lVal(), 1);
}

TEST_F(PreparedQueryADOTest, EachPlaceholderTakesTheValueOfItsNumber) {
    ASSERT_TRUE(query.prepareQuery(L"UPDATE t SET a = ]]]2[[[, b = ]]]1[[[ WHERE c = ]]]2[[["));
    query.bindParameter(1, std::wstring(L"one"));
    query.bindParameter(2, std::wstring(L"two"));
    ASSERT_TRUE(query.executePreparedQuery());
    ASSERT_EQ(lastParameters().size(), 3u);
    EXPECT_EQ(lastParameters()[0].value.str(), L"two");
    EXPECT_EQ(lastParameters()[1].value.str(), L"one");
    EXPECT_EQ(lastParameters()[2].value.str(), L"two");
    query.bindParameter(2, std::wstring(L"deux"));
    ASSERT_TRUE(query.executePreparedQuery());
    EXPECT_EQ(lastParameters()[0].value.str(), L"deux");
    EXPECT_EQ(lastParameters()[2].value.str(), L"deux");
}

TEST_F(PreparedQueryADOTest, VariantsBindByFieldType) {
    ASSERT_TRUE(query.prepareQuery(L"INSERT INTO t VALUES (]]]1[[[, ]]]2[[[, ]]]3[[[, ]]]4[[[)"));
    query.bindParameterVariant(1, OxVariant(L"w"), OxQel::WString);
    query.bindParameterVariant(2, OxVariant::fromBytes({1, 2, 3}), OxQel::Binary);
    query.bindParameterVariant(3, OxVariant(6000000000LL), OxQel::Integer);
    query.bindParameter(4, OxDateTime(OxDateTime::kMaxSerial + 10));
    ASSERT_TRUE(query.executePreparedQuery());
    ASSERT_EQ(lastParameters().size(), 4u);
    EXPECT_EQ(lastParameters()[0].type, adVarWChar);
    EXPECT_EQ(lastParameters()[1].type, adLongVarBinary);
    EXPECT_EQ(lastParameters()[1].value.bytesSize(), 3u);
    EXPECT_EQ(lastParameters()[2].type, adBigInt);
    EXPECT_EQ(lastParameters()[2].value.llVal(), 6000000000LL);
    // A date that is not valid binds as NULL.
    EXPECT_TRUE(lastParameters()[3].value.isNull());
}

TEST_F(PreparedQueryADOTest, AFailedFirstExecutionCanBeRetried) {
    ASSERT_TRUE(query.prepareQuery(L"INSERT INTO t VALUES (]]]1[[[)"));
    query.bindParameter(1, 1L);
    script->results.push_back(
        OxAdoTest::Result::failure(Hr::DB_E_INTEGRITYVIOLATION, L"dup", 19, L"23000"));
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_FALSE(query.executePreparedQuery());
    }
    query.bindParameter(1, 2L);
    ASSERT_TRUE(query.executePreparedQuery());
    ASSERT_EQ(lastParameters().size(), 1u);
    EXPECT_EQ(lastParameters()[0].value.lVal(), 2);
}
