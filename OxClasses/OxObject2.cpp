#include "OxClasses/OxObject2.h"

OX_IMPLEMENT_DYNAMIC(OxObject2, OxObject)

OxObject2::OxObject2(std::vector<std::wstring> properties) : m_properties(std::move(properties)) {}

std::wstring OxObject2::getStringValue(short propertyIndex) const {
    if (propertyIndex < 0 || static_cast<size_t>(propertyIndex) >= m_properties.size())
        return {};
    return m_properties[static_cast<size_t>(propertyIndex)];
}

void OxObject2::setStringValue(short propertyIndex, std::wstring value) {
    if (propertyIndex < 0)
        return;
    if (static_cast<size_t>(propertyIndex) >= m_properties.size())
        m_properties.resize(static_cast<size_t>(propertyIndex) + 1);
    m_properties[static_cast<size_t>(propertyIndex)] = std::move(value);
}

void OxObject2::copyFrom(const OxObject& other) {
    OxObject::copyFrom(other);
    if (const OxObject2* o = cast(&other))
        m_properties = o->m_properties;
}

OxObject* OxObject2::clone() const {
    return new OxObject2(*this);
}
