#include "OxQelLib/odbc/OxQelODBCReport.h"

#include <sqlext.h>

#include "OxQelLib/foundation/OxQelLog.h"
#include "platform/odbc/OxDBException.h"

namespace OxQel::ODBC {
void reportCaught(const wchar_t* function, const wchar_t* file, int line,
                  const std::wstring& param) {
    try {
        throw;
    } catch (const OxDBException& e) {
        if (e.retCode() != SQL_NO_DATA)
            showDebugErrorMsg(e.errorText(), LogLevelError, function, file, line, param);
    } catch (...) {
        showDebugErrorMsg(L"Unknown error", LogLevelError, function, file, line, param);
    }
}
}  // namespace OxQel::ODBC
