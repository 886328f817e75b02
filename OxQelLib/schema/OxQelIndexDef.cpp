#include "OxQelLib/schema/OxQelIndexDef.h"

bool OxQelIndexDef::getFieldNameAt(unsigned index, std::wstring& name) const {
    if (index >= m_fieldNames.size())
        return false;
    name = m_fieldNames[index];
    return true;
}

std::wstring OxQelIndexDef::getListFieldInString() const {
    std::wstring out;
    for (size_t i = 0; i < m_fieldNames.size(); ++i) {
        if (i)
            out += L',';
        out += m_fieldNames[i];
    }
    return out;
}
