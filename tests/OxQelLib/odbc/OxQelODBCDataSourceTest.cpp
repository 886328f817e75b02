#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <vector>

#include "OxQelLib/odbc/OdbcConnectionTest.h"
#include "OxQelLib/odbc/OxQelODBCDataSource.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"

namespace {
// One run of the chooser in a child process. On a pseudo-terminal (its controlling
// terminal) the test answers each prompt as it appears; without one, the child has no
// terminal at all.
struct ChooserRun {
    bool chosen = false;
    std::string connect;   // the connection string returned
    std::string messages;  // what went to the message sink
    std::string screen;    // what the terminal showed
};

struct Step {
    std::string prompt;  // waited for on the screen
    std::string answer;  // then typed, with Enter
};

void writeAll(int fd, const std::string& text) {
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t n = ::write(fd, text.data() + done, text.size() - done);
        if (n <= 0)
            return;
        done += static_cast<size_t>(n);
    }
}

// Everything until the writer closes, or what came within the time.
std::string readAll(int fd, std::chrono::seconds within = std::chrono::seconds(30)) {
    std::string text;
    char buffer[4096];
    const auto deadline = std::chrono::steady_clock::now() + within;
    while (std::chrono::steady_clock::now() < deadline) {
        pollfd p{fd, POLLIN, 0};
        if (::poll(&p, 1, 200) <= 0)
            continue;
        const ssize_t n = ::read(fd, buffer, sizeof(buffer));
        if (n <= 0)
            return text;
        text.append(buffer, n);
    }
    ADD_FAILURE() << "the chooser's process did not finish";
    return text;
}

[[noreturn]] void runInChild(int resultFd) {
    std::wstring messages;
    OxMessageSink::setHandler([&](const std::wstring& t) { messages += t; });
    std::wstring connect;
    const bool chosen = OxQel::ODBC::selectODBCDataSource(connect);
    writeAll(resultFd, std::string(chosen ? "1" : "0") + '\0' + OxText::toUtf8(connect) + '\0' +
                           OxText::toUtf8(messages));
    ::_exit(0);
}

ChooserRun parseResult(const std::string& result) {
    ChooserRun run;
    const size_t a = result.find('\0');
    const size_t b = a == std::string::npos ? a : result.find('\0', a + 1);
    if (b == std::string::npos) {
        ADD_FAILURE() << "the chooser's process gave no result";
        return run;
    }
    run.chosen = result.substr(0, a) == "1";
    run.connect = result.substr(a + 1, b - a - 1);
    run.messages = result.substr(b + 1);
    return run;
}

ChooserRun runOnTerminal(const std::vector<Step>& steps) {
    OdbcTest::Env::get();
    int result[2];
    EXPECT_EQ(::pipe(result), 0);
    int master = -1;
    const pid_t pid = ::forkpty(&master, nullptr, nullptr, nullptr);
    if (pid == 0) {
        ::close(result[0]);
        runInChild(result[1]);
    }
    ::close(result[1]);
    ChooserRun run;
    size_t seen = 0;  // the screen up to here answered a prompt already
    for (const Step& step : steps) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (run.screen.find(step.prompt, seen) == std::string::npos) {
            pollfd p{master, POLLIN, 0};
            if (std::chrono::steady_clock::now() > deadline || ::poll(&p, 1, 200) < 0) {
                ADD_FAILURE() << "no prompt \"" << step.prompt << "\" on:\n" << run.screen;
                break;
            }
            char buffer[1024];
            const ssize_t n = p.revents & POLLIN ? ::read(master, buffer, sizeof(buffer)) : 0;
            if (n > 0)
                run.screen.append(buffer, n);
            else if (p.revents & (POLLHUP | POLLERR))
                break;
        }
        seen = run.screen.size();
        writeAll(master, step.answer + "\n");
    }
    const std::string output = readAll(result[0]);
    ::kill(pid, SIGKILL);  // gone already, unless it hangs
    // The rest of the screen, read until the child's side closes.
    for (;;) {
        pollfd p{master, POLLIN, 0};
        char buffer[1024];
        ssize_t n = 0;
        if (::poll(&p, 1, 500) <= 0 || (n = ::read(master, buffer, sizeof(buffer))) <= 0)
            break;
        run.screen.append(buffer, n);
    }
    ::close(result[0]);
    ::close(master);
    int status = 0;
    ::waitpid(pid, &status, 0);
    const ChooserRun parsed = parseResult(output);
    run.chosen = parsed.chosen;
    run.connect = parsed.connect;
    run.messages = parsed.messages;
    return run;
}

