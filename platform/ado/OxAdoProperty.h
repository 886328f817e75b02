#pragma once

#include <functional>
#include <memory>
#include <string>

#include "platform/ado/OxAdoCollection.h"
#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// A named value of an object's dynamic properties. Writing it may reach the provider
// (a column's Default, a connection's isolation level): the owner's hook runs first and a
// failure there leaves the old value.
class OX_EXPORT OxAdoProperty {
public:
    using WriteHook = std::function<void(const std::wstring& name, const OxVariant& value)>;

    OxAdoProperty(std::wstring name, OxVariant value, WriteHook hook = {})
        : m_name(std::move(name)), m_value(std::move(value)), m_hook(std::move(hook)) {}

    const std::wstring& name() const { return m_name; }
    const OxVariant& value() const { return m_value; }
    void setValue(const OxVariant& value);
    // Sets the value without the hook (the owner's own bookkeeping).
    void store(const OxVariant& value) { m_value = value; }
    void setHook(WriteHook hook) { m_hook = std::move(hook); }

private:
    std::wstring m_name;
    OxVariant m_value;
    WriteHook m_hook;
};

class OX_EXPORT OxAdoProperties : public OxAdoCollection<OxAdoProperty> {
public:
    // Adds the property, or replaces the value of one of that name.
    std::shared_ptr<OxAdoProperty> add(const std::wstring& name, const OxVariant& value,
                                       OxAdoProperty::WriteHook hook = {});
    // The value, or empty when there is no such property.
    OxVariant valueOf(const std::wstring& name) const;
    void clear() { m_items.clear(); }
};
