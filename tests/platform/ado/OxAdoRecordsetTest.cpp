#include <gtest/gtest.h>

#include <memory>

#include "platform/ado/OxAdoCommand.h"
#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoRecordset.h"
#include "testprovider/OxAdoTestProvider.h"

using namespace OxAdo;
using OxAdoTest::column;
using OxAdoTest::Result;

namespace {
class AdoRecordsetTest : public ::testing::Test {
protected:
    void SetUp() override {
        conn = OxAdoConnection::create();
        conn->open(OxAdoTest::kConnectionString);
    }

    // Three rows of t(id key, name, qty).
    void queuePeople() {
        script->primaryKeys[L"t"] = {L"id"};
        script->results.push_back(Result::rowsOf(
            {column(L"id", adInteger, 4, L"t"), column(L"name", adVarWChar, 20, L"t"),
             column(L"qty", adInteger, 4, L"t")},
            {{OxVariant(int32_t{1}), OxVariant(L"Ann"), OxVariant(int32_t{5})},
             {OxVariant(int32_t{2}), OxVariant(L"bob"), OxVariant::null()},
             {OxVariant(int32_t{3}), OxVariant(L"Cy"), OxVariant(int32_t{7})}}));
    }

    std::shared_ptr<OxAdoRecordset> open(int location, int cursor, int lock) {
        auto rs = OxAdoRecordset::create();
        rs->setCursorLocation(location);
        rs->open(L"SELECT id, name, qty FROM t", conn, cursor, lock);
        return rs;
    }

    static std::wstring name(OxAdoRecordset& rs) {
        return rs.fields().item(L"name")->value().str();
    }

    static OxHResult errorOf(const std::function<void()>& f) {
        try {
            f();
        } catch (const OxComError& e) {
            return e.Error();
        }
        return OxHr::S_OK;
    }

    std::shared_ptr<OxAdoTest::Script> script = std::make_shared<OxAdoTest::Script>();
    OxAdoTest::Install install{script};
    std::shared_ptr<OxAdoConnection> conn;
};
}  // namespace

TEST_F(AdoRecordsetTest, ClientCursorIsStaticAndCounts) {
    queuePeople();
    auto rs = open(adUseClient, adOpenForwardOnly, adLockReadOnly);
    EXPECT_EQ(rs->cursorType(), adOpenStatic);
    EXPECT_EQ(rs->recordCount(), 3);
    EXPECT_FALSE(rs->bof());
    EXPECT_EQ(name(*rs), L"Ann");
    rs->moveLast();
    EXPECT_EQ(name(*rs), L"Cy");
    rs->moveNext();
    EXPECT_TRUE(rs->eof());
    EXPECT_EQ(errorOf([&] { rs->moveNext(); }), hresultOf(adErrNoCurrentRecord));
    EXPECT_EQ(errorOf([&] { (void)rs->fields().item(0L)->value(); }),
              hresultOf(adErrNoCurrentRecord));
    rs->move(-2);
    EXPECT_EQ(name(*rs), L"bob");
    EXPECT_EQ(rs->absolutePosition(), 2);
    const OxVariant mark = rs->bookmark();
    rs->moveFirst();
    rs->movePrevious();
    EXPECT_TRUE(rs->bof());
    rs->setBookmark(mark);
    EXPECT_EQ(name(*rs), L"bob");
    EXPECT_TRUE(rs->fields().item(L"qty")->value().isNull());
    // Fields keep their metadata; a read-only recordset refuses changes.
    EXPECT_EQ(rs->fields().item(1L)->type(), adVarWChar);
    EXPECT_EQ(rs->fields().item(L"NAME")->definedSize(), 20);
    EXPECT_EQ(errorOf([&] { rs->fields().item(L"name")->setValue(OxVariant(L"x")); }),
              hresultOf(adErrFeatureNotAvailable));
    EXPECT_FALSE(rs->supports(adAddNew));
    EXPECT_TRUE(rs->supports(adBookmark | adMovePrevious));
}