#ifndef OXQEL_ODBC_TEST_SERVER
ChooserRun runWithoutTerminal() {
    OdbcTest::Env::get();
    int result[2];
    EXPECT_EQ(::pipe(result), 0);
    const pid_t pid = ::fork();
    if (pid == 0) {
        ::close(result[0]);
        ::setsid();  // a new session has no controlling terminal
        runInChild(result[1]);
    }
    ::close(result[1]);
    const std::string output = readAll(result[0]);
    ::kill(pid, SIGKILL);
    ::close(result[0]);
    int status = 0;
    ::waitpid(pid, &status, 0);
    return parseResult(output);
}

TEST(OdbcChooser, PicksADataSourceByNumberOrName) {
    const ChooserRun byName = runOnTerminal({{"empty to cancel): ", "nonsense"},
                                             {"empty to cancel): ", "sqlite_test"},
                                             {"User id", ""},
                                             {"Password", ""},
                                             {"Other keys", ""}});
    EXPECT_NE(byName.screen.find("sqlite_test"), std::string::npos) << byName.screen;
    EXPECT_NE(byName.screen.find("There is no data source nonsense."), std::string::npos);
    ASSERT_TRUE(byName.chosen) << byName.screen << byName.messages;
    EXPECT_NE(byName.connect.find("DSN=sqlite_test"), std::string::npos) << byName.connect;
    EXPECT_TRUE(byName.messages.empty()) << byName.messages;

    // The listing's order numbers the sources; the user's own keys are passed on.
    const size_t line = byName.screen.find("sqlite_test");
    const std::string number = byName.screen.substr(byName.screen.rfind('\n', line) + 1, 6);
    const ChooserRun byNumber = runOnTerminal({{"empty to cancel): ", number},
                                               {"User id", "someone"},
                                               {"Password", "hidden-word"},
                                               {"Other keys", "StepAPI=1"}});
    ASSERT_TRUE(byNumber.chosen) << byNumber.screen << byNumber.messages;
    EXPECT_NE(byNumber.connect.find("DSN=sqlite_test"), std::string::npos) << byNumber.connect;
    EXPECT_NE(byNumber.screen.find("someone"), std::string::npos);
    EXPECT_EQ(byNumber.screen.find("hidden-word"), std::string::npos)  // not echoed
        << byNumber.screen;
}

TEST(OdbcChooser, CancelledOrWithoutATerminalChoosesNothing) {
    EXPECT_FALSE(runOnTerminal({{"empty to cancel): ", ""}}).chosen);
    const ChooserRun none = runWithoutTerminal();
    EXPECT_FALSE(none.chosen);
    EXPECT_TRUE(none.connect.empty());
}

TEST(OdbcChooser, AFailedConnectionShowsItsDiagnostics) {
    const ChooserRun run = runOnTerminal({{"empty to cancel): ", "sqlite_test"},
                                          {"User id", ""},
                                          {"Password", ""},
                                          {"Other keys", "DATABASE=/nonexistent/folder/x.db"}});
    EXPECT_FALSE(run.chosen) << run.connect;
    ASSERT_FALSE(run.messages.empty()) << run.screen;
    // "[STATE] message (native)\n", one message each.
    EXPECT_EQ(run.messages.front(), '[');
    EXPECT_EQ(run.messages[6], ']');
    EXPECT_EQ(run.messages.back(), '\n');
    EXPECT_NE(run.messages.find(")\n"), std::string::npos);
}
#else
TEST(OdbcChooser, CompletesTheCredentialsOfAServerDataSource) {
    ODBC_REQUIRE_POSTGRES();
    const auto& env = OdbcTest::Env::get();
    const ChooserRun run = runOnTerminal({{"empty to cancel): ", "pg_test"},
                                          {"User id", env.value("PG_USER")},
                                          {"Password", env.value("PG_PASSWORD")},
                                          {"Other keys", ""}});
    ASSERT_TRUE(run.chosen) << run.screen << run.messages;
    EXPECT_EQ(run.screen.find(env.value("PG_PASSWORD")), std::string::npos);
    // The completed string opens a connection of the library.
    OxQelConnectionODBC c;
    EXPECT_TRUE(c.openConnection(L"", OxText::fromUtf8(run.connect), L"", L""));
    EXPECT_TRUE(c.execute(L"SELECT 1"));

    const ChooserRun wrong = runOnTerminal({{"empty to cancel): ", "pg_test"},
                                            {"User id", env.value("PG_USER")},
                                            {"Password", "wrong"},
                                            {"Other keys", ""}});
    EXPECT_FALSE(wrong.chosen);
    EXPECT_NE(wrong.messages.find("[08001]"), std::string::npos) << wrong.messages;
}
#endif
}  // namespace
