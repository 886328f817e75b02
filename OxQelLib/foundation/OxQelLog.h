#pragma once

#include <string>

#include "OxQelLib/foundation/OxQelGlobal.h"

// The one reporting path of the library: a failure becomes one formatted line that, as
// the host configured it, is appended to the log file and shown through the message sink.
namespace OxQel {
OX_EXPORT void setlogLevel(LogLevel level);
OX_EXPORT LogLevel getlogLevel();
// Bit 8: write reported lines to the log file; bit 4: show them through the message sink.
OX_EXPORT void setDebugInfoType(int flags);
OX_EXPORT int getDebugInfoType();
OX_EXPORT void setDebugLogFilePath(const std::wstring& path);
OX_EXPORT std::wstring getDebugLogFilePath();

OX_EXPORT std::wstring formatLogMessage(const std::wstring& message, const std::wstring& param,
                                        const std::wstring& function, const std::wstring& file,
                                        int line);
OX_EXPORT void showDebugErrorMsg(const std::wstring& message, LogLevel level,
                                 const std::wstring& function, const std::wstring& file, int line,
                                 const std::wstring& param);
OX_EXPORT void writeStringInLogFile(const std::wstring& text);
OX_EXPORT void writeStringInLogFile(const std::wstring& message, const std::wstring& function,
                                    const std::wstring& file, int line, const std::wstring& param);
OX_EXPORT void writeStringInLogFile(const std::wstring& function, const std::wstring& param,
                                    const std::wstring& message);

namespace Util {
// The text of the exception being handled (call inside a catch block): a COM error's
// description, an exception's message, or "Unknown error".
OX_EXPORT std::wstring currentExceptionText();

// Switches reporting off for a probe whose failure is expected, and back on when it
// goes out of scope.
class OX_EXPORT SilentReporting {
public:
    SilentReporting();
    ~SilentReporting();
    SilentReporting(const SilentReporting&) = delete;
    SilentReporting& operator=(const SilentReporting&) = delete;

private:
    int m_savedFlags;
};
}  // namespace Util
}  // namespace OxQel

// Reports a caught failure at the library's level from a source file that defines
// OXQEL_SOURCE_FILE (L"OxQelLib/OxQelConnectionSQLite", named after its class).
#define OXQEL_REPORT(message, function, param)                                                   \
    ::OxQel::showDebugErrorMsg((message), ::OxQel::LogLevelError, (function), OXQEL_SOURCE_FILE, \
                               __LINE__, (param))
