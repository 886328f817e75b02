#pragma once

#include <functional>
#include <string>

#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

// The DDL of the engines behind ODBC drivers, for the catalog's changes: type names,
// automatic numbering, renames and column changes. An engine not known by name gets
// standard SQL.
class OX_EXPORT OxAdoOdbcDialect {
public:
    enum class Engine { Generic, SQLite, PostgreSQL, SqlServer, MySQL };
    using Quote = std::function<std::wstring(const std::wstring&)>;

    OxAdoOdbcDialect() = default;
    OxAdoOdbcDialect(Engine engine, Quote quote) : m_engine(engine), m_quote(std::move(quote)) {}
    // The engine a driver names in SQL_DBMS_NAME.
    static Engine engineOf(const std::wstring& dbmsName);

    Engine engine() const { return m_engine; }
    // The column's type (with its automatic numbering where the engine writes it there).
    std::wstring typeOf(const OxAdoColumnDesc& column) const;
    // The whole column clause: name, type, default and nullability.
    std::wstring columnClause(const OxAdoColumnDesc& column) const;
    std::wstring createTable(const OxAdoTableDesc& table) const;
    std::wstring renameTable(const std::wstring& oldName, const std::wstring& newName) const;
    std::wstring renameColumn(const std::wstring& table, const std::wstring& oldName,
                              const std::wstring& newName) const;
    std::wstring addColumn(const std::wstring& table, const OxAdoColumnDesc& column) const;
    std::wstring dropColumn(const std::wstring& table, const std::wstring& column) const;
    // Empty when the engine cannot change the property of an existing column.
    std::wstring setDefault(const std::wstring& table, const std::wstring& column,
                            const std::wstring& defaultText) const;
    std::wstring setNullable(const std::wstring& table, const std::wstring& column,
                             bool nullable) const;

    // Whether the column is nullable: its "Nullable" property, else its attributes.
    static bool isNullable(const OxAdoColumnDesc& column);
    static bool isAutoIncrement(const OxAdoColumnDesc& column);
    static std::wstring defaultText(const OxAdoColumnDesc& column);

private:
    std::wstring q(const std::wstring& name) const { return m_quote ? m_quote(name) : name; }

    Engine m_engine = Engine::Generic;
    Quote m_quote;
};
