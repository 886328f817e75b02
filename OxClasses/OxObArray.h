#pragma once

#include <memory>
#include <vector>

#include "OxClasses/OxObject.h"

// An array of objects that owns its elements (the platform's object array, with the
// ownership made explicit).
class OxObArray {
public:
    OxObArray() = default;
    OxObArray(OxObArray&&) noexcept = default;
    OxObArray& operator=(OxObArray&&) noexcept = default;
    OxObArray(const OxObArray& other) { copyElements(other); }
    OxObArray& operator=(const OxObArray& other) {
        if (this != &other) {
            m_elements.clear();
            copyElements(other);
        }
        return *this;
    }
    virtual ~OxObArray() = default;

    size_t getCount() const { return m_elements.size(); }
    bool isEmpty() const { return m_elements.empty(); }
    // Takes ownership of the object.
    size_t add(OxObject* object) {
        m_elements.emplace_back(object);
        return m_elements.size() - 1;
    }
    OxObject* getObjectAt(size_t index) const { return m_elements.at(index).get(); }
    void removeAt(size_t index) {
        m_elements.erase(m_elements.begin() + static_cast<std::ptrdiff_t>(index));
    }
    void removeAll() { m_elements.clear(); }

private:
    void copyElements(const OxObArray& other) {
        m_elements.reserve(other.m_elements.size());
        for (const auto& e : other.m_elements) m_elements.emplace_back(e ? e->clone() : nullptr);
    }

    std::vector<std::unique_ptr<OxObject>> m_elements;
};
