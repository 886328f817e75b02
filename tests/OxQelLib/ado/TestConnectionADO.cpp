#include "TestConnectionADO.h"

#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "platform/core/OxFormat.h"

bool TestConnectionADO::openConnection(const std::wstring& database, const std::wstring& host,
                                       const std::wstring& userId, const std::wstring& password) {
    m_connectionParameter.clear();
    m_connectionParameter.setDatabase(database);
    m_connectionParameter.setHost(host);
    m_connectionParameter.setUserId(userId);
    m_connectionParameter.setPassword(password);
    std::wstring cs = host;
    if (!userId.empty())
        cs += L";UID=" + userId;
    if (!password.empty())
        cs += L";PWD=" + password;
    return openADOConn(cs);
}

std::wstring TestConnectionADO::columnType(OxQel::FieldType type, int size) const {
    if (m_dialect == Dialect::PostgreSQL) {
        switch (type) {
            case OxQel::Memo:
            case OxQel::WMemo:
                return L"TEXT";
            case OxQel::Double:
                return L"DOUBLE PRECISION";
            case OxQel::Date:
                return L"TIMESTAMP";
            case OxQel::Bool:
                return L"BOOLEAN";
            case OxQel::Binary:
                return L"BYTEA";
            default:
                break;
        }
    }
    const std::wstring t = OxQel::ADO::getStrSQLFieldType(type, size);
    return t.empty() ? L"TEXT" : t;
}

bool TestConnectionADO::createTable(const std::wstring& table, const std::wstring& field,
                                    OxQel::FieldType type, int size, const std::wstring&, bool) {
    return formatAndExecute(
        oxFormat(L"CREATE TABLE [%s] ([%s] %s)", table, field, columnType(type, size)));
}

bool TestConnectionADO::createField(const std::wstring& table, const std::wstring& field,
                                    OxQel::FieldType type, int size, const std::wstring&, bool) {
    return formatAndExecute(
        oxFormat(L"ALTER TABLE [%s] ADD [%s] %s", table, field, columnType(type, size)));
}

bool TestConnectionADO::createView(std::wstring viewName, std::wstring selectText) {
    return formatAndExecute(oxFormat(L"CREATE VIEW %s AS %s", viewName, selectText));
}

bool TestConnectionADO::deleteView(std::wstring viewName) {
    return formatAndExecute(oxFormat(L"DROP VIEW %s", viewName));
}

bool TestConnectionADO::createIndex(const std::wstring& indexName, bool, bool isUnique, bool,
                                    const std::wstring& table, const std::wstring& fieldList) {
    return formatAndExecute(oxFormat(L"CREATE %s INDEX [%s] ON [%s] (%s)",
                                     isUnique ? L"UNIQUE" : L"", indexName, table, fieldList));
}

bool TestConnectionADO::deleteIndex(const std::wstring& indexName, bool, const std::wstring&) {
    return formatAndExecute(oxFormat(L"DROP INDEX [%s]", indexName));
}

bool TestConnectionADO::getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                                    OxQelFieldDefArray& fields) {
    OxQelRecordsetADO rs;
    if (!rs.openSQL(this, formatBeforeExecute(
                              oxFormat(L"SELECT %s FROM [%s] WHERE 0 = 1", fieldList, table))))
        return false;
    const bool ok = rs.getFieldDef(fields);
    rs.close();
    return ok;
}

std::wstring TestConnectionADO::formatBeforeExecute(const std::wstring& statement) {
    if (m_dialect == Dialect::PostgreSQL) {
        // Literals first, with their quotes doubled, then identifiers in double quotes.
        std::wstring s = OxQel::Util::doubleApostrophes(statement);
        OxQel::Util::renderMarkers(s, {L" '", L"' ", L"  '", L"'  "});
        for (wchar_t& c : s)
            if (c == L'[' || c == L']')
                c = L'"';
        return s;
    }
    std::wstring s = OxQel::Util::doubleApostrophes(statement);
    OxQel::Util::renderMarkers(s, {L" '", L"' ", L"  '", L"'  "});
    return s;
}

OxQelIConnection* TestConnectionADO::createNewConnection() {
    auto* c = new TestConnectionADO(m_dialect);
    c->openConnection(m_connectionParameter.getDatabase(), m_connectionParameter.getHost(),
                      m_connectionParameter.getUserId(), m_connectionParameter.getPassword());
    return c;
}

OxQelIRecordset* TestConnectionADO::createOxQelIRecordset() {
    auto* rs = new OxQelRecordsetADO();
    rs->setServerSideCursor(false);
    rs->setAdoCursorType(3);
    rs->setAdoLockType(3);
    return rs;
}
