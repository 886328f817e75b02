#pragma once

#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/ado/OxAdoProvider.h"

// A scriptable provider for unit tests: the test queues results and errors, runs the code
// under test, and reads back every statement and catalog call the provider saw. It exists
// only in test programs and is registered by them under its own name, so no connection
// string of a user can reach it.
namespace OxAdoTest {
constexpr const wchar_t* kProvider = L"OxTest.Script";
constexpr const wchar_t* kConnectionString = L"Provider=OxTest.Script;Data Source=script";

struct Result {
    std::vector<OxAdoColumnInfo> columns;
    std::vector<std::vector<OxVariant>> rows;
    bool hasRows = true;                      // false: a statement without a result
    long rowsAffected = -1;                   // for statements without rows
    std::optional<OxAdoProviderError> error;  // the execution fails with it
    long failAfterRows = -1;                  // fetching fails after this many rows
    bool endless = false;                     // fetching never ends (rows repeat)

    // A result of rows; columns are named and typed by the caller.
    static Result rowsOf(std::vector<OxAdoColumnInfo> columns,
                         std::vector<std::vector<OxVariant>> rows);
    static Result affected(long rows);
    static Result failure(OxHResult number, const std::wstring& description,
                          int32_t nativeError = 0, const std::wstring& sqlState = L"HY000");
};

// A column of a given table, as an updatable result column.
OxAdoColumnInfo column(const std::wstring& name, int type, long size = 0,
                       const std::wstring& table = {}, bool autoIncrement = false);
OxAdoProviderError error(OxHResult number, const std::wstring& description, int32_t nativeError = 0,
                         const std::wstring& sqlState = L"HY000");

struct Script {
    // Results for execute, taken in order; once empty, statements succeed without rows
    // (and a SELECT gives an empty result without columns).
    std::deque<Result> results;
    // Calls that fail: by name ("open", "execute", "fetch", "beginTrans", "commitTrans",
    // "rollbackTrans", "tables", "columns", "indexes", "primaryKey", "procedures",
    // "createTable", "dropTable", "renameTable", "addColumn", "dropColumn", "renameColumn",
    // "setColumnProperty", "setProperty", "setIsolationLevel"). Once: removed when used.
    std::map<std::wstring, OxAdoProviderError> failOnce;
    std::map<std::wstring, OxAdoProviderError> failAlways;

    // What the provider saw.
    std::vector<std::wstring> statements;
    std::vector<std::vector<OxAdoParamValue>> parameters;
    std::vector<long> timeouts;       // the command time-out of each statement
    std::vector<std::wstring> calls;  // catalog and session calls with their arguments
    std::vector<OxAdoSession::OpenArgs> opens;
    int openSessions = 0;

    // The catalog the provider answers from; DDL calls change it.
    std::vector<OxAdoTableInfo> tables;
    std::map<std::wstring, std::vector<OxAdoColumnDesc>> columns;
    std::vector<OxAdoIndexInfo> indexes;
    std::map<std::wstring, std::vector<std::wstring>> primaryKeys;
    std::vector<OxAdoProcedureInfo> procedures;
    OxVariant lastInserted;
    bool broken = false;

    void addTable(const std::wstring& name, const std::wstring& type = L"TABLE");
    bool sawCall(const std::wstring& call) const;
    // The statements seen, joined by "\n".
    std::wstring log() const;
};

// Registers the provider for the script (replacing an earlier one) and removes it again.
class Install {
public:
    explicit Install(std::shared_ptr<Script> script);
    ~Install();
    Install(const Install&) = delete;
    Install& operator=(const Install&) = delete;
};
}  // namespace OxAdoTest
