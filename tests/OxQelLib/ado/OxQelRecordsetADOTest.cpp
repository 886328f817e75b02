#include <gtest/gtest.h>

#include <memory>

#include "OxQelLib/ado/OxQelRecordsetADOSqlServer.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "TestConnectionADO.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoRecordset.h"
#include "testprovider/OxAdoTestProvider.h"

using namespace OxAdo;
using OxAdoTest::column;
using OxAdoTest::Result;

namespace {
class InspectedRecordset : public OxQelRecordsetADO {
public:
    using OxQelRecordsetADO::releaseInstance;
    using OxQelRecordsetADO::stripDefaultText;
};

class RecordsetADOTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(conn.openConnection(L"", OxAdoTest::kConnectionString, L"", L""));
    }

    Result people() const {
        return Result::rowsOf(
            {column(L"id", adInteger, 4, L"t"), column(L"Name", adVarWChar, 20, L"t"),
             column(L"big", adBigInt, 8, L"t"), column(L"ok", adBoolean, 2, L"t")},
            {{OxVariant(int32_t{1}), OxVariant(L"Ann"), OxVariant(10LL), OxVariant(true)},
             {OxVariant(int32_t{2}), OxVariant(L"bob"), OxVariant::null(), OxVariant(false)},
             {OxVariant(int32_t{3}), OxVariant(L"Cy"), OxVariant(30LL), OxVariant::null()}});
    }

    std::shared_ptr<OxAdoTest::Script> script = std::make_shared<OxAdoTest::Script>();
    OxAdoTest::Install install{script};
    TestConnectionADO conn;
};
}  // namespace

TEST(RecordsetADODefaultsTest, CursorSettingsOfEachClass) {
    OxQelRecordsetADO plain;
    EXPECT_EQ(plain.getAdoCursorType(), adOpenForwardOnly);
    EXPECT_EQ(plain.getAdoLockType(), adLockReadOnly);
    EXPECT_TRUE(plain.isServerSideCursor());
    OxQelRecordsetADOSqlServer server;
    EXPECT_EQ(server.getAdoCursorType(), adOpenKeyset);
    EXPECT_EQ(server.getAdoLockType(), adLockPessimistic);
    std::unique_ptr<OxObject> copy(server.clone());
    EXPECT_NE(OxQelRecordsetADOSqlServer::cast(copy.get()), nullptr);
    EXPECT_EQ(static_cast<OxQelRecordsetADO*>(copy.get())->getRecordsetPtr(),
              server.getRecordsetPtr());
}

TEST(RecordsetADODefaultsTest, DefaultTextsLoseTheirServerDecoration) {
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"(N'abc')"), L"abc");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"('abc')"), L"abc");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"((0))"), L"(0)");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"0"), L"0");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"('')"), L"");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"(getdate())"), L"getdate()");
    // Texts too short for the quotes they start with keep them.
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"(')"), L"'");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"(N')"), L"N'");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"()"), L"");
    EXPECT_EQ(InspectedRecordset::stripDefaultText(L"("), L"(");
}

TEST_F(RecordsetADOTest, ReadsTypesAndValues) {
    script->results.push_back(people());
    OxQelRecordsetADO rs;
    ASSERT_TRUE(rs.openSQL(&conn, L"SELECT * FROM t"));
    EXPECT_EQ(rs.getFieldCount(), 4);
    EXPECT_EQ(rs.getFieldName(1), L"Name");
    EXPECT_EQ(rs.getFieldType(0L), OxQel::Integer);
    EXPECT_EQ(rs.getFieldType(L"Name"), OxQel::WString);
    EXPECT_EQ(rs.getFieldType(OxVariant(L"ok")), OxQel::Bool);
    EXPECT_EQ(rs.getFieldSize(L"Name"), 20);
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_EQ(rs.getFieldType(L"missing"), OxQel::Unknown);
        EXPECT_EQ(rs.getFieldSize(L"missing"), 0);
        std::wstring s;
        EXPECT_FALSE(rs.getField(L"missing", s));
    }
    EXPECT_EQ(rs.getvarFieldString(OxVariant(L"Name")), L"Ann");
    EXPECT_EQ(rs.getvarFieldString(OxVariant(int32_t{1})), L"Ann");
    long big = 0;
    EXPECT_TRUE(rs.getField(L"big", big));
    EXPECT_EQ(big, 10);
    bool ok = false;
    EXPECT_TRUE(rs.getField(3L, ok));
    EXPECT_TRUE(ok);
    ASSERT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.isFieldNull(L"big"));
    EXPECT_TRUE(rs.getField(L"big", big));
    EXPECT_EQ(big, 0);
    ASSERT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.getField(L"ok", ok));
    EXPECT_FALSE(ok);
    EXPECT_FALSE(rs.movePrevious());  // forward only
    EXPECT_TRUE(rs.moveNext());
    EXPECT_TRUE(rs.getEOF());
}

