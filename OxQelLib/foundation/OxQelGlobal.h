#pragma once

#include <cstdint>

#include "platform/core/OxExport.h"

namespace OxQel {
// The column type of the library.
enum FieldType : int32_t {
    Unknown = -1,
    Integer = 0,
    String = 1,
    WString = 2,
    Memo = 3,
    WMemo = 4,
    Double = 5,
    Date = 6,
    Bool = 7,
    Binary = 8,
    Guid = 9,
    Char = 10,
    WChar = 11,
};

// Result code of getLastError and of the copy engines.
enum SQLError : int32_t {
    ErrorUnknown = -1,
    NoError = 0,
    ErrorConnection = 1,
    ErrorStatement = 2,
    ErrorTransaction = 3,
    ErrorTimeout = 4,
    ErrorIntegrity = 5,
    ErrorUnspecified = 6,
    ErrorBind = 7,
    ErrorExecute = 8,
};

// Level of a reported message; a message is reported when its level is at most the
// threshold (setlogLevel). Every message of the library is at LogLevelError.
enum LogLevel : int32_t {
    LogLevelNone = 0,
    LogLevelCritical = 1,
    LogLevelWarning = 2,
    LogLevelError = 3,
    LogLevelDebug = 4,
};

// Seconds; 0 keeps the engine's own meaning of 0. The host sets them before it opens
// connections: the login / connection time-out and the query / command time-out.
OX_EXPORT extern int32_t _lConnectionTimeout;
OX_EXPORT extern int32_t _lCommandTimeout;
}  // namespace OxQel
