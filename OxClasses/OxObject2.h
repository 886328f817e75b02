#pragma once

#include <string>
#include <vector>

#include "OxClasses/OxObject.h"

// An object whose properties can be read as text by index: the element type of the
// value lists the library turns into IN lists and temporary tables.
class OX_EXPORT OxObject2 : public OxObject {
    OX_DECLARE_DYNAMIC(OxObject2)
public:
    OxObject2() = default;
    // An object holding the given property texts, in index order.
    explicit OxObject2(std::vector<std::wstring> properties);

    // The text of the property, empty when there is no such property.
    virtual std::wstring getStringValue(short propertyIndex) const;
    void setStringValue(short propertyIndex, std::wstring value);

    void copyFrom(const OxObject& other) override;
    OxObject* clone() const override;

private:
    std::vector<std::wstring> m_properties;
};