TEST_F(RecordsetADOTest, CountingRowsPutsTheCursorBack) {
    // A dynamic cursor cannot count: the rows are walked.
    script->results.push_back(people());
    OxQelRecordsetADO rs;
    rs.setAdoCursorType(adOpenDynamic);
    ASSERT_TRUE(rs.openSQL(&conn, L"SELECT * FROM t"));
    ASSERT_TRUE(rs.moveNext());
    EXPECT_EQ(rs.getRecordCount(), 3);
    EXPECT_EQ(rs.getszFieldString(L"Name"), L"bob");
    ASSERT_TRUE(rs.moveLast());
    ASSERT_TRUE(rs.moveNext());
    EXPECT_EQ(rs.getRecordCount(), 3);
    EXPECT_TRUE(rs.getEOF());

    // A forward-only cursor runs its query again to come back.
    script->results.push_back(people());
    script->results.push_back(people());
    script->results.push_back(people());
    OxQelRecordsetADO forward;
    ASSERT_TRUE(forward.openSQL(&conn, L"SELECT * FROM t"));
    ASSERT_TRUE(forward.moveNext());
    ASSERT_TRUE(forward.moveNext());
    EXPECT_EQ(forward.getRecordCount(), 3);
    EXPECT_EQ(forward.getszFieldString(L"Name"), L"Cy");

    script->results.push_back(Result::rowsOf({column(L"a", adInteger)}, {}));
    OxQelRecordsetADO empty;
    empty.setAdoCursorType(adOpenDynamic);
    ASSERT_TRUE(empty.openSQL(&conn, L"SELECT a FROM t"));
    EXPECT_EQ(empty.getRecordCount(), 0);
}

TEST_F(RecordsetADOTest, CountingStopsOnSourcesThatNeverEnd) {
    Result endless = people();
    endless.endless = true;
    script->results.push_back(endless);
    OxQelRecordsetADO rs;
    rs.setAdoCursorType(adOpenDynamic);
    ASSERT_TRUE(rs.openSQL(&conn, L"SELECT * FROM t"));
    const long saved = OxQelRecordsetADO::_mlMaxCountedRows;
    OxQelRecordsetADO::_mlMaxCountedRows = 50;
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_EQ(rs.getRecordCount(), -1);
    }
    OxQelRecordsetADO::_mlMaxCountedRows = saved;
    EXPECT_EQ(rs.getszFieldString(L"Name"), L"Ann");

    // A source that fails half way gives no count either.
    Result failing = people();
    failing.failAfterRows = 2;
    failing.error = OxAdoTest::error(OxHr::E_FAIL, L"read error");
    script->results.push_back(failing);
    OxQelRecordsetADO broken;
    broken.setAdoCursorType(adOpenDynamic);
    ASSERT_TRUE(broken.openSQL(&conn, L"SELECT * FROM t"));
    OxQel::Util::SilentReporting quiet;
    EXPECT_EQ(broken.getRecordCount(), -1);
    EXPECT_EQ(broken.getszFieldString(L"Name"), L"Ann");
}

TEST_F(RecordsetADOTest, FailuresGiveNeutralAnswers) {
    OxQel::Util::SilentReporting quiet;
    InspectedRecordset rs;
    script->results.push_back(Result::failure(Hr::DB_E_ERRORSINCOMMAND, L"bad"));
    EXPECT_FALSE(rs.openSQL(&conn, L"SELEC"));
    // openSQL wants a connection of the object model.
    EXPECT_FALSE(rs.openSQL(nullptr, L"SELECT 1"));
    script->results.push_back(people());
    ASSERT_TRUE(rs.openSQL(&conn, L"SELECT * FROM t"));
    rs.releaseInstance();
    EXPECT_TRUE(rs.getEOF());
    EXPECT_FALSE(rs.getBOF());
    EXPECT_EQ(rs.getFieldCount(), 0);
    EXPECT_TRUE(rs.getlFieldValue(0).isEmpty());
    EXPECT_EQ(rs.getRecordCount(), -1);
    EXPECT_EQ(rs.find(L"id = 1"), 0);
}

