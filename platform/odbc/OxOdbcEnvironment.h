#pragma once

#include <sql.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/odbc/OxOdbcHandle.h"

// An ODBC 3 environment. Connections hold it by shared pointer, so that several may share
// one and it outlives them all.
class OxOdbcEnvironment {
public:
    struct DataSource {
        std::wstring name;
        std::wstring driver;  // the driver the data source names (its description field)
    };
    enum class Scope { all, user, system };

    // Throws OxDBException when no environment can be had or ODBC 3 is refused.
    OxOdbcEnvironment();
    static std::shared_ptr<OxOdbcEnvironment> create();

    SQLHENV henv() const noexcept { return m_env.get(); }

    // The data sources the driver manager knows (SQLDataSources), user ones first.
    std::vector<DataSource> dataSources(Scope scope = Scope::all) const {
        return dataSources(henv(), scope);
    }
    // The same on an environment handle of the caller's.
    static std::vector<DataSource> dataSources(SQLHENV env, Scope scope);
    // The installed drivers (SQLDrivers) by name.
    std::vector<std::wstring> drivers() const;
    // The keys and values of a data source's entry in the odbc.ini files, as written there.
    static std::vector<std::pair<std::wstring, std::wstring>> dataSourceAttributes(
        const std::wstring& dataSource);

private:
    OxOdbcHandle m_env;
};
