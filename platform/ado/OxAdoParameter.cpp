#include "platform/ado/OxAdoParameter.h"

void OxAdoParameters::append(const std::shared_ptr<OxAdoParameter>& parameter) {
    if (!parameter)
        OxAdo::raise(OxAdo::adErrInvalidArgument);
    for (const auto& p : m_items)
        if (p == parameter ||
            (!parameter->name().empty() && OxText::equalsNoCase(p->name(), parameter->name())))
            OxAdo::raise(OxAdo::adErrObjectInCollection);
    if (parameter->direction() != OxAdo::adParamInput)
        OxAdo::raise(OxAdo::adErrInvalidParamInfo,
                     OxAdo::descriptionOf(OxAdo::adErrInvalidParamInfo) +
                         L" (only input parameters are supported)");
    m_items.push_back(parameter);
}

void OxAdoParameters::remove(const OxVariant& index) {
    const auto p = item(index);
    std::erase(m_items, p);
}
