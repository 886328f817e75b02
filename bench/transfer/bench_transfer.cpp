// Copy engines against the raw engine, in the same run:
//  1. one table of 1,000,000 rows, SQLite to SQLite, through OxQelImportExportTable, against
//     a raw copy (one select, one prepared insert, bind and step per row) and against the
//     engine's own INSERT INTO ... SELECT across an attached database (the floor);
//  2. a database of 20 tables through OxQelImportExportDatabase, on the worker pool and on
//     the calling thread.
#include <sqlite3.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/transfer/OxQelImportExportDatabase.h"
#include "OxQelLib/transfer/OxQelImportExportTable.h"
#include "OxQelLib/transfer/OxQelWorkerPool.h"

namespace fs = std::filesystem;

namespace {
const fs::path kData = fs::path(OXQEL_BENCH_DATA_DIR) / "transfer";

void exec(sqlite3* db, const std::string& sql) {
    char* error = nullptr;
    if (sqlite3_exec(db, sql.c_str(), nullptr, nullptr, &error) != SQLITE_OK) {
        std::fprintf(stderr, "bench: %s: %s\n", sql.substr(0, 80).c_str(), error ? error : "?");
        std::exit(1);
    }
}

sqlite3* openRaw(const fs::path& path) {
    sqlite3* db = nullptr;
    if (sqlite3_open(path.c_str(), &db) != SQLITE_OK)
        std::exit(1);
    return db;
}

// Every storage class: 64-bit integers, reals, short and 100-character unicode texts,
// dates as text, 16-byte blobs, about 5% NULLs.
const char* kColumns =
    "id INTEGER, big INTEGER, real REAL, short TEXT, long TEXT, at TEXT, data BLOB";

std::string rowsSql(const std::string& table, int rows) {
    const auto maybeNull = [](const char* expr) {
        return std::string("CASE WHEN abs(random()) % 20 = 0 THEN NULL ELSE ") + expr + " END";
    };
    return "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
           std::to_string(rows) + ") INSERT INTO " + table + " SELECT i, " + maybeNull("random()") +
           ", " + maybeNull("random() / 7.0") + ", " + maybeNull("'name ' || i") + ", " +
           maybeNull("substr(replace(hex(randomblob(60)), 'A', 'é中'), 1, 100)") + ", " +
           maybeNull("date('2000-01-01', '+' || (i % 9000) || ' days')") + ", " +
           maybeNull("randomblob(16)") + " FROM n;";
}

fs::path makeSource(const std::string& name, int tables, int rows) {
    const fs::path path = kData / name;
    if (fs::exists(path))
        return path;
    fs::create_directories(kData);
    fs::path building = path;
    building += ".part";
    fs::remove(building);
    sqlite3* db = openRaw(building);
    exec(db, "PRAGMA encoding='UTF-16le'; PRAGMA journal_mode=WAL; BEGIN;");
    for (int t = 0; t < tables; ++t) {
        const std::string table = "t" + std::to_string(t);
        exec(db, "CREATE TABLE " + table + " (" + kColumns + ");");
        exec(db, rowsSql(table, rows));
        exec(db, "CREATE INDEX ix_" + table + " ON " + table + " (short);");
    }
    exec(db, "COMMIT; PRAGMA journal_mode=DELETE;");
    sqlite3_close(db);
    fs::rename(building, path);
    return path;
}

// A new destination file with the encoding the library gives new files.
fs::path freshDestination(const std::string& name) {
    const fs::path path = kData / name;
    for (const char* suffix : {"", "-wal", "-shm", "-journal"}) fs::remove(path.string() + suffix);
    return path;
}

double seconds(const std::function<void()>& run) {
    const auto start = std::chrono::steady_clock::now();
    run();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

double bestOf(int times, const std::function<void()>& prepare, const std::function<void()>& run) {
    double best = 1e9;
    for (int i = 0; i < times; ++i) {
        prepare();
        best = std::min(best, seconds(run));
    }
    return best;
}

sqlite3* newUtf16Destination(const fs::path& path) {
    sqlite3* db = openRaw(path);
    exec(db, "PRAGMA encoding='UTF-16le'; PRAGMA synchronous=OFF;");
    return db;
}

void rawCopy(const fs::path& source, const fs::path& target) {
    sqlite3* src = openRaw(source);
    sqlite3* dst = newUtf16Destination(target);
    exec(dst, std::string("CREATE TABLE t0 (") + kColumns + "); BEGIN;");
    sqlite3_stmt* select = nullptr;
    sqlite3_stmt* insert = nullptr;
    sqlite3_prepare_v2(src, "SELECT * FROM t0", -1, &select, nullptr);
    sqlite3_prepare_v2(dst, "INSERT INTO t0 VALUES (?, ?, ?, ?, ?, ?, ?)", -1, &insert, nullptr);
    while (sqlite3_step(select) == SQLITE_ROW) {
        for (int c = 0; c < 7; ++c)
            sqlite3_bind_value(insert, c + 1, sqlite3_column_value(select, c));
        if (sqlite3_step(insert) != SQLITE_DONE)
            std::exit(1);
        sqlite3_reset(insert);
    }
    sqlite3_finalize(select);
    sqlite3_finalize(insert);
    exec(dst, "CREATE INDEX ix_t0 ON t0 (short); COMMIT;");
    sqlite3_close(dst);
    sqlite3_close(src);
}

void floorCopy(const fs::path& source, const fs::path& target) {
    sqlite3* dst = newUtf16Destination(target);
    exec(dst, std::string("CREATE TABLE t0 (") + kColumns + "); ATTACH '" + source.string() +
                  "' AS src; BEGIN; INSERT INTO t0 SELECT * FROM src.t0; CREATE INDEX ix_t0 ON t0 "
                  "(short); COMMIT;");
    sqlite3_close(dst);
}

void libraryCopy(const fs::path& source, const fs::path& target) {
    OxQelConnectionSQLite from, to;
    if (!from.openConnection(source.wstring(), L"", L"", L"") ||
        !to.openConnection(target.wstring(), L"", L"", L""))
        std::exit(1);
    OxQelTableDef table;
    table.setTableName(L"t0");
    from.getFieldDef(L"t0", L"*", table.getFields());
    if (OxQelImportExportTable(from, to, table).run() != OxQel::NoError) {
        std::fprintf(stderr, "bench: the table copy failed\n");
        std::exit(1);
    }
}

// A destination whose connections may write from several threads: each transaction
// takes the write lock when it begins, so that writers queue instead of failing.
class ParallelWriteSQLite : public OxQelConnectionSQLite {
public:
    explicit ParallelWriteSQLite(bool parallel) : m_parallel(parallel) {}
    bool canWriteMultiThread() override { return m_parallel; }
    bool execute(const std::wstring& statement) override {
        return OxQelConnectionSQLite::execute(
            statement == L"BEGIN TRANSACTION" ? L"BEGIN IMMEDIATE TRANSACTION" : statement);
    }
    OxQelIConnection* createNewConnection() override {
        auto* c = new ParallelWriteSQLite(m_parallel);
        c->openConnection(getConnectionParameter().getDatabase(), L"", L"", L"");
        return c;
    }

private:
    bool m_parallel;
};

void databaseCopy(const fs::path& source, const fs::path& target, bool parallel) {
    OxQelConnectionSQLite from;
    ParallelWriteSQLite to(parallel);
    if (!from.openConnection(source.wstring(), L"", L"", L"") ||
        !to.openConnection(target.wstring(), L"", L"", L""))
        std::exit(1);
    to.execute(L"PRAGMA journal_mode=WAL;");
    if (OxQelImportExportDatabase(from, to, nullptr).run() != OxQel::NoError) {
        std::fprintf(stderr, "bench: the database copy failed\n");
        std::exit(1);
    }
}

void report(const char* what, double raw, double library, double limit) {
    const double ratio = library / raw;
    std::printf("%-58s raw %7.3f s  library %7.3f s  ratio %5.2f (limit %.1f) %s\n", what, raw,
                library, ratio, limit, ratio <= limit ? "ok" : "MISS");
}
}  // namespace

int main(int argc, char** argv) {
    const int rows = argc > 1 ? std::atoi(argv[1]) : 1000000;
    const int times = argc > 2 ? std::atoi(argv[2]) : 3;
    std::printf("preparing data (first run only) ...\n");
    std::fflush(stdout);
    const fs::path one = makeSource("one-table-" + std::to_string(rows) + ".sqlite", 1, rows);
    const fs::path many = makeSource("twenty-tables.sqlite", 20, 50000);
    const fs::path target = freshDestination("copy.sqlite");
    const auto clear = [&] { freshDestination("copy.sqlite"); };

    const double raw = bestOf(times, clear, [&] { rawCopy(one, target); });
    const double floor = bestOf(times, clear, [&] { floorCopy(one, target); });
    const double library = bestOf(times, clear, [&] { libraryCopy(one, target); });
    std::printf("table copy of %d rows (7 columns, every storage class, one index), best of %d:\n",
                rows, times);
    report("  OxQelImportExportTable vs raw select/bind/step copy", raw, library, 1.5);
    report("  OxQelImportExportTable vs INSERT INTO ... SELECT floor", floor, library, 3.0);

    const double single = bestOf(times, clear, [&] { databaseCopy(many, target, false); });
    const double pooled = bestOf(times, clear, [&] { databaseCopy(many, target, true); });
    std::printf("database copy of 20 tables x 50,000 rows, best of %d, %u hardware threads:\n",
                times, OxQelWorkerPool::hardwareThreads());
    std::printf("  single thread %.3f s, worker pool %.3f s: speedup %.2fx\n", single, pooled,
                single / pooled);
    freshDestination("copy.sqlite");
    return 0;
}