TEST_F(RecordsetADOTest, FindFilterSortAndDefinitions) {
    script->results.push_back(people());
    OxAdoColumnDesc name;
    name.name = L"Name";
    name.setProperty(L"Default", OxVariant(L"(N'none')"));
    script->addTable(L"t");
    script->columns[L"t"] = {name};
    auto* rs = static_cast<OxQelRecordsetADO*>(conn.createOxQelIRecordset());
    std::unique_ptr<OxQelRecordsetADO> owner(rs);
    ASSERT_TRUE(rs->openSQL(&conn, L"SELECT * FROM t"));
    EXPECT_EQ(rs->getRecordCount(), 3);
    EXPECT_EQ(rs->findFirst(L"Name = 'BOB'"), 1);
    EXPECT_EQ(rs->getszFieldString(L"id"), L"2");
    EXPECT_EQ(rs->findNext(L"Name LIKE '*'"), 1);
    EXPECT_EQ(rs->getszFieldString(L"id"), L"3");
    EXPECT_EQ(rs->findNext(L"Name = 'Ann'"), 0);
    EXPECT_TRUE(rs->getEOF());
    EXPECT_EQ(rs->findNext(L"Name = 'Ann'"), 0);
    EXPECT_EQ(rs->setFilter(std::wstring(L"big > 15")), 1);
    EXPECT_EQ(rs->getRecordCount(), 1);
    EXPECT_TRUE(rs->setFilter(OxVariant(int32_t{adFilterNone})));
    EXPECT_TRUE(rs->setSort(L"Name DESC"));
    EXPECT_EQ(rs->getszFieldString(L"Name"), L"Cy");
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_EQ(rs->setFilter(std::wstring(L"Name = ")), 0);
        EXPECT_FALSE(rs->setSort(L"nothing"));
    }
    EXPECT_TRUE(rs->setOptimize(OxVariant(L"Name"), true));

    // Definitions: the array's mask goes into each entry; defaults come from the catalog.
    OxQelFieldDefArray defs;
    static const bool mask[6] = {true, true, true, true, false, true};
    defs.setIsPropertiesToGetPtr(mask);
    ASSERT_TRUE(rs->getFieldDef(defs));
    ASSERT_EQ(defs.size(), 4u);
    EXPECT_EQ(defs[1].getIsPropertiesToGetPtr(), mask);
    EXPECT_EQ(defs[1].getFieldType(), OxQel::WString);
    EXPECT_EQ(defs[1].getFieldSize(), 20);
    EXPECT_EQ(defs[1].getDefaultValue(), L"none");
    EXPECT_TRUE(defs[1].getCanBeNull());
    EXPECT_FALSE(defs[1].getNoAuto());
    OxQelFieldDef one;
    one.setIsPropertiesToGetPtr(OxQelFieldDef::IsPropertiesToGetNothing);
    ASSERT_TRUE(rs->getFieldDef(OxVariant(L"Name"), one));
    EXPECT_EQ(one.getFieldName(), L"Name");
    EXPECT_EQ(one.getFieldType(), OxQel::Unknown);
    EXPECT_TRUE(one.getDefaultValue().empty());
}

TEST_F(RecordsetADOTest, EditsKeepWholeNumbersWhole) {
    script->primaryKeys[L"t"] = {L"id"};
    script->results.push_back(people());
    auto* rs = static_cast<OxQelRecordsetADO*>(conn.createOxQelIRecordset());
    std::unique_ptr<OxQelRecordsetADO> owner(rs);
    ASSERT_TRUE(rs->openSQL(&conn, L"SELECT * FROM t"));
    EXPECT_TRUE(rs->setField(L"big", 5000000000L));
    EXPECT_TRUE(rs->setField(1L, std::wstring(L"Anna")));
    script->results.push_back(Result::affected(1));
    EXPECT_TRUE(rs->update());
    const auto& params = script->parameters.back();
    ASSERT_GE(params.size(), 2u);
    EXPECT_EQ(params[0].value.str(), L"Anna");
    EXPECT_EQ(params[1].value.llVal(), 5000000000LL);

    EXPECT_TRUE(rs->addNew());
    EXPECT_TRUE(rs->setField(L"id", 9));
    EXPECT_TRUE(rs->cancelUpdate());
    EXPECT_EQ(rs->getRecordCount(), 3);
    {
        OxQel::Util::SilentReporting quiet;
        EXPECT_FALSE(rs->setField(L"id", std::wstring(L"not a number")));
    }
    script->results.push_back(Result::affected(1));
    EXPECT_TRUE(rs->remove());
    EXPECT_EQ(script->statements.back(), L"DELETE FROM \"t\" WHERE \"id\" = ?");
    EXPECT_TRUE(rs->updateBatch());
    EXPECT_TRUE(rs->cancelBatch());
}
