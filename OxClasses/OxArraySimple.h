#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include "OxClasses/OxListJoin.h"

// Orders wide strings by code point, the order of an OxArraySimple<StringCompare>.
struct StringCompare {
    bool operator()(const std::wstring& a, const std::wstring& b) const { return a < b; }
};

// An indexed array of wide strings, with the order of Compare for sort and search.
template <class Compare>
class OxArraySimple {
public:
    OxArraySimple() = default;
    OxArraySimple(std::initializer_list<std::wstring> items) : m_items(items) {}

    size_t getCount() const { return m_items.size(); }
    bool isEmpty() const { return m_items.empty(); }
    const std::wstring& getAt(size_t index) const { return m_items.at(index); }
    const std::wstring& operator[](size_t index) const { return m_items.at(index); }
    void setAt(size_t index, std::wstring value) { m_items.at(index) = std::move(value); }
    size_t add(std::wstring value) {
        m_items.push_back(std::move(value));
        return m_items.size() - 1;
    }
    void removeAt(size_t index) {
        m_items.erase(m_items.begin() + static_cast<std::ptrdiff_t>(index));
    }
    void removeAll() { m_items.clear(); }

    void sort() { std::stable_sort(m_items.begin(), m_items.end(), Compare{}); }
    // Index of the first element equal to value under Compare, or -1.
    long find(const std::wstring& value) const {
        const Compare less;
        for (size_t i = 0; i < m_items.size(); ++i)
            if (!less(m_items[i], value) && !less(value, m_items[i]))
                return static_cast<long>(i);
        return -1;
    }

    // The elements joined as by OxArray2::getListValuesInString.
    std::wstring getListValuesInString(std::wstring_view separator, int chunkSize,
                                       std::wstring_view chunkSeparator) const {
        return oxJoinList(
            m_items.size(), [this](size_t i) -> const std::wstring& { return m_items[i]; },
            separator, chunkSize, chunkSeparator);
    }

    auto begin() const { return m_items.begin(); }
    auto end() const { return m_items.end(); }

private:
    std::vector<std::wstring> m_items;
};
