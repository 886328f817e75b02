#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelConnectionADO"
#include "OxQelLib/ado/OxQelConnectionADO.h"

#include <algorithm>

#include "OxClasses/OxConnectionString.h"
#include "OxQelLib/ado/OxQelPreparedQueryADO.h"
#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoError.h"
#include "platform/ado/OxAdoRecordset.h"
#include "platform/ado/OxAdoxCatalog.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OX_IMPLEMENT_DYNAMIC(OxQelConnectionADO, OxQelIConnection)

namespace {
// Native errors of a connection that the server or the network dropped. Native error 0
// is what many sources give for any error without a code of its own, so it counts only
// with a connection-failure state (08...) or without any state.
bool isDroppedConnection(const OxAdoError& e) {
    switch (e.nativeError()) {
        case 10054:
        case 10053:
        case 232:
        case 233:
        case 109:
            return true;
        case 0:
            return e.sqlState().empty() || e.sqlState().rfind(L"08", 0) == 0;
        default:
            return false;
    }
}

std::wstring textOf(const OxVariant& v) {
    std::wstring s;
    OxQel::Util::tryVariantToString(v, s);
    return s;
}

OxQelTableDef::TableType tableTypeOf(const std::wstring& kind) {
    static const struct {
        const wchar_t* name;
        OxQelTableDef::TableType type;
    } kinds[] = {
        {L"TABLE", OxQelTableDef::Table},
        {L"VIEW", OxQelTableDef::View},
        {L"SYSTEM TABLE", OxQelTableDef::SystemTable},
        {L"SYSTEM VIEW", OxQelTableDef::SystemView},
        {L"ACCESS TABLE", OxQelTableDef::AccessTable},
        {L"LINK", OxQelTableDef::Link},
        {L"PASS-THROUGH", OxQelTableDef::PassThrough},
        {L"PROCEDURE", OxQelTableDef::Procedure},
        {L"SYNONYM", OxQelTableDef::Synonym},
    };
    for (const auto& k : kinds)
        if (OxText::equalsNoCase(kind, k.name))
            return k.type;
    return OxQelTableDef::Unknown;
}
}  // namespace

OxQelConnectionADO::OxQelConnectionADO() = default;

OxQelConnectionADO::~OxQelConnectionADO() {
    m_script.reset();
    m_catalog.reset();
    m_connection.reset();
}

OxObject::CompareResult OxQelConnectionADO::compareTo(const OxObject* other, int,
                                                      bool descending) const {
    if (!other || !other->IsKindOf(GetRuntimeClass()))
        return NotComparable;
    return descendingCompareResult(NotComparable, descending);
}

void OxQelConnectionADO::copyFrom(const OxObject& other) {
    OxQelIConnection::copyFrom(other);
    if (const auto* o = OxQelConnectionADO::cast(&other)) {
        m_connection = o->m_connection;
        m_catalog = o->m_catalog;
    }
}

OxObject* OxQelConnectionADO::clone() const {
    return nullptr;
}

OxAdoConnection& OxQelConnectionADO::connection() const {
    if (!m_connection)
        throw OxComError(OxHr::E_POINTER);
    return *m_connection;
}

OxAdoxCatalog& OxQelConnectionADO::catalog() const {
    if (!m_catalog)
        throw OxComError(OxHr::E_POINTER);
    return *m_catalog;
}

std::wstring OxQelConnectionADO::maskedConnectionString() const {
    return m_connection ? OxConnectionString::_maskPasswords(m_connection->connectionString())
                        : std::wstring();
}

// ---------------------------------------------------------------- messages

