#pragma once

#include "OxQelLib/ado/OxQelRecordsetADO.h"

// The recordset of the SQL Server backend: a keyset cursor with pessimistic locking.
class OX_EXPORT OxQelRecordsetADOSqlServer : public OxQelRecordsetADO {
    OX_DECLARE_DYNAMIC(OxQelRecordsetADOSqlServer)
public:
    OxQelRecordsetADOSqlServer();
    OxObject* clone() const override;
};
