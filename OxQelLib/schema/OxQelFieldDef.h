#pragma once

#include <string>

#include "OxQelLib/foundation/OxQelGlobal.h"

// A column: name, type, size, default value (as SQL text), nullability and whether the
// engine fills it itself. The mask says which properties a schema reader must fetch.
class OX_EXPORT OxQelFieldDef {
public:
    enum PropertyType { Name = 0, Type = 1, Size = 2, DefaultValue = 3, NoAuto = 4, CanBeNull = 5 };
    using PropertyMask = bool[6];

    static const PropertyMask IsPropertiesToGetAll;
    static const PropertyMask IsPropertiesToGetNothing;

    OxQelFieldDef() = default;
    OxQelFieldDef(const OxQelFieldDef&) = default;
    OxQelFieldDef& operator=(const OxQelFieldDef&) = default;
    virtual ~OxQelFieldDef() = default;

    std::wstring getFieldName() const { return m_fieldName; }
    const std::wstring& getRefFieldName() const { return m_fieldName; }
    void setFieldName(const std::wstring& name) { m_fieldName = name; }
    int getFieldSize() const { return m_fieldSize; }
    void setFieldSize(int size) { m_fieldSize = size; }
    OxQel::FieldType getFieldType() const { return m_fieldType; }
    void setFieldType(OxQel::FieldType type) { m_fieldType = type; }
    const std::wstring& getDefaultValue() const { return m_defaultValue; }
    void setDefaultValue(const std::wstring& value) { m_defaultValue = value; }
    bool getCanBeNull() const { return m_canBeNull; }
    void setCanBeNull(bool canBeNull) { m_canBeNull = canBeNull; }
    bool getNoAuto() const { return m_noAuto; }
    void setNoAuto(bool noAuto) { m_noAuto = noAuto; }

    // The mask is not owned: it is one of the two constants or an array that outlives
    // the definition.
    void setIsPropertiesToGetPtr(const bool* mask) { m_propertiesToGet = mask; }
    const bool* getIsPropertiesToGetPtr() const { return m_propertiesToGet; }
    // True when no mask is set, else the mask's entry.
    bool getIsPropertyToGet(PropertyType property) const {
        return !m_propertiesToGet || m_propertiesToGet[property];
    }

private:
    int m_fieldSize = 0;
    std::wstring m_fieldName;
    std::wstring m_defaultValue;
    OxQel::FieldType m_fieldType = OxQel::Unknown;
    bool m_noAuto = false;
    bool m_canBeNull = false;
    const bool* m_propertiesToGet = nullptr;
};
