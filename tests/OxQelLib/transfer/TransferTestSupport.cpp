#include "TransferTestSupport.h"

#include <stdexcept>

namespace OxTransferTest {
OX_IMPLEMENT_DYNAMIC(ScriptedSQLite, OxQelConnectionSQLite)

bool ScriptedSQLite::execute(const std::wstring& statement) {
    if (!m_script->writeMultiThread)
        return OxQelConnectionSQLite::execute(statement);
    if (statement == L"BEGIN TRANSACTION") {
        {
            std::lock_guard lock(m_script->threadsMutex);
            m_script->writerThreads.insert(std::this_thread::get_id());
        }
        const int now = ++m_script->inFlight;
        int seen = m_script->mostInFlight;
        while (now > seen && !m_script->mostInFlight.compare_exchange_weak(seen, now)) {
        }
        const bool ok = OxQelConnectionSQLite::execute(L"BEGIN IMMEDIATE TRANSACTION");
        if (!ok)
            --m_script->inFlight;
        return ok;
    }
    const bool ends = statement == L"END TRANSACTION" || statement == L"ROLLBACK TRANSACTION";
    const bool ok = OxQelConnectionSQLite::execute(statement);
    if (ends && ok)
        --m_script->inFlight;
    return ok;
}

bool ScriptedSQLite::createTable(const std::wstring& table, const std::wstring& field,
                                 OxQel::FieldType type, int size, const std::wstring& defaultValue,
                                 bool canBeNull) {
    if (m_script->refuseCreateTable.count(table))
        return false;
    return OxQelConnectionSQLite::createTable(table, field, type, size, defaultValue, canBeNull);
}

bool ScriptedSQLite::getIndexDef(const std::wstring& table, std::vector<OxQelIndexDef>& indexes) {
    if (m_script->throwOnIndexesOf.count(table))
        throw std::runtime_error("scripted failure");
    return OxQelConnectionSQLite::getIndexDef(table, indexes);
}

OxQelIConnection* ScriptedSQLite::createNewConnection() {
    if (++m_script->newConnections == m_script->nullConnectionAt)
        return nullptr;
    auto* c = new ScriptedSQLite(m_script);
    const OxConnectionParameter p = getConnectionParameter();
    c->openConnection(p.getDatabase(), p.getHost(), p.getUserId(), p.getPassword());
    return c;
}

void RecordingReactor::setStepCount(int steps) {
    stepCounts.push_back(steps);
    onlyFromCaller = onlyFromCaller && std::this_thread::get_id() == m_caller;
}

void RecordingReactor::advance(int steps) {
    advances += steps;
    onlyFromCaller = onlyFromCaller && std::this_thread::get_id() == m_caller;
}

std::string tablesSql(int tables, int rows) {
    std::string sql = "PRAGMA journal_mode=WAL;";
    for (int t = 0; t < tables; ++t) {
        const std::string name = "t" + std::to_string(t);
        sql += "CREATE TABLE " + name +
               " (id INTEGER PRIMARY KEY, name VARCHAR(40), qty INT, price REAL, data BLOB);";
        sql += "CREATE INDEX ix_" + name + " ON " + name + " (name);";
        sql += "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
               std::to_string(rows) + ") INSERT INTO " + name + " SELECT i, 'row ' || i, i * " +
               std::to_string(t + 1) + ", i / 4.0, randomblob(8) FROM n;";
    }
    return sql;
}
}  // namespace OxTransferTest
