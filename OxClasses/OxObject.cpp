#include "OxClasses/OxObject.h"

OX_IMPLEMENT_DYNAMIC(OxObject, OxRuntimeObject)

OxObject::CompareResult OxObject::compareTo(const OxObject* other, int, bool descending) const {
    if (!other || !other->IsKindOf(GetRuntimeClass()))
        return NotComparable;
    return descendingCompareResult(NotComparable, descending);
}

void OxObject::copyFrom(const OxObject&) {}

OxObject* OxObject::clone() const {
    return new OxObject(*this);
}

OxObject::CompareResult OxObject::descendingCompareResult(CompareResult result, bool descending) {
    if (!descending)
        return result;
    if (result == Less)
        return Greater;
    if (result == Greater)
        return Less;
    return result;
}