TEST_F(AdoRecordsetTest, EmptyResultIsBothBofAndEof) {
    script->results.push_back(Result::rowsOf({column(L"a", adInteger)}, {}));
    auto rs = open(adUseClient, adOpenStatic, adLockReadOnly);
    EXPECT_TRUE(rs->bof());
    EXPECT_TRUE(rs->eof());
    EXPECT_EQ(rs->recordCount(), 0);
    EXPECT_EQ(errorOf([&] { rs->moveFirst(); }), hresultOf(adErrNoCurrentRecord));
    // A statement without rows leaves the recordset closed.
    script->results.push_back(Result::affected(4));
    auto closed = OxAdoRecordset::create();
    closed->open(L"UPDATE t SET a = 1", conn);
    EXPECT_EQ(closed->state(), adStateClosed);
    EXPECT_EQ(errorOf([&] { (void)closed->eof(); }), hresultOf(adErrObjectClosed));
}

TEST_F(AdoRecordsetTest, ForwardOnlyStreamsAndRunsAgainForMoveFirst) {
    queuePeople();
    auto rs = open(adUseServer, adOpenForwardOnly, adLockReadOnly);
    EXPECT_EQ(rs->recordCount(), -1);
    EXPECT_EQ(errorOf([&] { rs->movePrevious(); }), Hr::DB_E_CANTFETCHBACKWARDS);
    EXPECT_EQ(errorOf([&] { rs->moveLast(); }), Hr::DB_E_CANTFETCHBACKWARDS);
    EXPECT_EQ(errorOf([&] { rs->setSort(L"name"); }), hresultOf(adErrFeatureNotAvailable));
    rs->moveNext();
    rs->moveNext();
    EXPECT_EQ(rs->absolutePosition(), 3);
    rs->moveNext();
    EXPECT_TRUE(rs->eof());
    EXPECT_FALSE(rs->bof());
    queuePeople();
    rs->moveFirst();
    EXPECT_EQ(name(*rs), L"Ann");
    EXPECT_EQ(script->statements.size(), 2u);
    // Find reads forward only.
    rs->find(L"name = 'CY'");
    EXPECT_EQ(name(*rs), L"Cy");
    rs->find(L"name = 'Ann'");
    EXPECT_TRUE(rs->eof());
}

TEST_F(AdoRecordsetTest, FindFilterAndSort) {
    queuePeople();
    auto rs = open(adUseClient, adOpenStatic, adLockReadOnly);
    rs->find(L"qty > 5");
    EXPECT_EQ(name(*rs), L"Cy");
    rs->find(L"name LIKE 'a*'", 0, adSearchBackward);
    EXPECT_EQ(name(*rs), L"Ann");
    rs->find(L"name = 'Ann'", 1);
    EXPECT_TRUE(rs->eof());
    EXPECT_EQ(errorOf([&] { rs->find(L"qty = 1 AND qty = 2"); }), hresultOf(adErrInvalidArgument));

    rs->setFilter(OxVariant(L"qty IS NOT NULL"));
    EXPECT_EQ(rs->recordCount(), 2);
    EXPECT_EQ(name(*rs), L"Ann");
    rs->setSort(L"qty DESC");
    EXPECT_EQ(name(*rs), L"Cy");
    rs->setFilter(OxVariant(L""));
    EXPECT_EQ(rs->recordCount(), 3);
    // NULL sorts first; the sort stays while the filter changes.
    EXPECT_TRUE(rs->fields().item(L"qty")->value().isNull() == false);
    rs->setSort(L"qty");
    EXPECT_EQ(name(*rs), L"bob");
    rs->setFilter(OxVariant(L"name = 'nobody'"));
    EXPECT_TRUE(rs->bof() && rs->eof());
    // A bad filter leaves the one before it in place.
    EXPECT_THROW(rs->setFilter(OxVariant(L"qty = = 1")), OxComError);
    EXPECT_EQ(rs->filter().str(), L"name = 'nobody'");
}

