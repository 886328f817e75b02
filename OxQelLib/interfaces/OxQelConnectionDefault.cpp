#include "OxQelLib/interfaces/OxQelConnectionDefault.h"

#include "OxQelLib/interfaces/OxQelRecordsetDefault.h"

OX_IMPLEMENT_DYNAMIC(OxQelConnectionDefault, OxQelIConnection)

OxObject* OxQelConnectionDefault::clone() const {
    return new OxQelConnectionDefault(*this);
}

OxQelIRecordset* OxQelConnectionDefault::createOxQelIRecordset() {
    return new OxQelRecordsetDefault();
}

bool OxQelConnectionDefault::attachTable(OxQelIConnection*, const std::wstring&,
                                         const std::wstring&) {
    return false;
}
