#include "OxQelLib/ado/OxQelRecordsetADOSqlServer.h"

OX_IMPLEMENT_DYNAMIC(OxQelRecordsetADOSqlServer, OxQelRecordsetADO)

OxQelRecordsetADOSqlServer::OxQelRecordsetADOSqlServer() {
    setAdoCursorType(1);  // keyset
    setAdoLockType(2);    // pessimistic
}

OxObject* OxQelRecordsetADOSqlServer::clone() const {
    auto* copy = new OxQelRecordsetADOSqlServer();
    copy->copyFrom(*this);
    return copy;
}