TEST_F(AdoRecordsetTest, ImmediateEditsWriteKeyedStatements) {
    queuePeople();
    auto rs = open(adUseClient, adOpenStatic, adLockOptimistic);
    EXPECT_TRUE(rs->fields().item(L"id")->attributes() & adFldKeyColumn);
    rs->moveNext();
    rs->fields().item(L"name")->setValue(OxVariant(L"Bob"));
    EXPECT_EQ(rs->editMode(), adEditInProgress);
    script->results.push_back(Result::affected(1));
    // Moving off the row writes its edit.
    rs->moveNext();
    ASSERT_EQ(script->statements.size(), 2u);
    EXPECT_EQ(script->statements[1],
              L"UPDATE \"t\" SET \"name\" = ? WHERE \"id\" = ? AND \"name\" = ?");
    ASSERT_EQ(script->parameters[1].size(), 3u);
    EXPECT_EQ(script->parameters[1][0].value.str(), L"Bob");
    EXPECT_EQ(script->parameters[1][1].value.lVal(), 2);
    EXPECT_EQ(script->parameters[1][2].value.str(), L"bob");

    // A value of the wrong type or too long never reaches the source.
    EXPECT_EQ(errorOf([&] { rs->fields().item(L"qty")->setValue(OxVariant(L"many")); }),
              Hr::DB_E_ERRORSOCCURRED);
    EXPECT_EQ(
        errorOf([&] { rs->fields().item(L"name")->setValue(OxVariant(std::wstring(21, L'x'))); }),
        Hr::DB_E_ERRORSOCCURRED);
    rs->fields().item(L"qty")->setValue(OxVariant(L"8"));
    EXPECT_EQ(rs->fields().item(L"qty")->value().vt(), VT_I4);
    // Nothing found to update: a conflict, and the edit stays pending.
    script->results.push_back(Result::affected(0));
    EXPECT_EQ(errorOf([&] { rs->update(); }), Hr::DB_E_CONCURRENCYVIOLATION);
    EXPECT_EQ(rs->editMode(), adEditInProgress);
    rs->cancelUpdate();
    EXPECT_EQ(rs->fields().item(L"qty")->value().lVal(), 7);

    // A new row inserts the columns set, and the source's key comes back.
    script->results.push_back(Result::affected(1));
    script->lastInserted = OxVariant(int32_t{42});
    rs->addNew();
    rs->fields().item(L"name")->setValue(OxVariant(L"Dee"));
    rs->update();
    EXPECT_EQ(script->statements.back(), L"INSERT INTO \"t\" (\"name\") VALUES (?)");
    EXPECT_EQ(rs->recordCount(), 4);

    rs->moveFirst();
    script->results.push_back(Result::affected(1));
    rs->remove();
    EXPECT_EQ(script->statements.back(), L"DELETE FROM \"t\" WHERE \"id\" = ?");
    // The deleted row stays current until the cursor moves.
    EXPECT_EQ(errorOf([&] { (void)rs->fields().item(0L)->value(); }),
              hresultOf(adErrNoCurrentRecord));
    rs->moveNext();
    EXPECT_EQ(name(*rs), L"Bob");
    EXPECT_EQ(rs->recordCount(), 3);
}

TEST_F(AdoRecordsetTest, AutoIncrementColumnsComeBackAfterInsert) {
    script->results.push_back(Result::rowsOf(
        {column(L"id", adInteger, 4, L"t", true), column(L"name", adVarWChar, 20, L"t")}, {}));
    auto rs = open(adUseClient, adOpenStatic, adLockOptimistic);
    EXPECT_TRUE(rs->fields().item(L"id")->attributes() & adFldRowID);
    EXPECT_EQ(errorOf([&] {
                  rs->addNew();
                  rs->fields().item(L"id")->setValue(OxVariant(int32_t{5}));
              }),
              Hr::DB_E_ERRORSOCCURRED);
    script->lastInserted = OxVariant(int64_t{42});
    rs->fields().item(L"name")->setValue(OxVariant(L"x"));
    rs->update();
    EXPECT_EQ(rs->fields().item(L"id")->value().vt(), VT_I4);
    EXPECT_EQ(rs->fields().item(L"id")->value().lVal(), 42);
    EXPECT_TRUE(script->sawCall(L"lastInsertedValue t id"));
}