void OxQelConnectionADO::getComError(std::wstring& message, const OxComError& error) {
    const OxHResult hr = error.Error();
    std::wstring text = error.Description();
    // A description the error got from its code alone is the system's text, which has
    // its own rules for codes it does not know.
    if (text == OxHr::messageOf(hr) && text.rfind(L"Unknown error", 0) == 0) {
        const uint32_t code = static_cast<uint32_t>(hr);
        if (code > 0x80040200u && code <= 0x8004FFFFu)
            text = oxFormat(L"IDispatch error #%d", static_cast<int>(code - 0x80040200u));
        else
            text = oxFormat(L"Unknown error 0x%0lX", static_cast<unsigned long>(code));
    }
    while (!text.empty() && (text.back() == L'\n' || text.back() == L'\r')) text.pop_back();
    message = text.empty() ? L"Unknow com error " : text + L" ";
    message +=
        oxFormat(L"(HRESULT: 0x%08lx)", static_cast<unsigned long>(static_cast<uint32_t>(hr)));
}

void OxQelConnectionADO::getProviderError(std::wstring& message) {
    message.clear();
    if (!m_connection)
        return;
    for (const auto& e : m_connection->errors()) {
        const std::wstring& d = e->description();
        message += oxFormat(L"%s (Number : %d)", d.empty() ? L"Unknow connection error" : d,
                            static_cast<int>(e->number()));
    }
}

std::wstring OxQelConnectionADO::currentErrorMessage(OxQelIConnection* connection) {
    try {
        throw;
    } catch (const OxComError& e) {
        std::wstring message;
        // The provider's errors describe this failure only when it came from the provider.
        auto* ado = OxQelConnectionADO::cast(connection);
        if (ado && ado->m_connection && ado->m_connection->errors().count() > 0 &&
            OxAdo::asHResult(ado->m_connection->errors().item(0L)->number()) == e.Error())
            ado->getProviderError(message);
        if (message.empty())
            getComError(message, e);
        return message;
    } catch (...) {
        return L"Unknown error";
    }
}

// ---------------------------------------------------------------- opening and closing

bool OxQelConnectionADO::createInstance() {
    try {
        m_connection.reset();
        m_connection = OxAdoConnection::create();
        m_catalog.reset();
        m_catalog = OxAdoxCatalog::create();
        m_connection->setConnectionTimeout(OxQel::_lConnectionTimeout);
        m_connection->setCommandTimeout(OxQel::_lCommandTimeout);
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::createInstance", L"");
        return false;
    }
}

bool OxQelConnectionADO::openADOConn(const std::wstring& connectionString) {
    if (!createInstance()) {
        closeDatabase();
        return false;
    }
    try {
        m_connection->open(connectionString, L"", L"", -1);
        m_catalog->setActiveConnection(m_connection);
        m_inTransaction = false;
        return true;
    } catch (...) {
        // The connection string may carry a password: it never reaches the log.
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::openADOConn",
                     OxConnectionString::_maskPasswords(connectionString));
        closeDatabase();
        return false;
    }
}

bool OxQelConnectionADO::closeDatabase() {
    try {
        if (!m_connection || !m_catalog)
            throw OxComError(OxHr::E_POINTER);
        if (m_connection->state() != OxAdo::adStateClosed)
            m_connection->close();
        m_connection.reset();
        m_catalog.reset();
        m_inTransaction = false;
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::closeDatabase", L"");
        return false;
    }
}

bool OxQelConnectionADO::isOpen() {
    bool open = false;
    try {
        if (!m_connection || !m_catalog)
            return false;
        open = m_connection->state() != OxAdo::adStateClosed;
        for (const auto& e : m_connection->errors())
            if (isDroppedConnection(*e)) {
                open = false;
                break;
            }
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::isOpen", L"");
    }
    return open;
}

// ---------------------------------------------------------------- statements and scripts

bool OxQelConnectionADO::execute(const std::wstring& statement) {
    if (m_script)
        return addQueryToScript(statement);
    try {
        connection().execute(statement, nullptr, OxAdo::adExecuteNoRecords);
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::execute", statement);
        return false;
    }
}

void OxQelConnectionADO::startScriptMode() {
    m_script = std::make_shared<std::wstring>();
}

bool OxQelConnectionADO::addQueryToScript(const std::wstring& query) {
    if (!m_script)
        return false;
    *m_script += L"EXEC(N'" + OxQel::Util::doubleApostrophes(query) + L"');\n\r";
    return true;
}

