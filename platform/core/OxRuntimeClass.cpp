#include "platform/core/OxRuntimeClass.h"

bool OxRuntimeClass::IsDerivedFrom(const OxRuntimeClass* base) const {
    for (const OxRuntimeClass* c = this; c; c = c->baseClass())
        if (c == base)
            return true;
    return false;
}

const OxRuntimeClass* OxRuntimeObject::GetThisClass() {
    static const OxRuntimeClass record{"OxRuntimeObject", nullptr};
    return &record;
}

const OxRuntimeClass* OxRuntimeObject::GetRuntimeClass() const {
    return GetThisClass();
}

bool OxRuntimeObject::IsKindOf(const OxRuntimeClass* runtimeClass) const {
    return runtimeClass && GetRuntimeClass()->IsDerivedFrom(runtimeClass);
}
