#include "OxQelLib/sqlite/OxQelSQLiteStatement.h"

#include <sqlite3.h>

#include <climits>

#include "platform/core/OxText.h"

OxQelSQLiteStatement::~OxQelSQLiteStatement() {
    finalize();
}

OxQelSQLiteStatement::OxQelSQLiteStatement(OxQelSQLiteStatement&& other) noexcept
    : m_stmt(other.m_stmt) {
    other.m_stmt = nullptr;
}

OxQelSQLiteStatement& OxQelSQLiteStatement::operator=(OxQelSQLiteStatement&& other) noexcept {
    if (this != &other) {
        finalize();
        m_stmt = other.m_stmt;
        other.m_stmt = nullptr;
    }
    return *this;
}

int OxQelSQLiteStatement::prepare(sqlite3* db, std::string_view sql, const char** tail) {
    finalize();
    if (!db)
        return SQLITE_MISUSE;
    if (sql.size() >= static_cast<size_t>(INT_MAX))
        return SQLITE_TOOBIG;
    return sqlite3_prepare_v2(db, sql.data(), static_cast<int>(sql.size()), &m_stmt, tail);
}

int OxQelSQLiteStatement::prepare(sqlite3* db, std::wstring_view sql) {
    return prepare(db, OxText::toUtf8(sql));
}

int OxQelSQLiteStatement::step() {
    return m_stmt ? sqlite3_step(m_stmt) : SQLITE_MISUSE;
}

int OxQelSQLiteStatement::reset() {
    return m_stmt ? sqlite3_reset(m_stmt) : SQLITE_OK;
}

int OxQelSQLiteStatement::finalize() {
    if (!m_stmt)
        return SQLITE_OK;
    const int rc = sqlite3_finalize(m_stmt);
    m_stmt = nullptr;
    return rc;
}

std::wstring OxQelSQLiteStatement::columnText(int column) const {
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(m_stmt, column));
    if (!text)
        return {};
    return OxText::fromUtf8(
        std::string_view(text, static_cast<size_t>(sqlite3_column_bytes(m_stmt, column))));
}

int OxQelSQLiteStatement::columnInt(int column) const {
    return sqlite3_column_int(m_stmt, column);
}

std::wstring OxQelSQLiteStatement::message(int code) {
    switch (code & 0xFF) {
        case 1:
            return L"SQL error or missing database ";
        case 2:
            return L"Internal logic error in SQLite ";
        case 3:
            return L"Access permission denied ";
        case 4:
            return L"Callback routine requested an abort ";
        case 5:
            return L"The database file is locked ";
        case 6:
            return L"A table in the database is locked ";
        case 7:
            return L"A malloc() failed ";
        case 8:
            return L"Attempt to write a readonly database ";
        case 9:
            return L"Operation terminated by sqlite3_interrupt()";
        case 10:
            return L"Some kind of disk I/O error occurred ";
        case 11:
            return L"The database disk image is malformed ";
        case 12:
            return L"Unknown opcode in sqlite3_file_control() ";
        case 13:
            return L"Insertion failed because database is full ";
        case 14:
            return L"Unable to open the database file ";
        case 15:
            return L"Database lock protocol error ";
        case 16:
            return L"Database is empty ";
        case 17:
            return L"The database schema changed ";
        case 18:
            return L"String or BLOB exceeds size limit ";
        case 19:
            return L"Abort due to constraint violation ";
        case 20:
            return L"Data type mismatch ";
        case 21:
            return L"Library used incorrectly ";
        case 22:
            return L"Uses OS features not supported on host ";
        case 23:
            return L"Authorization denied ";
        case 24:
            return L"Auxiliary database format error ";
        case 25:
            return L"2nd parameter to sqlite3_bind out of range ";
        case 26:
            return L"File opened that is not a database file ";
        case 100:
            return L"sqlite3_step() has another row ready ";
        case 101:
            return L"sqlite3_step() has finished executing ";
        default:
            return L"Error occured in SQLite";
    }
}

std::wstring OxQelSQLiteStatement::errorMessage(sqlite3* db) {
    const char* message = db ? sqlite3_errmsg(db) : nullptr;
    return message ? OxText::fromUtf8(message) : std::wstring();
}

std::wstring OxQelSQLiteStatement::sqlText(sqlite3_stmt* stmt) {
    const char* text = stmt ? sqlite3_sql(stmt) : nullptr;
    return text ? OxText::fromUtf8(text) : std::wstring();
}

std::wstring oxSQLiteQuoteIdentifier(std::wstring_view name) {
    std::wstring out;
    out.reserve(name.size() + 2);
    out.push_back(L'"');
    for (wchar_t c : name) {
        out.push_back(c);
        if (c == L'"')
            out.push_back(L'"');
    }
    out.push_back(L'"');
    return out;
}

bool oxSQLiteIsInteger(uint16_t vt) {
    switch (vt) {
        case 2:   // VT_I2
        case 3:   // VT_I4
        case 16:  // VT_I1
        case 17:  // VT_UI1
        case 18:  // VT_UI2
        case 19:  // VT_UI4
        case 20:  // VT_I8
        case 21:  // VT_UI8
        case 22:  // VT_INT
        case 23:  // VT_UINT
            return true;
        default:
            return false;
    }
}

bool oxSQLiteIsReal(uint16_t vt) {
    return vt == 4 || vt == 5;  // VT_R4, VT_R8
}