std::shared_ptr<std::wstring> OxQelConnectionADO::endScriptMode() {
    std::shared_ptr<std::wstring> script = std::move(m_script);
    m_script.reset();
    if (!script || script->empty())
        return nullptr;
    return script;
}

// ---------------------------------------------------------------- transactions

bool OxQelConnectionADO::startTransaction() {
    if (!isOpen() || m_inTransaction)
        return false;
    try {
        m_connection->beginTrans();
        m_inTransaction = true;
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::startTransaction",
                     maskedConnectionString());
        return false;
    }
}

bool OxQelConnectionADO::closeTransaction() {
    if (!isOpen() || !isInTransaction())
        return false;
    try {
        m_connection->commitTrans();
        m_inTransaction = false;
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::closeTransaction",
                     maskedConnectionString());
        m_inTransaction = m_connection->inTransaction();
        return false;
    }
}

bool OxQelConnectionADO::rollbackTransaction(bool) {
    if (!isOpen() || !isInTransaction())
        return false;
    try {
        m_connection->rollbackTrans();
        m_inTransaction = false;
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::rollbackTransaction",
                     maskedConnectionString());
        // A rollback that failed still ended the transaction on the connection: the flag
        // follows it, so that a new transaction can start.
        m_inTransaction = m_connection->inTransaction();
        return false;
    }
}

bool OxQelConnectionADO::isInTransaction() {
    return m_inTransaction;
}

OxQel::SQLError OxQelConnectionADO::getLastError() {
    if (!m_connection)
        return OxQel::ErrorUnknown;
    if (m_connection->errors().count() == 0)
        return OxQel::NoError;
    switch (static_cast<uint32_t>(m_connection->errors().item(0L)->number())) {
        case 0:
            return OxQel::NoError;
        case 3002:
        case 3706:
        case 3709:
        case 3730:
            return OxQel::ErrorConnection;
        case 0x80040E14u:
        case 3421:
        case 3721:
        case 3725:
        case 3726:
        case 3749:
            return OxQel::ErrorStatement;
        case 3246:
        case 3714:
            return OxQel::ErrorTransaction;
        case 0x80040E31u:
            return OxQel::ErrorTimeout;
        case 3719:
            return OxQel::ErrorIntegrity;
        case 0x80004005u:
            return OxQel::ErrorUnspecified;
        default:
            return OxQel::ErrorUnknown;
    }
}

// ---------------------------------------------------------------- schema

bool OxQelConnectionADO::findTable(const std::wstring& table) {
    OxQel::Util::SilentReporting silent;
    return execute(oxFormat(L"SELECT * FROM %s WHERE 1 = 0;", table));
}

bool OxQelConnectionADO::findField(const std::wstring& table, const std::wstring& field) {
    OxQel::Util::SilentReporting silent;
    return execute(oxFormat(L"SELECT %s FROM %s WHERE 1 = 0;", field, table));
}

bool OxQelConnectionADO::deleteTable(const std::wstring& table) {
    return formatAndExecute(oxFormat(L"DROP TABLE [%s]", table));
}

bool OxQelConnectionADO::deleteField(const std::wstring& table, const std::wstring& field) {
    return formatAndExecute(oxFormat(L"ALTER TABLE [%s] DROP COLUMN [%s];", table, field));
}

bool OxQelConnectionADO::resizeFieldString(const std::wstring& table, const std::wstring& field,
                                           long newSize) {
    OxQelFieldDefArray fields;
    if (!getFieldDef(table, field, fields) || fields.size() != 1)
        return false;
    const OxQel::FieldType type = fields[0].getFieldType();
    if (type == OxQel::String)
        return formatAndExecute(
            oxFormat(L"ALTER TABLE [%s] ALTER COLUMN [%s] VARCHAR (%ld);", table, field, newSize));
    if (type == OxQel::WString)
        return formatAndExecute(
            oxFormat(L"ALTER TABLE [%s] ALTER COLUMN [%s] NVARCHAR (%ld);", table, field, newSize));
    return false;
}

