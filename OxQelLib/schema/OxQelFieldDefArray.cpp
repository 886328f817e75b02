#include "OxQelLib/schema/OxQelFieldDefArray.h"

#include <algorithm>

#include "platform/core/OxText.h"

OxQelFieldDefArray::OxQelFieldDefArray(const OxQelFieldDefArray& other)
    : std::vector<OxQelFieldDef>(other) {
    std::copy(std::begin(other.m_ownMask), std::end(other.m_ownMask), m_ownMask);
}

OxQelFieldDefArray& OxQelFieldDefArray::operator=(const OxQelFieldDefArray& other) {
    if (this != &other) {
        std::vector<OxQelFieldDef>::operator=(other);
        std::copy(std::begin(other.m_ownMask), std::end(other.m_ownMask), m_ownMask);
        m_propertiesToGet = nullptr;
    }
    return *this;
}

int OxQelFieldDefArray::getIndex(const std::wstring& name) const {
    for (size_t i = 0; i < size(); ++i)
        if (OxText::equalsNoCase((*this)[i].getRefFieldName(), name))
            return static_cast<int>(i);
    return -1;
}

OxQelFieldDef OxQelFieldDefArray::getByFieldName(const std::wstring& name) const {
    const int i = getIndex(name);
    return i < 0 ? OxQelFieldDef() : (*this)[static_cast<size_t>(i)];
}
