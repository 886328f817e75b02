#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/ado/OxAdoCollection.h"
#include "platform/ado/OxAdoProvider.h"
#include "platform/core/OxExport.h"

// One provider error of the last failing call.
class OX_EXPORT OxAdoError {
public:
    explicit OxAdoError(OxAdoErrorInfo info) : m_info(std::move(info)) {}

    OxHResult number() const { return m_info.number; }
    const std::wstring& description() const { return m_info.description; }
    int32_t nativeError() const { return m_info.nativeError; }
    const std::wstring& sqlState() const { return m_info.sqlState; }
    const std::wstring& source() const { return m_info.source; }
    std::wstring name() const { return m_info.description; }

private:
    OxAdoErrorInfo m_info;
};

// The Connection's provider errors: replaced by the diagnostics of each provider call that
// fails, kept through later calls that succeed, emptied by clear().
class OX_EXPORT OxAdoErrors : public OxAdoCollection<OxAdoError> {
public:
    void clear() { m_items.clear(); }
    void assign(const std::vector<OxAdoErrorInfo>& records);
    void add(const OxAdoErrorInfo& record);
};