bool OxQelConnectionADO::modifyFieldType(const std::wstring&, const std::wstring&,
                                         const OxQelFieldDef&) {
    return false;
}

bool OxQelConnectionADO::update() {
    return true;
}

bool OxQelConnectionADO::renameTable(const std::wstring& oldName, const std::wstring& newName) {
    if (oldName == newName)
        return true;
    try {
        OxAdoxTables& tables = catalog().tables();
        tables.item(oldName)->setName(newName);
        tables.refresh();
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::renameTable", oldName);
        return false;
    }
}

bool OxQelConnectionADO::renameField(const std::wstring& table, const std::wstring& oldName,
                                     const std::wstring& newName) {
    try {
        OxAdoxTables& tables = catalog().tables();
        const auto t = tables.item(table);
        if (!OxText::equalsNoCase(t->type(), L"TABLE"))
            return false;
        t->columns().item(oldName)->setName(newName);
        t->columns().refresh();
        tables.refresh();
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::renameField", table);
        return false;
    }
}

std::shared_ptr<OxAdoxTable> OxQelConnectionADO::findADOXTable(const std::wstring& table) {
    try {
        OxAdoxTables& tables = catalog().tables();
        tables.refresh();
        for (long i = tables.count() - 1; i >= 0; --i)
            if (tables.item(i)->name() == table)
                return tables.item(i);
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::findADOXTable", table);
    }
    return nullptr;
}

std::shared_ptr<OxAdoxColumn> OxQelConnectionADO::findADOXField(const std::wstring& table,
                                                                const std::wstring& field) {
    const auto t = findADOXTable(table);
    if (!t)
        return nullptr;
    try {
        OxAdoxColumns& columns = t->columns();
        columns.refresh();
        for (long i = columns.count() - 1; i >= 0; --i)
            if (columns.item(i)->name() == field)
                return columns.item(i);
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::findADOXField", field);
    }
    return nullptr;
}

std::wstring OxQelConnectionADO::getStrDefaultValue(const std::wstring& table,
                                                    const std::wstring& field) {
    const auto column = findADOXField(table, field);
    if (!column)
        return {};
    try {
        return textOf(column->properties().item(L"Default")->value());
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::getStrDefaultValue", field);
        return {};
    }
}

bool OxQelConnectionADO::getTableDef(std::vector<OxQelTableDef>& tables,
                                     OxQelTableDef::TableType mask) {
    tables.clear();
    try {
        catalog().tables().refresh();
        const auto rs = connection().openSchema(OxAdo::adSchemaTables);
        while (!rs->eof()) {
            const std::wstring name = textOf(rs->fields().item(L"TABLE_NAME")->value());
            const std::wstring kind = textOf(rs->fields().item(L"TABLE_TYPE")->value());
            const OxQelTableDef::TableType type = tableTypeOf(kind);
            if (type == OxQelTableDef::Unknown)
                OXQEL_REPORT(oxFormat(L"Unknown table's type: %s\n", kind),
                             L"OxQelConnectionADO::getTableDef", name);
            if (type & mask) {
                OxQelTableDef def;
                def.setTableName(name);
                def.setTableType(type);
                tables.push_back(std::move(def));
            }
            rs->moveNext();
        }
        rs->close();
        if (mask & OxQelTableDef::View) {
            OxAdoxProcedures& procedures = catalog().procedures();
            procedures.refresh();
            for (const auto& p : procedures) {
                OxQelTableDef def;
                def.setTableName(p->name());
                def.setTableType(OxQelTableDef::View);
                tables.push_back(std::move(def));
            }
        }
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::getTableDef", L"");
    }
    return true;
}

