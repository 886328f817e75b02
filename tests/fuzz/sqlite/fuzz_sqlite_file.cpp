// A database file of any content, opened, listed, described and loaded table by table
// through the SQLite backend: a clear failure or a result, never a crash.
#include <dlfcn.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>

#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"

struct sqlite3;

namespace {
int g_steps = 0;

// The engine is reached through the library's own dependency: fuzz targets link the
// library alone.
using ProgressHandler = void (*)(sqlite3*, int, int (*)(void*), void*);
ProgressHandler progressHandler() {
    static const auto handler =
        reinterpret_cast<ProgressHandler>(::dlsym(RTLD_DEFAULT, "sqlite3_progress_handler"));
    return handler;
}

// A file may describe work without end (a recursive view, a huge join); the harness
// stops it, as a host would with a time-out.
int stopLongWork(void*) {
    return ++g_steps > 20000 ? 1 : 0;
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const std::string path = [] {
        const char* dir = std::getenv("TMPDIR");
        return std::string(dir ? dir : "/tmp") + "/fuzz_sqlite_file_" + std::to_string(::getpid()) +
               ".db";
    }();
    OxQel::setDebugInfoType(0);
    std::remove((path + "-journal").c_str());
    if (FILE* f = std::fopen(path.c_str(), "wb")) {
        std::fwrite(data, 1, size, f);
        std::fclose(f);
    } else {
        return 0;
    }
    OxQelConnectionSQLite connection;
    const std::wstring wpath(path.begin(), path.end());
    if (connection.openConnection(wpath, L"", L"", L"")) {
        g_steps = 0;
        if (ProgressHandler handler = progressHandler())
            handler(connection.getHandle(), 100, stopLongWork, nullptr);
        else
            return 0;
        std::vector<OxQelTableDef> objects;
        connection.getTableDef(objects, OxQelTableDef::AllTypes);
        for (const auto& object : objects) {
            OxQelFieldDefArray fields;
            connection.getFieldDef(object.getTableName(), L"*", fields);
            std::vector<OxQelIndexDef> indexes;
            connection.getIndexDef(object.getTableName(), indexes);
            if (object.getTableType() != OxQelTableDef::Table)
                continue;
            std::wstring quoted = L"\"";
            for (wchar_t c : object.getTableName())
                quoted += c == L'"' ? L"\"\"" : std::wstring(1, c);
            OxQelRecordsetSQLite rs;
            if (rs.openSQL(&connection, L"SELECT * FROM " + quoted + L"\"")) {
                for (; !rs.getEOF(); rs.moveNext())
                    for (long i = 0; i < rs.getFieldCount(); ++i) rs.getlFieldString(i);
            }
        }
        connection.closeDatabase();
    }
    std::remove(path.c_str());
    return 0;
}
