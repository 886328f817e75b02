#pragma once

#include <sqlite3.h>

#include <memory>
#include <string>
#include <vector>

#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "support/TestSupport.h"

namespace OxSQLiteTest {
// Writes every report of the library to a log file of its own while it lives.
class LogCapture {
public:
    LogCapture();
    ~LogCapture();
    std::string text() const;
    bool contains(const std::string& s) const { return text().find(s) != std::string::npos; }
    void clear() const;

private:
    OxTest::TempDir m_dir;
    int m_savedFlags;
    std::wstring m_savedPath;
};

// A raw engine connection, to look at files independently of the library.
class RawDb {
public:
    explicit RawDb(const std::filesystem::path& path);
    ~RawDb();
    RawDb(const RawDb&) = delete;
    RawDb& operator=(const RawDb&) = delete;
    sqlite3* get() const { return m_db; }
    void exec(const std::string& sql);
    // The first column of the first row as text ("NULL" for NULL, "" without a row).
    std::string scalar(const std::string& sql);
    // Every row, columns joined by "|".
    std::vector<std::string> rows(const std::string& sql);

private:
    sqlite3* m_db = nullptr;
};

// A fresh database file in a temporary folder, opened through the library.
class Database {
public:
    Database();
    explicit Database(const std::string& setupSql);
    OxQelConnectionSQLite& connection() { return m_connection; }
    std::filesystem::path path() const { return m_dir.file("test.db"); }
    std::wstring wpath() const { return m_dir.wfile("test.db"); }
    const OxTest::TempDir& dir() const { return m_dir; }
    RawDb raw() const { return RawDb(path()); }

private:
    OxTest::TempDir m_dir;
    OxQelConnectionSQLite m_connection;
};
}  // namespace OxSQLiteTest
