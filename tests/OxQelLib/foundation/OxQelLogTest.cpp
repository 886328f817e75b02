#include <gtest/gtest.h>

#include <regex>

#include "OxClasses/OxPath.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "platform/core/OxComError.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"
#include "support/TestSupport.h"

using namespace OxQel;

namespace {
// Each test starts from the settings a freshly loaded library has, with a log file in a
// private folder, and puts everything back.
class LogTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlogLevel(LogLevelError);
        setDebugInfoType(3);
        setDebugLogFilePath(m_dir.wfile("oxqel.log"));
        m_previousSink =
            OxMessageSink::setHandler([this](const std::wstring& t) { m_shown.push_back(t); });
    }
    void TearDown() override {
        setDebugInfoType(3);
        setlogLevel(LogLevelError);
        setDebugLogFilePath(L"");
        OxMessageSink::setHandler(m_previousSink);
    }
    std::string log() const { return OxTest::readFile(m_dir.file("oxqel.log")); }
    static void report() {
        showDebugErrorMsg(L"boom", LogLevelError, L"X::f", L"OxQelLib/X", 12, L"SELECT 1");
    }

    OxTest::TempDir m_dir;
    std::vector<std::wstring> m_shown;
    OxMessageSink::Handler m_previousSink;
};

TEST_F(LogTest, LineFormat) {
    const std::wstring line = formatLogMessage(L"msg", L"par", L"Fn::op", L"OxQelLib/Fn", 42);
    const std::regex pattern(
        R"(^\[\d\d/\d\d/\d{4} \d\d:\d\d:\d\d\] MESSAGE: msg PARAM: par FUNCTION: Fn::op FILE: OxQelLib/Fn LINE: 42\n$)");
    EXPECT_TRUE(std::regex_match(OxText::toUtf8(line), pattern)) << OxText::toUtf8(line);
    EXPECT_EQ(OxDateTime(2026, 12, 4, 9, 5, 0).format(L"[%d/%m/%Y %H:%M:%S]"),
              L"[04/12/2026 09:05:00]");
    // The stamp is today's local date, day first.
    EXPECT_EQ(line.substr(1, 10), OxDateTime::now().format(L"%d/%m/%Y"));
}

TEST_F(LogTest, FreshSettingsWriteNothing) {
    report();
    EXPECT_FALSE(OxPath::pathFileExists(m_dir.wfile("oxqel.log")));
    EXPECT_TRUE(m_shown.empty());
}

TEST_F(LogTest, FileFlagCreatesThenAppends) {
    setDebugInfoType(8);
    report();
    const std::string first = log();
    EXPECT_EQ(std::count(first.begin(), first.end(), '\n'), 1) << first;
    report();
    const std::string text = log();
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 2);
    EXPECT_NE(text.find("MESSAGE: boom PARAM: SELECT 1 FUNCTION: X::f FILE: OxQelLib/X LINE: 12"),
              std::string::npos);
    EXPECT_TRUE(m_shown.empty());
}

TEST_F(LogTest, MessageFlagShowsThroughTheSink) {
    setDebugInfoType(4);
    report();
    ASSERT_EQ(m_shown.size(), 1u);
    EXPECT_NE(m_shown[0].find(L"MESSAGE: boom"), std::wstring::npos);
    EXPECT_FALSE(OxPath::pathFileExists(m_dir.wfile("oxqel.log")));
}

TEST_F(LogTest, LevelThreshold) {
    setDebugInfoType(12);
    setlogLevel(LogLevelWarning);
    report();
    EXPECT_TRUE(m_shown.empty());
    EXPECT_FALSE(OxPath::pathFileExists(m_dir.wfile("oxqel.log")));
    setlogLevel(LogLevelDebug);
    showDebugErrorMsg(L"debug", LogLevelDebug, L"f", L"x", 1, L"");
    EXPECT_EQ(m_shown.size(), 1u);
}

TEST_F(LogTest, DirectWritesIgnoreLevelAndFlags) {
    setlogLevel(LogLevelNone);
    setDebugInfoType(0);
    writeStringInLogFile(L"Fn::op", L"param", L"message");
    const std::string text = log();
    EXPECT_NE(text.find("MESSAGE: message PARAM: param FUNCTION: Fn::op FILE:  LINE: -1\n"),
              std::string::npos)
        << text;
    writeStringInLogFile(L"m", L"f", L"file", 3, L"p");
    EXPECT_NE(log().find("MESSAGE: m PARAM: p FUNCTION: f FILE: file LINE: 3"), std::string::npos);
    setDebugLogFilePath(L"");
    EXPECT_NO_THROW(writeStringInLogFile(L"nowhere"));
    setDebugLogFilePath(m_dir.wfile("missing/dir/log"));
    EXPECT_NO_THROW(writeStringInLogFile(L"lost silently"));
}

TEST_F(LogTest, SilentReportingRestoresTheFlags) {
    setDebugInfoType(8);
    {
        Util::SilentReporting quiet;
        EXPECT_EQ(getDebugInfoType(), 0);
        report();
    }
    EXPECT_EQ(getDebugInfoType(), 8);
    EXPECT_FALSE(OxPath::pathFileExists(m_dir.wfile("oxqel.log")));
}

TEST_F(LogTest, ExceptionTexts) {
    auto textOf = [](auto thrower) {
        try {
            thrower();
        } catch (...) {
            return Util::currentExceptionText();
        }
        return std::wstring();
    };
    EXPECT_EQ(textOf([] { throw OxComError(OxHr::E_FAIL, L"provider said no"); }),
              L"provider said no");
    EXPECT_EQ(textOf([] { throw std::runtime_error("\xC3\xA9rror"); }), L"\u00e9rror");
    EXPECT_EQ(textOf([] { throw 42; }), L"Unknown error");
}
}  // namespace
