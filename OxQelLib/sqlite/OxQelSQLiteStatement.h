#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "OxQelLib/foundation/OxQelLog.h"

struct sqlite3;
struct sqlite3_stmt;

// One compiled statement, finalised when it goes. Statement texts reach the engine as
// UTF-8: the UTF-16 entry points convert to UTF-8 themselves before compiling.
class OxQelSQLiteStatement {
public:
    OxQelSQLiteStatement() = default;
    ~OxQelSQLiteStatement();
    OxQelSQLiteStatement(OxQelSQLiteStatement&& other) noexcept;
    OxQelSQLiteStatement& operator=(OxQelSQLiteStatement&& other) noexcept;
    OxQelSQLiteStatement(const OxQelSQLiteStatement&) = delete;
    OxQelSQLiteStatement& operator=(const OxQelSQLiteStatement&) = delete;

    // Compiles the first statement of the text; the engine's result code. The text
    // after it is left in tail when tail is given.
    int prepare(sqlite3* db, std::string_view sql, const char** tail = nullptr);
    int prepare(sqlite3* db, std::wstring_view sql);
    int step();
    int reset();
    // Releases the statement; the engine's result of the last run.
    int finalize();

    sqlite3_stmt* get() const { return m_stmt; }
    explicit operator bool() const { return m_stmt != nullptr; }

    // Column text of the current row as a wide string (empty for NULL).
    std::wstring columnText(int column) const;
    int columnInt(int column) const;

    // The library's text for an engine result code.
    static std::wstring message(int code);
    // The engine's message for the last failure on the connection.
    static std::wstring errorMessage(sqlite3* db);
    // The SQL text of a compiled statement, as the engine keeps it.
    static std::wstring sqlText(sqlite3_stmt* stmt);

private:
    sqlite3_stmt* m_stmt = nullptr;
};

// Identifiers in double quotes, with quotes inside doubled: safe for any name.
std::wstring oxSQLiteQuoteIdentifier(std::wstring_view name);

// Integer and real variant types, which the engine stores as they are.
bool oxSQLiteIsInteger(uint16_t vt);
bool oxSQLiteIsReal(uint16_t vt);

// Runs an operation so that no exception leaves it: one caught is reported (as the
// operation's failure) and the operation answers its empty value.
template <class F>
auto oxSQLiteGuarded(const wchar_t* sourceFile, const wchar_t* function, F&& f) noexcept
    -> decltype(f()) {
    try {
        return f();
    } catch (...) {
        try {
            ::OxQel::showDebugErrorMsg(::OxQel::Util::currentExceptionText(),
                                       ::OxQel::LogLevelError, function, sourceFile, __LINE__, L"");
        } catch (...) {
        }
        return decltype(f())();
    }
}

// The guard of a source file that defines OXQEL_SOURCE_FILE.
#define OXQEL_SQLITE_GUARDED(function, body) oxSQLiteGuarded(OXQEL_SOURCE_FILE, function, body)
