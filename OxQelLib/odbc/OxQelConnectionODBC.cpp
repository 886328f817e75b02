#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelConnectionODBC"

#include "OxQelLib/odbc/OxQelConnectionODBC.h"

#include "OxClasses/OxConnectionString.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "OxQelLib/odbc/OxDatabase.h"
#include "OxQelLib/odbc/OxQelODBCReport.h"
#include "OxQelLib/odbc/OxQelRecordsetODBC.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OX_IMPLEMENT_DYNAMIC(OxQelConnectionODBC, OxQelIConnection)

OxQelConnectionODBC::OxQelConnectionODBC() = default;

OxQelConnectionODBC::~OxQelConnectionODBC() = default;

OxObject* OxQelConnectionODBC::clone() const {
    return new OxQelConnectionODBC();
}

OxDatabase* OxQelConnectionODBC::ensureDatabase() {
    if (!m_database)
        m_database = std::make_unique<OxDatabase>();
    return m_database.get();
}

namespace {
// "{...}" with every "}" inside doubled: a value the driver reads back unchanged.
bool isBraced(const std::wstring& value) {
    if (value.size() < 2 || value.front() != L'{' || value.back() != L'}')
        return false;
    for (size_t i = 1; i + 1 < value.size(); ++i) {
        if (value[i] != L'}')
            continue;
        if (i + 2 >= value.size() || value[i + 1] != L'}')
            return false;
        ++i;
    }
    return true;
}

// The value in braces when it would otherwise end early (at a ";") or open a braced value
// that swallows the pairs after it (a "{" that is not closed).
std::wstring connectValue(const std::wstring& value) {
    if (isBraced(value) ||
        (value.find(L';') == std::wstring::npos && (value.empty() || value.front() != L'{')))
        return value;
    std::wstring braced = value;
    OxText::replaceAll(braced, L"}", L"}}");
    return L"{" + braced + L"}";
}

std::vector<std::wstring> connectPairs(const std::wstring& database, const std::wstring& host,
                                       const std::wstring& userId, const std::wstring& password) {
    OxConnectionString connect(host);
    connect.explode();
    if (!database.empty())
        connect.setAt(L"DATABASE", database);
    if (!userId.empty())
        connect.setAt(L"UID", userId);
    if (!password.empty())
        connect.setAt(L"PWD", password);
    std::vector<std::wstring> pairs;
    for (const auto& [key, value] : connect.map())
        pairs.push_back(key + L"=" + connectValue(value));
    return pairs;
}

std::wstring joined(const std::vector<std::wstring>& pairs, bool masked) {
    std::wstring text;
    for (const std::wstring& pair : pairs) {
        if (!text.empty())
            text += L';';
        // Pair by pair, so that no quoting in another value can hide a password.
        text += masked ? OxConnectionString::_maskPasswords(pair) : pair;
    }
    return text;
}
}  // namespace

std::wstring OxQelConnectionODBC::_composeConnectString(const std::wstring& database,
                                                        const std::wstring& host,
                                                        const std::wstring& userId,
                                                        const std::wstring& password) {
    return joined(connectPairs(database, host, userId, password), false);
}

bool OxQelConnectionODBC::openConnection(const std::wstring& database, const std::wstring& host,
                                         const std::wstring& userId, const std::wstring& password) {
    bool result = false;
    std::vector<std::wstring> pairs;
    try {
        if (isOpen())
            closeDatabase();
        OxDatabase* db = ensureDatabase();
        db->setLoginTimeout(OxQel::_lConnectionTimeout);
        db->setQueryTimeout(OxQel::_lCommandTimeout);
        pairs = connectPairs(database, host, userId, password);
        db->open(joined(pairs, false));
        result = true;
    } catch (...) {
        // The report names the connection string, never its credentials.
        OXQEL_ODBC_REPORT(L"OxQelConnectionODBC::openConnection", joined(pairs, true));
    }
    m_inTransaction = false;
    m_parameters.clear();
    m_parameters.setDatabase(database);
    m_parameters.setHost(host);
    m_parameters.setUserId(userId);
    m_parameters.setPassword(password);
    return result;
}

bool OxQelConnectionODBC::closeDatabase() {
    if (m_database)
        m_database->close();
    // Closing ends an open transaction (uncommitted work is rolled back).
    m_inTransaction = false;
    return true;
}

bool OxQelConnectionODBC::isOpen() {
    return m_database && m_database->isOpen() && m_database->hdbc() != nullptr;
}

bool OxQelConnectionODBC::execute(const std::wstring& statement) {
    if (!m_database)
        return false;
    try {
        m_database->executeSQL(statement);
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelConnectionODBC::execute", statement);
        return false;
    }
}

bool OxQelConnectionODBC::formatAndExecute(const std::wstring& statement) {
    return execute(formatBeforeExecute(statement));
}

bool OxQelConnectionODBC::IsFireBirdDriver() const {
    return OxText::toUpper(m_parameters.getDriverName()).find(L"FIREBIRD") != std::wstring::npos;
}

std::wstring OxQelConnectionODBC::formatBeforeExecute(const std::wstring& statement) {
    // In place, so the statement keeps its length; apostrophes inside the literals are left
    // as they are. Unlike the other backends, a "]]]" without its "[[[" closes at a "[[".
    std::wstring text = statement;
    const bool firebird = IsFireBirdDriver();
    size_t p = text.find(L"]]");
    while (p != std::wstring::npos) {
        size_t next = p + 1;  // an opening marker without a closing one is passed over
        bool rendered = false;
        if (OxQel::Util::haveTripleBrace(text, static_cast<int>(p))) {
            const size_t q = text.find(L"[[[", p);
            if (q != std::wstring::npos) {
                text.replace(p, 3, L"  '");
                text.replace(q, 3, L"'  ");
                next = q;
                rendered = true;
            }
        }
        if (!rendered) {
            const size_t q = text.find(L"[[", p);
            if (q != std::wstring::npos) {
                text[p] = firebird ? L' ' : L'N';
                text[p + 1] = L'\'';
                text[q] = L'\'';
                text[q + 1] = L' ';
                next = q;
            }
        }
        p = text.find(L"]]", next);
    }
    return text;
}

