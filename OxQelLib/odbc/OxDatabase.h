#pragma once

#include "platform/odbc/OxOdbcDatabase.h"

// The ODBC database object of a connection. Not a public header: it names platform types.
class OxDatabase : public OxOdbcDatabase {
public:
    using OxOdbcDatabase::OxOdbcDatabase;
    ~OxDatabase() override;
};
