#pragma once

#include <chrono>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "platform/jet/OxJetDatabase.h"

// Helpers the Access reader's suites share: the test files, running the independent
// command-line reader, and running a probe in a child process with a time limit.
namespace JetTest {
// Every .mdb and .accdb file of the shared test data (not the benchmark files).
std::vector<std::filesystem::path> accessFiles();
std::filesystem::path accessFile(const std::string& name);

struct ProcessResult {
    int exitCode = -1;
    std::string out;
    std::string err;
};
// Runs argv[0] (searched on PATH) with extra environment entries ("NAME=value").
ProcessResult run(const std::vector<std::string>& argv, const std::vector<std::string>& env = {});
bool haveMdbTools();

// Opens or fails the test.
std::shared_ptr<OxJetDatabase> open(const std::filesystem::path& path,
                                    const OxJetOpenOptions& options = {});
// Every row of a table as decoded values; fails the test on a cursor error.
std::vector<std::vector<OxJetValue>> readAll(const OxJetDatabase& db, const std::wstring& table);

enum class ChildOutcome { Finished, Crashed, TimedOut };
struct ChildResult {
    ChildOutcome outcome = ChildOutcome::Finished;
    int status = 0;  // the exit code, or the signal of a crash
};
// Runs probe in a forked child and kills it after the limit.
ChildResult runInChild(const std::function<void()>& probe, std::chrono::milliseconds limit);
}  // namespace JetTest
