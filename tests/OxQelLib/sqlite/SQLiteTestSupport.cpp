#include "SQLiteTestSupport.h"

#include <gtest/gtest.h>

#include "OxQelLib/foundation/OxQelLog.h"

namespace OxSQLiteTest {
LogCapture::LogCapture()
    : m_savedFlags(OxQel::getDebugInfoType()), m_savedPath(OxQel::getDebugLogFilePath()) {
    OxQel::setDebugInfoType(8);
    OxQel::setDebugLogFilePath(m_dir.wfile("log.txt"));
}

LogCapture::~LogCapture() {
    OxQel::setDebugInfoType(m_savedFlags);
    OxQel::setDebugLogFilePath(m_savedPath);
}

std::string LogCapture::text() const {
    return OxTest::readFile(m_dir.file("log.txt"));
}

void LogCapture::clear() const {
    std::filesystem::remove(m_dir.file("log.txt"));
}

RawDb::RawDb(const std::filesystem::path& path) {
    if (sqlite3_open(path.c_str(), &m_db) != SQLITE_OK)
        ADD_FAILURE() << "cannot open " << path;
}

RawDb::~RawDb() {
    sqlite3_close(m_db);
}

void RawDb::exec(const std::string& sql) {
    char* error = nullptr;
    if (sqlite3_exec(m_db, sql.c_str(), nullptr, nullptr, &error) != SQLITE_OK)
        ADD_FAILURE() << sql << ": " << (error ? error : "?");
    sqlite3_free(error);
}

std::vector<std::string> RawDb::rows(const std::string& sql) {
    std::vector<std::string> out;
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v2(m_db, sql.c_str(), -1, &stmt, nullptr) != SQLITE_OK) {
        ADD_FAILURE() << sql << ": " << sqlite3_errmsg(m_db);
        return out;
    }
    while (sqlite3_step(stmt) == SQLITE_ROW) {
        std::string row;
        for (int i = 0; i < sqlite3_column_count(stmt); ++i) {
            if (i)
                row += "|";
            const auto* t = reinterpret_cast<const char*>(sqlite3_column_text(stmt, i));
            row += t ? t : "NULL";
        }
        out.push_back(row);
    }
    sqlite3_finalize(stmt);
    return out;
}

std::string RawDb::scalar(const std::string& sql) {
    const auto r = rows(sql);
    if (r.empty())
        return "";
    return r.front().substr(0, r.front().find('|'));
}

Database::Database() {
    EXPECT_TRUE(m_connection.openConnection(wpath(), L"", L"", L""));
}

Database::Database(const std::string& setupSql) {
    RawDb(path()).exec(setupSql);
    EXPECT_TRUE(m_connection.openConnection(wpath(), L"", L"", L""));
}
}  // namespace OxSQLiteTest
