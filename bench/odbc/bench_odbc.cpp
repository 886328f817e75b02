// Reading rows of five columns through OxQelRecordsetODBC (moveNext and a typed read of
// every column) against a raw ODBC loop over the same driver, in the same run: the SQLite
// driver on a file, and the PostgreSQL driver on a private server (the one named by
// OXQEL_ODBC_ENV, or one started here with scripts/testservers).
//
// bench_odbc [ROWS [RUNS]]   (default 1000000 rows, best of 3 runs)
#include <sql.h>
#include <sqlext.h>
#include <stdlib.h>
#include <time.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <string>

#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "OxQelLib/odbc/OxQelRecordsetODBC.h"
#include "platform/core/OxText.h"

namespace {
struct Times {
    double wall = 1e300;
    double cpu = 1e300;
};

double cpuNow() {
    timespec t{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
    return t.tv_sec + t.tv_nsec * 1e-9;
}

template <class F>
Times best(int runs, F&& f, long long& checksum) {
    Times t;
    for (int i = 0; i < runs; ++i) {
        const auto w0 = std::chrono::steady_clock::now();
        const double c0 = cpuNow();
        checksum = f();
        t.cpu = std::min(t.cpu, cpuNow() - c0);
        t.wall = std::min(
            t.wall, std::chrono::duration<double>(std::chrono::steady_clock::now() - w0).count());
    }
    return t;
}

void die(const char* what, SQLSMALLINT type, SQLHANDLE h) {
    SQLCHAR state[6] = {}, message[1024] = {};
    SQLINTEGER native = 0;
    SQLSMALLINT n = 0;
    SQLGetDiagRecA(type, h, 1, state, &native, message, sizeof(message), &n);
    std::fprintf(stderr, "bench_odbc: %s failed: [%s] %s\n", what, state, message);
    std::exit(1);
}

// The loop an application writes against the ODBC interface itself.
long long rawLoop(const std::string& connect, bool staticCursor) {
    SQLHENV env;
    SQLHDBC dbc;
    SQLHSTMT stmt;
    SQLAllocHandle(SQL_HANDLE_ENV, SQL_NULL_HANDLE, &env);
    SQLSetEnvAttr(env, SQL_ATTR_ODBC_VERSION, reinterpret_cast<SQLPOINTER>(SQL_OV_ODBC3), 0);
    SQLAllocHandle(SQL_HANDLE_DBC, env, &dbc);
    std::string in = connect;
    if (!SQL_SUCCEEDED(SQLDriverConnectA(dbc, nullptr, reinterpret_cast<SQLCHAR*>(in.data()),
                                         SQL_NTS, nullptr, 0, nullptr, SQL_DRIVER_NOPROMPT)))
        die("connect", SQL_HANDLE_DBC, dbc);
    SQLAllocHandle(SQL_HANDLE_STMT, dbc, &stmt);
    if (staticCursor)
        SQLSetStmtAttr(stmt, SQL_ATTR_CURSOR_TYPE, reinterpret_cast<SQLPOINTER>(SQL_CURSOR_STATIC),
                       0);
    if (!SQL_SUCCEEDED(
            SQLExecDirectA(stmt, (SQLCHAR*)"SELECT id, b, d, s, ts FROM bench", SQL_NTS)))
        die("select", SQL_HANDLE_STMT, stmt);
    long long sum = 0;
    SQLINTEGER id;
    SQLBIGINT b;
    double d;
    char s[128];
    SQL_TIMESTAMP_STRUCT ts;
    SQLLEN ind;
    for (;;) {
        const SQLRETURN rc =
            staticCursor ? SQLFetchScroll(stmt, SQL_FETCH_NEXT, 0) : SQLFetch(stmt);
        if (rc == SQL_NO_DATA)
            break;
        if (!SQL_SUCCEEDED(rc))
            die("fetch", SQL_HANDLE_STMT, stmt);
        SQLGetData(stmt, 1, SQL_C_SLONG, &id, 0, &ind);
        SQLGetData(stmt, 2, SQL_C_SBIGINT, &b, 0, &ind);
        SQLGetData(stmt, 3, SQL_C_DOUBLE, &d, 0, &ind);
        SQLGetData(stmt, 4, SQL_C_CHAR, s, sizeof(s), &ind);
        SQLGetData(stmt, 5, SQL_C_TYPE_TIMESTAMP, &ts, 0, &ind);
        sum += id + (b & 0xFF) + static_cast<long long>(d) + (ind > 0 ? s[0] : 0) + ts.second;
    }
    SQLFreeHandle(SQL_HANDLE_STMT, stmt);
    SQLDisconnect(dbc);
    SQLFreeHandle(SQL_HANDLE_DBC, dbc);
    SQLFreeHandle(SQL_HANDLE_ENV, env);
    return sum;
}

long long libraryLoop(const std::wstring& host) {
    OxQelConnectionODBC c;
    if (!c.openConnection(L"", host, L"", L"")) {
        std::fprintf(stderr, "bench_odbc: the library could not connect\n");
        std::exit(1);
    }
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    if (!rs->openSQL(&c, L"SELECT id, b, d, s, ts FROM bench")) {
        std::fprintf(stderr, "bench_odbc: the library could not open the rows\n");
        std::exit(1);
    }
    long long sum = 0;
    long id = 0, b = 0;
    double d = 0;
    std::wstring s;
    while (!rs->getEOF()) {
        rs->getField(0L, id);
        rs->getField(1L, b);
        rs->getField(2L, d);
        rs->getField(3L, s);
        const OxVariant ts = rs->getlFieldValue(4);
        sum += id + (b & 0xFF) + static_cast<long long>(d) + (s.empty() ? 0 : s[0]) +
               OxDateTime(ts.date()).getSecond();
        rs->moveNext();
    }
    return sum;
}

bool execute(OxQelConnectionODBC& c, const std::wstring& statement) {
    if (c.execute(statement))
        return true;
    std::fprintf(stderr, "bench_odbc: failed: %s\n", OxText::toUtf8(statement).c_str());
    return false;
}

void compare(const char* driver, const std::string& connect, int runs) {
    long long raw = 0, rawStatic = 0, lib = 0;
    const Times r = best(
        runs, [&] { return rawLoop(connect, false); }, raw);
    const Times rs = best(
        runs, [&] { return rawLoop(connect, true); }, rawStatic);
    const Times l = best(
        runs, [&] { return libraryLoop(OxText::fromUtf8(connect)); }, lib);
    if (raw != lib || raw != rawStatic)
        std::printf("  WARNING: the loops read different values (%lld, %lld, %lld)\n", raw,
                    rawStatic, lib);
    std::printf("%s\n", driver);
    std::printf("  raw ODBC, default cursor   wall %7.3f s  cpu %7.3f s\n", r.wall, r.cpu);
    std::printf("  raw ODBC, static cursor    wall %7.3f s  cpu %7.3f s\n", rs.wall, rs.cpu);
    std::printf("  OxQelRecordsetODBC         wall %7.3f s  cpu %7.3f s\n", l.wall, l.cpu);
    std::printf("  ratio to raw default       wall %7.2fx   cpu %7.2fx\n", l.wall / r.wall,
                l.cpu / r.cpu);
    std::printf("  ratio to raw static        wall %7.2fx   cpu %7.2fx\n", l.wall / rs.wall,
                l.cpu / rs.cpu);
}

std::map<std::string, std::string> readEnv(const std::filesystem::path& file) {
    std::map<std::string, std::string> values;
    std::ifstream in(file);
    for (std::string line; std::getline(in, line);)
        if (const size_t eq = line.find('='); eq != std::string::npos)
            values[line.substr(0, eq)] = line.substr(eq + 1);
    return values;
}
}  // namespace

int main(int argc, char** argv) {
    const long rows = argc > 1 ? std::atol(argv[1]) : 1000000;
    const int runs = argc > 2 ? std::atoi(argv[2]) : 3;
    const std::filesystem::path scripts =
        std::filesystem::path(OXQEL_SOURCE_DIR) / "scripts/testservers";
    char tmpl[] = "/tmp/oxqel-bench-XXXXXX";
    const std::filesystem::path work = ::mkdtemp(tmpl);

    // A server of our own unless the caller gave one.
    std::filesystem::path envFile = getenv("OXQEL_ODBC_ENV") ? getenv("OXQEL_ODBC_ENV") : "";
    const bool ownServer = envFile.empty();
    if (ownServer) {
        if (std::system(
                ("'" + scripts.string() + "/start' '" + (work / "server").string() + "' >/dev/null")
                    .c_str()) != 0) {
            std::fprintf(stderr, "bench_odbc: could not start PostgreSQL\n");
            return 1;
        }
        envFile = work / "server/env";
    }
    auto env = readEnv(envFile);
    setenv("ODBCSYSINI", env["ODBCSYSINI"].c_str(), 1);
    setenv("ODBCINI", env["ODBCINI"].c_str(), 1);
    std::printf(
        "bench_odbc: %ld rows of 5 columns (int, bigint, double, varchar(40), timestamp), best of "
        "%d\n",
        rows, runs);

    const std::string sqlite = "DRIVER={SQLite3};DATABASE=" + (work / "bench.db").string();
    {
        OxQelConnectionODBC c;
        c.openConnection(L"", OxText::fromUtf8(sqlite), L"", L"");
        execute(
            c, L"CREATE TABLE bench (id INTEGER, b BIGINT, d DOUBLE, s VARCHAR(40), ts TIMESTAMP)");
        execute(c, L"WITH RECURSIVE c(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM c WHERE x < " +
                       std::to_wstring(rows) +
                       L") INSERT INTO bench SELECT x, x * 1000003, x * 0.5, printf('%032d', x), "
                       L"datetime(1577836800 + x, 'unixepoch') FROM c");
    }
    compare("SQLite ODBC driver", sqlite, runs);

    if (!env["PG_PORT"].empty()) {
        const std::string pg =
            "DRIVER={PostgreSQL Unicode};SERVER=127.0.0.1;PORT=" + env["PG_PORT"] +
            ";DATABASE=" + env["PG_DATABASE"] + ";UID=" + env["PG_USER"] +
            ";PWD=" + env["PG_PASSWORD"];
        OxQelConnectionODBC c;
        c.openConnection(L"", OxText::fromUtf8(pg), L"", L"");
        execute(c, L"DROP TABLE IF EXISTS bench");
        execute(c,
                L"CREATE TABLE bench (id INTEGER, b BIGINT, d DOUBLE PRECISION, s VARCHAR(40), ts "
                L"TIMESTAMP)");
        execute(c,
                L"INSERT INTO bench SELECT x, x::bigint * 1000003, x * 0.5, md5(x::text), "
                L"timestamp '2020-01-01' + x * interval '1 second' FROM generate_series(1, " +
                    std::to_wstring(rows) + L") x");
        compare("PostgreSQL ODBC driver", pg, runs);
        execute(c, L"DROP TABLE bench");
    }
    if (ownServer)
        std::system(
            ("'" + scripts.string() + "/stop' '" + (work / "server").string() + "' >/dev/null")
                .c_str());
    std::filesystem::remove_all(work);
    return 0;
}
