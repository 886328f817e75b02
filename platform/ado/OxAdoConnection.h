#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoError.h"
#include "platform/ado/OxAdoProperty.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

class OxAdoRecordset;

// A connection to a data source through the provider its connection string names.
// Every method raises OxComError on failure; a failure of the provider also replaces
// the Errors collection with the provider's diagnostics.
class OX_EXPORT OxAdoConnection : public std::enable_shared_from_this<OxAdoConnection> {
public:
    static std::shared_ptr<OxAdoConnection> create();
    ~OxAdoConnection();
    OxAdoConnection(const OxAdoConnection&) = delete;
    OxAdoConnection& operator=(const OxAdoConnection&) = delete;

    const std::wstring& connectionString() const { return m_connectionString; }
    void setConnectionString(const std::wstring& text);
    long connectionTimeout() const { return m_connectionTimeout; }
    void setConnectionTimeout(long seconds);
    long commandTimeout() const { return m_commandTimeout; }
    void setCommandTimeout(long seconds);
    int cursorLocation() const { return m_cursorLocation; }
    void setCursorLocation(int location);
    long isolationLevel() const { return m_isolationLevel; }
    void setIsolationLevel(long level);
    // The provider's name, from the connection string until the connection opens.
    std::wstring provider() const;
    // adStateOpen while open; closed again once the provider has lost its source.
    long state() const;

    // Opens with the given string (or the ConnectionString property when it is empty).
    void open(const std::wstring& connectionString = {}, const std::wstring& userId = {},
              const std::wstring& password = {}, long options = OxAdo::adConnectUnspecified);
    // Closes the connection and the recordsets open on it.
    void close();

    // Runs a command text; returns the rows as a forward-only, read-only recordset, or null
    // with adExecuteNoRecords. options: a CommandType, optionally with adExecuteNoRecords.
    std::shared_ptr<OxAdoRecordset> execute(const std::wstring& commandText,
                                            long* recordsAffected = nullptr,
                                            long options = OxAdo::adCmdText);

    // Transactions do not nest: the result is the level, 1.
    long beginTrans();
    void commitTrans();
    void rollbackTrans();
    bool inTransaction() const { return m_inTransaction; }

    // A schema rowset (adSchemaTables, adSchemaIndexes, adSchemaColumns,
    // adSchemaPrimaryKeys, adSchemaProcedures) with the restrictions in their order.
    std::shared_ptr<OxAdoRecordset> openSchema(int schema,
                                               const std::vector<OxVariant>& restrictions = {});

    OxAdoErrors& errors() { return m_errors; }
    const OxAdoErrors& errors() const { return m_errors; }
    // "Autocommit Isolation Levels" and the provider's own properties.
    OxAdoProperties& properties() { return m_properties; }

    // For the objects of the model: the open session (raises adErrInvalidConnection when
    // there is none), and the wrapper of every provider call.
    OxAdoSession& session();
    bool isOpen() const { return m_session != nullptr; }
    template <class F>
    auto call(F&& f) -> decltype(f()) {
        try {
            return f();
        } catch (const OxAdoProviderError& e) {
            providerFailed(e);
        } catch (const OxComError&) {
            throw;
        } catch (const std::bad_alloc&) {
            throw OxComError(OxHr::E_OUTOFMEMORY);
        } catch (const std::exception& e) {
            unexpectedFailure(e);
        }
    }
    // Recordsets open on the connection, closed with it.
    void attach(const std::shared_ptr<OxAdoRecordset>& recordset);

private:
    OxAdoConnection() = default;
    [[noreturn]] void providerFailed(const OxAdoProviderError& e);
    [[noreturn]] void unexpectedFailure(const std::exception& e);
    void requireOpen() const;
    void closeRecordsets() noexcept;
    void releaseSession() noexcept;

    std::wstring m_connectionString;
    long m_connectionTimeout = 15;
    long m_commandTimeout = 30;
    int m_cursorLocation = OxAdo::adUseServer;
    long m_isolationLevel = OxAdo::adXactCursorStability;
    std::unique_ptr<OxAdoSession> m_session;
    bool m_inTransaction = false;
    OxAdoErrors m_errors;
    OxAdoProperties m_properties;
    std::vector<std::weak_ptr<OxAdoRecordset>> m_recordsets;
};
