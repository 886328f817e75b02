#include "OxQelLib/odbc/OxQelODBCDataSource.h"

#include <fcntl.h>
#include <sqlext.h>
#include <unistd.h>

#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/odbc/OxQelODBCTerminalDialog.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxMessageSink.h"
#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcHandle.h"

namespace OxQel::ODBC {
namespace {
// The diagnostics of a call, one message each (a truncated output string is no news).
void showDiagnostics(SQLSMALLINT handleType, SQLHANDLE handle, SQLRETURN rc) {
    if (rc == SQL_INVALID_HANDLE) {
        OxMessageSink::show(L"Invalid handle!");
        return;
    }
    for (const auto& r : OxDBException::readDiagnostics(handleType, handle))
        if (r.state != L"01004")
            OxMessageSink::show(oxFormat(L"[%5.5s] %s (%d)\n", r.state, r.message, r.native));
}

// The controlling terminal, closed with the object; -1 when the process has none.
struct Terminal {
    int fd = ::open("/dev/tty", O_RDWR | O_NOCTTY | O_CLOEXEC);
    ~Terminal() {
        if (fd >= 0)
            ::close(fd);
    }
};
}  // namespace

namespace {
bool chooseOnTerminal(std::wstring& connectionString) {
    OxOdbcHandle env;
    try {
        env = OxOdbcHandle(SQL_HANDLE_ENV, SQL_NULL_HANDLE);
    } catch (...) {
        OxMessageSink::show(L"Unable to allocate an environment handle");
        return false;
    }
    const SQLRETURN versionRc = SQLSetEnvAttr(env.get(), SQL_ATTR_ODBC_VERSION,
                                              reinterpret_cast<SQLPOINTER>(SQL_OV_ODBC3), 0);
    if (versionRc != SQL_SUCCESS)
        showDiagnostics(SQL_HANDLE_ENV, env.get(), versionRc);
    if (!SQL_SUCCEEDED(versionRc))
        return false;

    const Terminal terminal;
    if (terminal.fd < 0)
        return false;
    std::wstring in;
    try {
        OxQelODBCTerminalDialog dialog(terminal.fd, terminal.fd);
        in = dialog.run(OxOdbcEnvironment::dataSources(env.get(), OxOdbcEnvironment::Scope::all),
                        &OxOdbcEnvironment::dataSourceAttributes);
    } catch (const OxDBException& e) {
        OxMessageSink::show(e.errorText());
        return false;
    }
    if (in.empty())
        return false;

    OxOdbcHandle dbc;
    try {
        dbc = OxOdbcHandle(SQL_HANDLE_DBC, env.get());
    } catch (const OxDBException& e) {
        showDiagnostics(SQL_HANDLE_ENV, env.get(), e.retCode());
        return false;
    }
    std::string inBytes = OxText::toUtf8(in);
    // Room for any completed string: a truncated one would not connect again.
    std::string out(8192, '\0');
    SQLSMALLINT outLength = 0;
    const SQLRETURN rc = SQLDriverConnectA(
        dbc.get(), nullptr, reinterpret_cast<SQLCHAR*>(inBytes.data()),
        static_cast<SQLSMALLINT>(inBytes.size()), reinterpret_cast<SQLCHAR*>(out.data()),
        static_cast<SQLSMALLINT>(out.size()), &outLength, SQL_DRIVER_NOPROMPT);
    if (rc != SQL_SUCCESS)
        showDiagnostics(SQL_HANDLE_DBC, dbc.get(), rc);
    connectionString = SQL_SUCCEEDED(rc) ? OxText::fromUtf8(out.c_str()) : std::wstring();
    if (SQL_SUCCEEDED(rc))
        SQLDisconnect(dbc.get());
    return !connectionString.empty();
}
}  // namespace

bool selectODBCDataSource(std::wstring& connectionString, void*) {
    try {
        return chooseOnTerminal(connectionString);
    } catch (...) {
        OxMessageSink::show(OxQel::Util::currentExceptionText());
        return false;
    }
}
}  // namespace OxQel::ODBC
