#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/transfer/OxQelProgressReactor.h"
#include "SQLiteTestSupport.h"

namespace OxTransferTest {
// What a scripted connection does differently from a plain SQLite one. Set up before
// the copy starts; the counters are shared by every connection made from it.
struct Script {
    bool writeMultiThread = false;             // answers canWriteMultiThread with true
    std::set<std::wstring> refuseCreateTable;  // createTable of these tables fails
    std::set<std::wstring> throwOnIndexesOf;   // getIndexDef of these tables throws
    int nullConnectionAt = 0;                  // createNewConnection gives none on this call
    std::atomic<int> newConnections{0};
    // Transactions begun and not yet ended (waiting for the write lock included), and the
    // most there were at once: above 1, copies really overlapped.
    std::atomic<int> inFlight{0};
    std::atomic<int> mostInFlight{0};
    std::mutex threadsMutex;
    std::set<std::thread::id> writerThreads;
};

// A SQLite connection of a class of its own (so the database copy never takes the file
// path), with capabilities and failures set by a script. With writeMultiThread its
// transactions take the write lock when they begin, as several writers need.
class ScriptedSQLite : public OxQelConnectionSQLite {
    OX_DECLARE_DYNAMIC(ScriptedSQLite)
public:
    explicit ScriptedSQLite(std::shared_ptr<Script> script) : m_script(std::move(script)) {}
    bool open(const std::filesystem::path& path) {
        return openConnection(path.wstring(), L"", L"", L"");
    }

    bool canWriteMultiThread() override { return m_script->writeMultiThread; }
    bool execute(const std::wstring& statement) override;
    bool createTable(const std::wstring& table, const std::wstring& field, OxQel::FieldType type,
                     int size, const std::wstring& defaultValue, bool canBeNull) override;
    bool getIndexDef(const std::wstring& table, std::vector<OxQelIndexDef>& indexes) override;
    OxQelIConnection* createNewConnection() override;

private:
    std::shared_ptr<Script> m_script;
};

// Records the progress calls and the threads they came from.
class RecordingReactor : public OxQelProgressReactor {
public:
    void setStepCount(int steps) override;
    void advance(int steps) override;

    std::vector<int> stepCounts;
    int advances = 0;
    bool onlyFromCaller = true;

private:
    std::thread::id m_caller = std::this_thread::get_id();
};

// A database file in a temporary folder, made by raw SQL.
struct DbFile {
    explicit DbFile(const std::string& sql = "") {
        if (!sql.empty())
            OxSQLiteTest::RawDb(path()).exec(sql);
    }
    std::filesystem::path path() const { return dir.file("db.sqlite"); }
    OxSQLiteTest::RawDb raw() const { return OxSQLiteTest::RawDb(path()); }
    OxTest::TempDir dir;
};

// SQL that makes n tables t0..t(n-1), each with rows rows and an index.
std::string tablesSql(int tables, int rows);
}  // namespace OxTransferTest
