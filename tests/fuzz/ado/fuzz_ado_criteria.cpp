// Find and Filter criteria, Sort strings and connection strings come from users: parsing,
// binding and matching must end and never crash, and a connection string written back
// must read as the same pairs.
#include <cstddef>
#include <cstdint>

#include "platform/ado/OxAdoConnectionString.h"
#include "platform/ado/OxAdoCriteria.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/ado/OxAdoSortOrder.h"
#include "platform/core/OxText.h"

namespace {
const wchar_t* const kNames[] = {L"id", L"name", L"price", L"born", L"flag", L"guid", L"data"};
const int kTypes[] = {OxAdo::adInteger,      OxAdo::adVarWChar, OxAdo::adDouble,
                      OxAdo::adDBTimeStamp,  OxAdo::adBoolean,  OxAdo::adGUID,
                      OxAdo::adLongVarBinary};

int columnOf(const std::wstring& name) {
    for (int i = 0; i < 7; ++i)
        if (OxText::equalsNoCase(name, kNames[i]))
            return i;
    return -1;
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::wstring text =
        OxText::fromUtf8(std::string_view(reinterpret_cast<const char*>(data), size));
    static const OxVariant row[] = {
        OxVariant(int32_t{7}), OxVariant(L"O'Brien"),
        OxVariant(2.5),        OxVariant::fromDate(44000.25),
        OxVariant(true),       OxVariant(L"{00000000-0000-0000-0000-000000000001}"),
        OxVariant::null()};
    try {
        OxAdoCriteria c = OxAdoCriteria::parse(text);
        c.bind(columnOf, [](int i) { return kTypes[i]; });
        (void)c.matches([](int i) -> const OxVariant& { return row[i]; });
    } catch (const OxComError&) {
        // Bad criteria are refused with the model's error: that is the expected outcome.
    }
    try {
        OxAdoSortOrder s = OxAdoSortOrder::parse(text);
        s.bind(columnOf);
        auto value = [](int i) -> const OxVariant& { return row[i]; };
        if (s.compare(value, value) != 0)
            __builtin_trap();
    } catch (const OxComError&) {
    }
    const OxAdoConnectionString cs(text);
    const OxAdoConnectionString again(cs.text());
    if (again.pairs() != cs.pairs())
        __builtin_trap();
    (void)OxAdoConnectionString::baseProviderName(cs.get(L"Provider"));
    return 0;
}
