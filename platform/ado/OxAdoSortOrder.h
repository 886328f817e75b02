#pragma once

#include <functional>
#include <string>
#include <vector>

#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// A sort order: "field [ASC|DESC], ...".
class OX_EXPORT OxAdoSortOrder {
public:
    struct Key {
        std::wstring field;
        bool descending = false;
        int column = -1;
    };

    static OxAdoSortOrder parse(const std::wstring& text);
    bool empty() const { return m_keys.empty(); }
    const std::vector<Key>& keys() const { return m_keys; }
    void bind(const std::function<int(const std::wstring&)>& columnOf);
    // Negative, zero or positive as row a sorts before, with or after row b.
    int compare(const std::function<const OxVariant&(int column)>& a,
                const std::function<const OxVariant&(int column)>& b) const;

private:
    std::vector<Key> m_keys;
};