TEST_F(AdoRecordsetTest, TablesWithoutKeyChangeOneRowOrNone) {
    // No key: the row is found by its comparable columns, and only when exactly one row
    // matches, so that duplicates are never changed together.
    script->results.push_back(
        Result::rowsOf({column(L"a", adVarWChar, 10, L"k"), column(L"d", adDouble, 8, L"k"),
                        column(L"m", adLongVarWChar, 0, L"k")},
                       {{OxVariant(L"x"), OxVariant(1.5), OxVariant(L"memo")}}));
    auto rs = open(adUseClient, adOpenStatic, adLockOptimistic);
    rs->fields().item(L"a")->setValue(OxVariant(L"y"));
    script->results.push_back(Result::rowsOf({column(L"n", adInteger)}, {{OxVariant(int32_t{2})}}));
    EXPECT_EQ(errorOf([&] { rs->update(); }), OxHr::E_FAIL);
    ASSERT_EQ(script->statements.size(), 2u);
    EXPECT_EQ(script->statements[1], L"SELECT COUNT(*) FROM \"k\" WHERE \"a\" = ?");

    script->results.push_back(Result::rowsOf({column(L"n", adInteger)}, {{OxVariant(int32_t{1})}}));
    script->results.push_back(Result::affected(1));
    rs->update();
    EXPECT_EQ(script->statements.back(), L"UPDATE \"k\" SET \"a\" = ? WHERE \"a\" = ?");
}

TEST_F(AdoRecordsetTest, BatchEditsWaitForUpdateBatch) {
    queuePeople();
    auto rs = open(adUseClient, adOpenStatic, adLockBatchOptimistic);
    rs->fields().item(L"qty")->setValue(OxVariant(int32_t{6}));
    rs->update();
    rs->moveNext();
    rs->remove();
    rs->addNew();
    rs->fields().item(L"name")->setValue(OxVariant(L"New"));
    rs->update();
    EXPECT_EQ(script->statements.size(), 1u);
    rs->setFilter(OxVariant(int32_t{adFilterPendingRecords}));
    EXPECT_EQ(rs->recordCount(), 2);
    rs->setFilter(OxVariant(int32_t{adFilterNone}));

    // The second write fails: the others go through, the failed row stays pending.
    script->results.push_back(Result::affected(1));
    script->results.push_back(Result::affected(0));
    script->results.push_back(Result::affected(1));
    EXPECT_EQ(errorOf([&] { rs->updateBatch(); }), Hr::DB_E_CONCURRENCYVIOLATION);
    ASSERT_EQ(script->statements.size(), 4u);
    EXPECT_EQ(script->statements[1],
              L"UPDATE \"t\" SET \"qty\" = ? WHERE \"id\" = ? AND \"qty\" = ?");
    EXPECT_EQ(script->statements[2], L"DELETE FROM \"t\" WHERE \"id\" = ?");
    EXPECT_EQ(script->statements[3], L"INSERT INTO \"t\" (\"name\") VALUES (?)");
    rs->setFilter(OxVariant(int32_t{adFilterConflictingRecords}));
    EXPECT_EQ(rs->recordCount(), 0);  // the deleted row is not visible
    rs->setFilter(OxVariant(int32_t{adFilterNone}));
    EXPECT_EQ(rs->recordCount(), 3);

    // CancelBatch brings the deleted row back.
    rs->cancelBatch();
    EXPECT_EQ(rs->recordCount(), 4);
}

TEST_F(AdoRecordsetTest, CancelUpdateOfANewRowReturnsToTheRowBefore) {
    queuePeople();
    auto rs = open(adUseClient, adOpenStatic, adLockOptimistic);
    rs->moveNext();
    rs->addNew();
    EXPECT_EQ(rs->editMode(), adEditAdd);
    EXPECT_TRUE(rs->fields().item(L"name")->value().isNull());
    rs->cancelUpdate();
    EXPECT_EQ(name(*rs), L"bob");
    EXPECT_EQ(rs->recordCount(), 3);
    EXPECT_EQ(script->statements.size(), 1u);
}

