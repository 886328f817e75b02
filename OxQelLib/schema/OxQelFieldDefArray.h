#pragma once

#include <string>
#include <vector>

#include "OxQelLib/schema/OxQelFieldDef.h"

// The columns of a table or a result, in order, with a mask that readers copy into each
// definition they add.
class OX_EXPORT OxQelFieldDefArray : public std::vector<OxQelFieldDef> {
public:
    OxQelFieldDefArray() = default;
    // A copy takes the elements and the own mask; its mask pointer starts null.
    OxQelFieldDefArray(const OxQelFieldDefArray& other);
    OxQelFieldDefArray& operator=(const OxQelFieldDefArray& other);
    OxQelFieldDefArray(OxQelFieldDefArray&&) noexcept = default;
    OxQelFieldDefArray& operator=(OxQelFieldDefArray&&) noexcept = default;
    virtual ~OxQelFieldDefArray() = default;

    // Index of the first column named so (case-insensitive), or -1.
    int getIndex(const std::wstring& name) const;
    // A copy of that column, or a default definition (type Unknown) when there is none.
    OxQelFieldDef getByFieldName(const std::wstring& name) const;

    const bool* getIsPropertiesToGetPtr() const { return m_propertiesToGet; }
    void setIsPropertiesToGetPtr(const bool* mask) { m_propertiesToGet = mask; }
    // The array's own mask storage, for a mask that lives as long as the array.
    bool* getOwnMask() { return m_ownMask; }

private:
    const bool* m_propertiesToGet = nullptr;
    bool m_ownMask[6] = {false, false, false, false, false, false};
};
