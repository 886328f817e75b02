#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxText.h"
#include "platform/core/OxVariant.h"

// The collections of the object model: items by position (from 0) or by name (without
// case), shared by reference. A missing item raises adErrItemNotFound.
template <class T>
class OxAdoCollection {
public:
    using Ptr = std::shared_ptr<T>;

    long count() const { return static_cast<long>(m_items.size()); }
    bool empty() const { return m_items.empty(); }

    Ptr item(long index) const {
        if (index < 0 || index >= count())
            OxAdo::raise(OxAdo::adErrItemNotFound);
        return m_items[static_cast<size_t>(index)];
    }
    Ptr item(const std::wstring& name) const {
        const long i = indexOf(name);
        if (i < 0)
            OxAdo::raise(OxAdo::adErrItemNotFound);
        return m_items[static_cast<size_t>(i)];
    }
    // A number picks by position, a text by name.
    Ptr item(const OxVariant& index) const {
        if (index.vt() == VT_BSTR)
            return item(index.str());
        if (index.isEmpty() || index.isNull())
            OxAdo::raise(OxAdo::adErrItemNotFound);
        OxVariant n;
        if (OxHr::failed(index.tryChangeType(VT_I8, n)))
            OxAdo::raise(OxAdo::adErrItemNotFound);
        return item(static_cast<long>(n.llVal()));
    }
    Ptr item(const wchar_t* name) const { return item(std::wstring(name ? name : L"")); }
    Ptr item(int index) const { return item(static_cast<long>(index)); }

    // Position of the first item of that name (without case), or -1.
    long indexOf(const std::wstring& name) const {
        for (size_t i = 0; i < m_items.size(); ++i)
            if (OxText::equalsNoCase(m_items[i]->name(), name))
                return static_cast<long>(i);
        return -1;
    }
    Ptr find(const std::wstring& name) const {
        const long i = indexOf(name);
        return i < 0 ? nullptr : m_items[static_cast<size_t>(i)];
    }

    const std::vector<Ptr>& items() const { return m_items; }
    typename std::vector<Ptr>::const_iterator begin() const { return m_items.begin(); }
    typename std::vector<Ptr>::const_iterator end() const { return m_items.end(); }

protected:
    std::vector<Ptr> m_items;
};
