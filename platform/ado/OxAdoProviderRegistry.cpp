#include "platform/ado/OxAdoProviderRegistry.h"

#include <mutex>

#include "platform/ado/OxAdoConnectionString.h"
#include "platform/core/OxText.h"
#ifdef OXQEL_ADO_HAVE_ODBC
#include "platform/ado/OxAdoOdbcSession.h"
#endif

const wchar_t* const OxAdoProviderRegistry::kOdbcProvider = L"MSDASQL";

namespace {
struct Entry {
    std::wstring name;
    OxAdoSessionFactory factory;
};

struct Registry {
    std::mutex mutex;
    std::vector<Entry> entries;

    Registry() {
#ifdef OXQEL_ADO_HAVE_ODBC
        entries.push_back({OxAdoProviderRegistry::kOdbcProvider, [](const std::wstring&) {
                               return std::unique_ptr<OxAdoSession>(new OxAdoOdbcSession());
                           }});
#endif
    }

    Entry* find(const std::wstring& name) {
        for (auto& e : entries)
            if (OxText::equalsNoCase(e.name, name))
                return &e;
        return nullptr;
    }
};

Registry& registry() {
    static Registry r;
    return r;
}
}  // namespace

void OxAdoProviderRegistry::add(const std::wstring& name, OxAdoSessionFactory factory) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    if (Entry* e = r.find(name))
        e->factory = std::move(factory);
    else
        r.entries.push_back({name, std::move(factory)});
}

void OxAdoProviderRegistry::remove(const std::wstring& name) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    std::erase_if(r.entries, [&](const Entry& e) { return OxText::equalsNoCase(e.name, name); });
}

bool OxAdoProviderRegistry::has(const std::wstring& name) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    return r.find(name) != nullptr;
}

std::vector<std::wstring> OxAdoProviderRegistry::names() {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    std::vector<std::wstring> out;
    for (const auto& e : r.entries) out.push_back(e.name);
    return out;
}

std::wstring OxAdoProviderRegistry::providerOf(const std::wstring& connectionString) {
    const OxAdoConnectionString cs(connectionString);
    const std::wstring provider = OxText::trim(cs.get(L"Provider"));
    return provider.empty() ? std::wstring(kOdbcProvider) : provider;
}

std::unique_ptr<OxAdoSession> OxAdoProviderRegistry::createSession(
    const std::wstring& connectionString) {
    const std::wstring name = providerOf(connectionString);
    OxAdoSessionFactory factory;
    {
        Registry& r = registry();
        std::lock_guard lock(r.mutex);
        Entry* e = r.find(name);
        if (!e)
            e = r.find(OxAdoConnectionString::baseProviderName(name));
        if (e)
            factory = e->factory;
    }
    std::unique_ptr<OxAdoSession> session = factory ? factory(connectionString) : nullptr;
    if (!session)
        throw OxAdoProviderError(OxAdo::hresultOf(OxAdo::adErrProviderNotFound),
                                 OxAdo::descriptionOf(OxAdo::adErrProviderNotFound));
    return session;
}
