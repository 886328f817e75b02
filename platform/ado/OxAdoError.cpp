#include "platform/ado/OxAdoError.h"

void OxAdoErrors::assign(const std::vector<OxAdoErrorInfo>& records) {
    m_items.clear();
    for (const auto& r : records) add(r);
}

void OxAdoErrors::add(const OxAdoErrorInfo& record) {
    m_items.push_back(std::make_shared<OxAdoError>(record));
}
