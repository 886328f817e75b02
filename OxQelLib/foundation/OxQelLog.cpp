#include "OxQelLib/foundation/OxQelLog.h"

#include <atomic>
#include <mutex>

#include "OxClasses/OxPath.h"
#include "OxClasses/OxUtString.h"
#include "platform/core/OxComError.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"

namespace OxQel {
namespace {
// Plain settings, read by every report; atomics keep concurrent reports well defined.
std::atomic<int32_t> g_logLevel{LogLevelError};
std::atomic<int> g_debugInfoType{3};
std::mutex g_pathMutex;
std::wstring g_logPath;

constexpr int kWriteToFile = 8;
constexpr int kShowMessage = 4;
}  // namespace

void setlogLevel(LogLevel level) {
    g_logLevel = level;
}
LogLevel getlogLevel() {
    return static_cast<LogLevel>(g_logLevel.load());
}
void setDebugInfoType(int flags) {
    g_debugInfoType = flags;
}
int getDebugInfoType() {
    return g_debugInfoType;
}

void setDebugLogFilePath(const std::wstring& path) {
    std::lock_guard lock(g_pathMutex);
    g_logPath = path;
}

std::wstring getDebugLogFilePath() {
    std::lock_guard lock(g_pathMutex);
    return g_logPath;
}

std::wstring formatLogMessage(const std::wstring& message, const std::wstring& param,
                              const std::wstring& function, const std::wstring& file, int line) {
    // An unreadable clock formats as "Invalid DateTime".
    const std::wstring time = OxDateTime::now().format(L"%d/%m/%Y %H:%M:%S");
    return oxFormat(L"[%s] MESSAGE: %s PARAM: %s FUNCTION: %s FILE: %s LINE: %d\n", time, message,
                    param, function, file, line);
}

void showDebugErrorMsg(const std::wstring& message, LogLevel level, const std::wstring& function,
                       const std::wstring& file, int line, const std::wstring& param) {
    try {
        if (level > getlogLevel())
            return;
        const std::wstring text = formatLogMessage(message, param, function, file, line);
        if (getDebugInfoType() & kWriteToFile)
            writeStringInLogFile(text);
        if (getDebugInfoType() & kShowMessage)
            OxMessageSink::show(text);
    } catch (...) {
        // Reporting never changes the result of the operation that reports.
    }
}

void writeStringInLogFile(const std::wstring& text) {
    try {
        const std::wstring path = getDebugLogFilePath();
        if (path.empty())
            return;
        const bool exists = OxPath::pathFileExists(path);
        OxUtString::writeStringArrayToUnicodeFile(path, {text}, exists);
    } catch (...) {
        // A log that cannot be written loses the message silently.
    }
}

void writeStringInLogFile(const std::wstring& message, const std::wstring& function,
                          const std::wstring& file, int line, const std::wstring& param) {
    try {
        writeStringInLogFile(formatLogMessage(message, param, function, file, line));
    } catch (...) {
    }
}

void writeStringInLogFile(const std::wstring& function, const std::wstring& param,
                          const std::wstring& message) {
    writeStringInLogFile(message, function, L"", -1, param);
}

namespace Util {
std::wstring currentExceptionText() {
    try {
        throw;
    } catch (const OxComError& e) {
        return e.Description();
    } catch (const std::exception& e) {
        return OxText::fromUtf8(e.what());
    } catch (...) {
        return L"Unknown error";
    }
}

SilentReporting::SilentReporting() : m_savedFlags(getDebugInfoType()) {
    setDebugInfoType(0);
}
SilentReporting::~SilentReporting() {
    setDebugInfoType(m_savedFlags);
}
}  // namespace Util
}  // namespace OxQel
