// Reading every row and value of the large Access files, against mdb-export on the same
// table in the same run. CPU time (user + system), median of three runs each:
//   decode   our cursor, every value decoded (in process)
//   text     the same, each value also turned into CSV text (in process)
//   dump     "oxqel dump FILE TABLE --csv" to /dev/null (a process, like mdb-export)
#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "platform/core/OxText.h"
#include "platform/jet/OxJetDatabase.h"

extern char** environ;

namespace {
double cpuNow() {
    timespec ts{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &ts);
    return static_cast<double>(ts.tv_sec) + static_cast<double>(ts.tv_nsec) / 1e9;
}

// Runs argv with stdout to /dev/null; its CPU time, or a negative value on failure.
double childCpu(const std::vector<std::string>& argv, const std::string& outFile = "/dev/null") {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, outFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0644);
    posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);
    std::vector<char*> args;
    for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    pid_t pid = -1;
    const int rc = posix_spawnp(&pid, args[0], &actions, nullptr, args.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (rc != 0)
        return -1;
    int status = 0;
    rusage use{};
    if (wait4(pid, &status, 0, &use) != pid || !WIFEXITED(status) || WEXITSTATUS(status) != 0)
        return -1;
    auto seconds = [](const timeval& t) { return double(t.tv_sec) + double(t.tv_usec) / 1e6; };
    return seconds(use.ru_utime) + seconds(use.ru_stime);
}

// The benchmark files: $OXQEL_TESTDATA, else the shared folder beside the sources.
std::filesystem::path benchData() {
    std::vector<std::filesystem::path> candidates;
    if (const char* env = std::getenv("OXQEL_TESTDATA"))
        candidates.emplace_back(env);
    candidates.emplace_back(std::filesystem::path(OXQEL_SOURCE_DIR) / ".." / "shared" / "testdata");
    candidates.emplace_back("/work/shared/testdata");
    for (const auto& c : candidates)
        if (std::filesystem::exists(c / "access" / "bench"))
            return c / "access" / "bench";
    return candidates.back() / "access" / "bench";
}

double median(std::vector<double> v) {
    std::sort(v.begin(), v.end());
    return v[v.size() / 2];
}

double measure(const std::function<double()>& once) {
    std::vector<double> runs;
    for (int i = 0; i < 3; ++i) {
        const double t = once();
        if (t < 0)
            return -1;
        runs.push_back(t);
    }
    return median(runs);
}

// Opens the file and reads the table; asText also renders each value as CSV would.
double readInProcess(const std::string& path, const std::wstring& table, bool asText,
                     uint64_t& rows) {
    const double start = cpuNow();
    std::wstring error;
    auto db = OxJetDatabase::open(OxText::fromUtf8(path), {}, error);
    if (!db) {
        std::fprintf(stderr, "bench: %s\n", OxText::toUtf8(error).c_str());
        return -1;
    }
    auto def = db->tableDef(table, error);
    if (!def) {
        std::fprintf(stderr, "bench: %s\n", OxText::toUtf8(error).c_str());
        return -1;
    }
    auto cursor = db->openCursor(def);
    std::wstring line;
    std::string utf8;
    size_t checksum = 0;
    rows = 0;
    while (cursor->next()) {
        ++rows;
        line.clear();
        for (const auto& v : cursor->values()) {
            if (asText) {
                v.appendText(line);
                line.push_back(L',');
            } else {
                checksum += v.kind + v.text.size() + v.bytes.size();
            }
        }
        if (asText) {
            utf8.clear();
            OxText::appendUtf8(utf8, line);
            checksum += utf8.size();
        }
    }
    if (cursor->failed()) {
        std::fprintf(stderr, "bench: %s\n", OxText::toUtf8(cursor->error()).c_str());
        return -1;
    }
    const double used = cpuNow() - start;
    if (checksum == 0)
        std::fprintf(stderr, "bench: nothing read\n");
    return used;
}
}  // namespace

int main() {
    const std::filesystem::path data = benchData();
    const std::filesystem::path dir =
        std::filesystem::temp_directory_path() / ("oxqel-bench-jet-" + std::to_string(getpid()));
    std::filesystem::create_directories(dir);
    struct Case {
        const char* gz;
        const char* table;
    };
    const Case cases[] = {{"narrow_500k_jet4.mdb.gz", "Narrow"},
                          {"big_200k_ace14.accdb.gz", "Big"}};
    int status = 0;
    std::printf("%-22s %-7s %8s %11s %9s %9s %9s %8s %8s\n", "file", "table", "rows", "mdb-export",
                "decode", "text", "dump", "x decode", "x dump");
    for (const Case& c : cases) {
        const std::string file = (dir / std::filesystem::path(c.gz).stem()).string();
        if (childCpu({"gzip", "-dc", (data / c.gz).string()}, file) < 0) {
            std::fprintf(stderr, "bench: cannot decompress %s\n", (data / c.gz).c_str());
            status = 1;
            continue;
        }
        const double theirs = measure([&] { return childCpu({"mdb-export", file, c.table}); });
        if (theirs < 0) {
            std::fprintf(stderr, "bench: mdb-export failed (install mdbtools)\n");
            status = 1;
        }
        uint64_t rows = 0;
        const std::wstring table = OxText::fromUtf8(c.table);
        const double decode = measure([&] { return readInProcess(file, table, false, rows); });
        const double text = measure([&] { return readInProcess(file, table, true, rows); });
        const double dump = measure([&] {
            return childCpu({OXQEL_TOOL, "dump", file, c.table, "--csv"});
        });
        std::printf("%-22s %-7s %8llu %10.3fs %8.3fs %8.3fs %8.3fs %7.1fx %7.1fx\n",
                    std::filesystem::path(file).filename().c_str(), c.table,
                    static_cast<unsigned long long>(rows), theirs, decode, text, dump,
                    decode > 0 ? theirs / decode : 0.0, dump > 0 ? theirs / dump : 0.0);
        std::filesystem::remove(file);
    }
    std::filesystem::remove_all(dir);
    std::printf("(CPU seconds, median of 3; x = mdb-export time / ours: above 1 is faster)\n");
    return status;
}
