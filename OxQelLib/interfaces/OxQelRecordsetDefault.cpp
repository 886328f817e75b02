#include "OxQelLib/interfaces/OxQelRecordsetDefault.h"

// Its record names the base object class as its base, as it always has: callers may
// rely on OxQelIRecordset::cast refusing it.
OX_IMPLEMENT_DYNAMIC(OxQelRecordsetDefault, OxRuntimeObject)

OxObject* OxQelRecordsetDefault::clone() const {
    return new OxQelRecordsetDefault(*this);
}