bool OxQelConnectionODBC::getTableDef(std::vector<OxQelTableDef>& tables,
                                      OxQelTableDef::TableType mask) {
    if (!m_database)
        return false;
    return IsFireBirdDriver() ? fillTableDefFirebird(tables, mask)
                              : fillTableDefSQL2003Standard(tables, mask);
}

namespace {
void appendIfWanted(std::vector<OxQelTableDef>& tables, const std::wstring& name,
                    OxQelTableDef::TableType type, OxQelTableDef::TableType mask) {
    if ((static_cast<int32_t>(type) & static_cast<int32_t>(mask)) == 0)
        return;
    OxQelTableDef def;
    def.setTableName(name);
    def.setTableType(type);
    tables.push_back(def);
}
}  // namespace

bool OxQelConnectionODBC::fillTableDefFirebird(std::vector<OxQelTableDef>& tables,
                                               OxQelTableDef::TableType mask) {
    tables.clear();
    OxQelRecordsetODBC rs(m_database.get());
    if (!rs.openSQL(this,
                    L"SELECT RDB$RELATION_NAME, RDB$RELATION_TYPE FROM RDB$RELATIONS WHERE "
                    L"RDB$SYSTEM_FLAG = 0"))
        return false;
    while (!rs.getEOF()) {
        std::wstring name;
        long relationType = 0;
        if (rs.getField(L"RDB$RELATION_NAME", name) &&
            rs.getField(L"RDB$RELATION_TYPE", relationType)) {
            const OxQelTableDef::TableType type = relationType == 0   ? OxQelTableDef::Table
                                                  : relationType == 1 ? OxQelTableDef::View
                                                                      : OxQelTableDef::Unknown;
            appendIfWanted(tables, name, type, mask);
        }
        if (!rs.moveNext())
            break;
    }
    return true;
}

bool OxQelConnectionODBC::fillTableDefSQL2003Standard(std::vector<OxQelTableDef>& tables,
                                                      OxQelTableDef::TableType mask) {
    tables.clear();
    std::wstring databaseName;
    try {
        databaseName = m_database->getDatabaseName();
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelConnectionODBC::getTableDef", L"");
        return false;
    }
    // The name is the driver's (a file path on some): its apostrophes must not end the literal.
    const std::wstring statement = L"SELECT TABLE_NAME, TABLE_TYPE FROM INFORMATION_SCHEMA.TABLES" +
                                   oxFormat(L" WHERE '%s' IN (TABLE_CATALOG, TABLE_SCHEMA)",
                                            OxQel::Util::doubleApostrophes(databaseName));
    OxQelRecordsetODBC rs(m_database.get());
    if (!rs.openSQL(this, statement))
        return false;
    while (!rs.getEOF()) {
        std::wstring name;
        std::wstring typeName;
        if (rs.getField(L"TABLE_NAME", name) && rs.getField(L"TABLE_TYPE", typeName)) {
            const OxQelTableDef::TableType type =
                OxText::equalsNoCase(typeName, L"BASE TABLE") ? OxQelTableDef::Table
                : OxText::equalsNoCase(typeName, L"VIEW")     ? OxQelTableDef::View
                                                              : OxQelTableDef::Unknown;
            appendIfWanted(tables, name, type, mask);
        }
        if (!rs.moveNext())
            break;
    }
    return true;
}

bool OxQelConnectionODBC::getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                                      OxQelFieldDefArray& fields) {
    if (!m_database)
        return false;
    OxQelRecordsetODBC rs(m_database.get());
    if (!rs.openSQL(this, oxFormat(L"SELECT %s FROM %s WHERE 0 = 1", fieldList, table)))
        return false;
    rs.getFieldDef(fields);
    return true;
}

bool OxQelConnectionODBC::startTransaction() {
    if (!m_database || !m_database->canTransact())
        return false;
    try {
        m_database->beginTrans();
        m_inTransaction = true;
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(L"OxQelConnectionODBC::startTransaction", L"");
        return false;
    }
}

bool OxQelConnectionODBC::endTransaction(bool commit, const wchar_t* function) {
    if (!m_database || !m_inTransaction || !m_database->canTransact())
        return false;
    try {
        if (commit)
            m_database->commitTrans();
        else
            m_database->rollback();
        m_inTransaction = false;
        return true;
    } catch (...) {
        OXQEL_ODBC_REPORT(function, L"");
        return false;
    }
}

bool OxQelConnectionODBC::closeTransaction() {
    return endTransaction(true, L"OxQelConnectionODBC::closeTransaction");
}

bool OxQelConnectionODBC::rollbackTransaction(bool) {
    return endTransaction(false, L"OxQelConnectionODBC::rollbackTransaction");
}

OxQelIConnection* OxQelConnectionODBC::createNewConnection() {
    auto* connection = new OxQelConnectionODBC();
    connection->openConnection(m_parameters.getDatabase(), m_parameters.getHost(),
                               m_parameters.getUserId(), m_parameters.getPassword());
    return connection;
}

OxQelIRecordset* OxQelConnectionODBC::createOxQelIRecordset() {
    return new OxQelRecordsetODBC(ensureDatabase());
}