TEST_F(AdoRecordsetTest, ProviderFailuresFillTheErrorsCollection) {
    script->results.push_back(
        Result::failure(Hr::DB_E_ERRORSINCOMMAND, L"syntax error near X", 102, L"42000"));
    auto rs = OxAdoRecordset::create();
    EXPECT_EQ(errorOf([&] { rs->open(L"SELEC X", conn); }), Hr::DB_E_ERRORSINCOMMAND);
    ASSERT_EQ(conn->errors().count(), 1);
    EXPECT_EQ(conn->errors().item(0L)->nativeError(), 102);
    EXPECT_EQ(conn->errors().item(0L)->description(), L"syntax error near X");
    EXPECT_EQ(conn->errors().item(0L)->sqlState(), L"42000");
    // Errors stay until the next provider failure.
    conn->execute(L"SELECT 1");
    EXPECT_EQ(conn->errors().count(), 1);
    // A failure while reading rows is a provider failure too.
    Result r = Result::rowsOf({column(L"a", adInteger)},
                              {{OxVariant(int32_t{1})}, {OxVariant(int32_t{2})}});
    r.failAfterRows = 1;
    r.error = OxAdoTest::error(OxHr::E_FAIL, L"lost", 10054, L"08S01");
    script->results.push_back(r);
    auto rows = conn->execute(L"SELECT a");
    EXPECT_EQ(errorOf([&] { rows->moveNext(); }), OxHr::E_FAIL);
    EXPECT_EQ(conn->errors().item(0L)->nativeError(), 10054);
}

TEST_F(AdoRecordsetTest, ConnectionStateAndTransactions) {
    EXPECT_EQ(conn->state(), adStateOpen);
    EXPECT_EQ(conn->provider(), OxAdoTest::kProvider);
    EXPECT_EQ(errorOf([&] { conn->commitTrans(); }), Hr::XACT_E_NOTRANSACTION);
    EXPECT_EQ(conn->beginTrans(), 1);
    EXPECT_EQ(errorOf([&] { conn->beginTrans(); }), Hr::XACT_E_XTIONEXISTS);
    EXPECT_EQ(errorOf([&] { conn->close(); }), hresultOf(adErrInTransaction));
    conn->rollbackTrans();
    // Closing the connection closes its recordsets.
    queuePeople();
    auto rs = open(adUseServer, adOpenKeyset, adLockReadOnly);
    conn->close();
    EXPECT_EQ(rs->state(), adStateClosed);
    EXPECT_EQ(script->openSessions, 0);
    EXPECT_EQ(errorOf([&] { conn->close(); }), hresultOf(adErrObjectClosed));
    // A source that lost its link reads as closed.
    conn->open();
    script->broken = true;
    EXPECT_EQ(conn->state(), adStateClosed);
    EXPECT_EQ(errorOf([&] { conn->execute(L"SELECT 1"); }), hresultOf(adErrInvalidConnection));
}

TEST_F(AdoRecordsetTest, CommandParametersAreBoundInOrder) {
    auto cmd = OxAdoCommand::create();
    cmd->setActiveConnection(conn);
    cmd->setCommandText(L"INSERT INTO t VALUES (?, ?)");
    cmd->parameters().append(
        cmd->createParameter(L"@P1", adInteger, adParamInput, -1, OxVariant(L"12")));
    cmd->parameters().append(
        cmd->createParameter(L"@P2", adDBTimeStamp, adParamInput, -1, OxVariant(45000.5)));
    EXPECT_EQ(errorOf([&] { cmd->parameters().append(cmd->parameters().item(L"@p1")); }),
              hresultOf(adErrObjectInCollection));
    EXPECT_EQ(cmd->execute(nullptr, long{adCmdText} | adExecuteNoRecords), nullptr);
    ASSERT_EQ(script->parameters.back().size(), 2u);
    // Values reach the provider in their parameters' types.
    EXPECT_EQ(script->parameters.back()[0].value.vt(), VT_I4);
    EXPECT_EQ(script->parameters.back()[1].value.vt(), VT_DATE);
    cmd->parameters().item(L"@P1")->setValue(OxVariant(L"not a number"));
    EXPECT_EQ(errorOf([&] { cmd->execute(); }), Hr::DB_E_ERRORSOCCURRED);
}
