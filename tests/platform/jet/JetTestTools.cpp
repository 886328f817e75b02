#include "JetTestTools.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <thread>

#include "platform/core/OxText.h"
#include "support/TestSupport.h"

extern char** environ;

namespace JetTest {
std::vector<std::filesystem::path> accessFiles() {
    std::vector<std::filesystem::path> files;
    for (const auto& e : std::filesystem::directory_iterator(OxTest::testdata("access"))) {
        const auto ext = e.path().extension();
        if (e.is_regular_file() && (ext == ".mdb" || ext == ".accdb"))
            files.push_back(e.path());
    }
    std::sort(files.begin(), files.end());
    return files;
}

std::filesystem::path accessFile(const std::string& name) {
    return OxTest::testdata("access/" + name);
}

ProcessResult run(const std::vector<std::string>& argv, const std::vector<std::string>& env) {
    ProcessResult result;
    int outPipe[2], errPipe[2];
    if (::pipe2(outPipe, O_CLOEXEC) != 0 || ::pipe2(errPipe, O_CLOEXEC) != 0)
        return result;
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, outPipe[1], 1);
    posix_spawn_file_actions_adddup2(&actions, errPipe[1], 2);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    std::vector<std::string> envStrings;
    for (char** e = environ; *e; ++e) envStrings.emplace_back(*e);
    envStrings.insert(envStrings.end(), env.begin(), env.end());
    std::vector<char*> args, envp;
    for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    for (auto& e : envStrings) envp.push_back(e.data());
    envp.push_back(nullptr);
    pid_t pid = -1;
    const int rc = posix_spawnp(&pid, argv[0].c_str(), &actions, nullptr, args.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    ::close(outPipe[1]);
    ::close(errPipe[1]);
    if (rc == 0) {
        pollfd fds[2] = {{outPipe[0], POLLIN, 0}, {errPipe[0], POLLIN, 0}};
        int open = 2;
        char buffer[65536];
        while (open > 0 && ::poll(fds, 2, -1) > 0) {
            for (int i = 0; i < 2; ++i) {
                if (fds[i].fd < 0 || !(fds[i].revents & (POLLIN | POLLHUP)))
                    continue;
                const ssize_t n = ::read(fds[i].fd, buffer, sizeof buffer);
                if (n <= 0) {
                    fds[i].fd = -1;
                    --open;
                } else {
                    (i == 0 ? result.out : result.err).append(buffer, static_cast<size_t>(n));
                }
            }
        }
        int status = 0;
        ::waitpid(pid, &status, 0);
        result.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }
    ::close(outPipe[0]);
    ::close(errPipe[0]);
    return result;
}

bool haveMdbTools() {
    static const bool have = run({"mdb-ver", "--version"}).exitCode == 0;
    return have;
}

std::shared_ptr<OxJetDatabase> open(const std::filesystem::path& path,
                                    const OxJetOpenOptions& options) {
    std::wstring error;
    auto db = OxJetDatabase::open(path.wstring(), options, error);
    EXPECT_TRUE(db) << OxText::toUtf8(error);
    return db;
}

std::vector<std::vector<OxJetValue>> readAll(const OxJetDatabase& db, const std::wstring& table) {
    std::vector<std::vector<OxJetValue>> rows;
    std::wstring error;
    auto def = db.tableDef(table, error);
    EXPECT_TRUE(def) << OxText::toUtf8(error);
    if (!def)
        return rows;
    auto cursor = db.openCursor(def);
    while (cursor->next()) rows.push_back(cursor->values());
    EXPECT_FALSE(cursor->failed()) << OxText::toUtf8(cursor->error());
    return rows;
}

ChildResult runInChild(const std::function<void()>& probe, std::chrono::milliseconds limit) {
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        probe();
        ::_exit(0);
    }
    ChildResult result;
    const auto deadline = std::chrono::steady_clock::now() + limit;
    for (;;) {
        int status = 0;
        const pid_t done = ::waitpid(pid, &status, WNOHANG);
        if (done == pid) {
            if (WIFSIGNALED(status)) {
                result.outcome = ChildOutcome::Crashed;
                result.status = WTERMSIG(status);
            } else {
                result.status = WEXITSTATUS(status);
                // Sanitizers report through a non-zero exit code.
                result.outcome =
                    result.status == 0 ? ChildOutcome::Finished : ChildOutcome::Crashed;
            }
            return result;
        }
        if (std::chrono::steady_clock::now() > deadline) {
            ::kill(pid, SIGKILL);
            ::waitpid(pid, &status, 0);
            result.outcome = ChildOutcome::TimedOut;
            return result;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}
}  // namespace JetTest
