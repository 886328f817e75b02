#include "platform/ado/OxAdoProperty.h"

void OxAdoProperty::setValue(const OxVariant& value) {
    if (m_hook)
        m_hook(m_name, value);
    m_value = value;
}

std::shared_ptr<OxAdoProperty> OxAdoProperties::add(const std::wstring& name,
                                                    const OxVariant& value,
                                                    OxAdoProperty::WriteHook hook) {
    if (auto existing = find(name)) {
        existing->store(value);
        if (hook)
            existing->setHook(std::move(hook));
        return existing;
    }
    auto p = std::make_shared<OxAdoProperty>(name, value, std::move(hook));
    m_items.push_back(p);
    return p;
}

OxVariant OxAdoProperties::valueOf(const std::wstring& name) const {
    const auto p = find(name);
    return p ? p->value() : OxVariant();
}