bool OxQelConnectionADO::getIndexDef(const std::wstring& table,
                                     std::vector<OxQelIndexDef>& indexes) {
    try {
        catalog().tables().refresh();
        const auto rs = connection().openSchema(OxAdo::adSchemaIndexes);
        while (!rs->eof()) {
            if (OxText::equalsNoCase(textOf(rs->fields().item(L"TABLE_NAME")->value()), table)) {
                const std::wstring index = textOf(rs->fields().item(L"INDEX_NAME")->value());
                const std::wstring column = textOf(rs->fields().item(L"COLUMN_NAME")->value());
                bool primary = false, unique = false;
                OxQel::Util::tryVariantToBool(rs->fields().item(L"PRIMARY_KEY")->value(), primary);
                OxQel::Util::tryVariantToBool(rs->fields().item(L"UNIQUE")->value(), unique);
                auto it = std::find_if(indexes.begin(), indexes.end(), [&](const OxQelIndexDef& d) {
                    return OxText::equalsNoCase(d.getIndexName(), index);
                });
                if (it != indexes.end()) {
                    it->addFieldName(column);
                } else {
                    OxQelIndexDef def;
                    def.setIndexName(index);
                    def.setTableName(table);
                    def.setIsPrimaryKey(primary);
                    def.setIsUnique(unique);
                    def.addFieldName(column);
                    indexes.push_back(std::move(def));
                }
            }
            rs->moveNext();
        }
        rs->close();
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::getIndexDef", table);
    }
    return true;
}

bool OxQelConnectionADO::modifyTable(const std::wstring& table, const OxQelFieldDefArray& fields) {
    try {
        OxAdoxTables& tables = catalog().tables();
        std::shared_ptr<OxAdoxTable> existing;
        try {
            existing = tables.item(table);
        } catch (const OxComError&) {
            // Not found: the table is created below.
        }
        if (existing) {
            if (!OxText::equalsNoCase(existing->type(), L"TABLE"))
                OXQEL_REPORT(oxFormat(L"Update failed: %s it's not a TABLE\n", table),
                             L"OxQelConnectionADO::modifyTable", L"");
            else
                OXQEL_REPORT(L"Not yet implemented function when the table exists",
                             L"OxQelConnectionADO::modifyTable", table);
            return false;
        }
        const auto t = OxAdoxTable::create();
        t->setName(table);
        t->setParentCatalog(m_catalog);
        for (const auto& f : fields) {
            const int type = OxQel::QelFieldTypeToADODBType(f.getFieldType());
            const auto column = OxAdoxColumn::create();
            column->setParentCatalog(m_catalog);
            column->setName(f.getFieldName());
            column->setType(type);
            column->setDefinedSize(f.getFieldSize());
            column->properties().item(L"Nullable")->setValue(OxVariant(true));
            column->properties().item(L"Default")->setValue(OxVariant(f.getDefaultValue()));
            if (f.getFieldType() == OxQel::WString || f.getFieldType() == OxQel::WMemo)
                column->properties()
                    .item(L"Jet OLEDB:Compressed UNICODE Strings")
                    ->setValue(OxVariant(true));
            t->columns().append(column);
            // The ADO readers keep the row-identity attribute in this flag.
            if (f.getNoAuto())
                column->properties().item(L"AutoIncrement")->setValue(OxVariant(true));
        }
        tables.append(t);
        tables.refresh();
        for (const auto& f : fields) {
            try {
                tables.item(table)
                    ->columns()
                    .item(f.getFieldName())
                    ->properties()
                    .item(L"Jet OLEDB:Allow Zero Length")
                    ->setValue(OxVariant(true));
            } catch (...) {
                // Not every provider has the property; the table is made all the same.
            }
        }
        return true;
    } catch (...) {
        OXQEL_REPORT(currentErrorMessage(this), L"OxQelConnectionADO::modifyTable", table);
        return false;
    }
}

// ---------------------------------------------------------------- the rest

OxQelIPreparedQuery* OxQelConnectionADO::createOxQelIPrepraredQuery() {
    auto* query = new OxQelPreparedQueryADO();
    if (!query->setConnection(this)) {
        delete query;
        return nullptr;
    }
    return query;
}

bool OxQelConnectionADO::canReadMultithread() {
    return false;
}

bool OxQelConnectionADO::canWriteMultiThread() {
    return false;
}

OxConnectionParameter OxQelConnectionADO::getConnectionParameter() {
    return m_connectionParameter;
}
