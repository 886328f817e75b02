#pragma once

#include <cstdint>
#include <set>
#include <utility>

#include "OxQelLib/interfaces/OxQelIConnection.h"

// Copies several databases at once: one database copy per couple of connections, each on
// its own asynchronous task. The connections are not owned; each couple needs
// connections of its own, since a connection serves one thread at a time.
class OX_EXPORT OxQelImportExportMultiDatabase {
public:
    OxQelImportExportMultiDatabase() = default;
    OxQelImportExportMultiDatabase(const OxQelImportExportMultiDatabase&) = default;
    OxQelImportExportMultiDatabase& operator=(const OxQelImportExportMultiDatabase&) = default;

    // False for a null or closed connection and for a couple already added.
    bool addCoupleOfConnection(OxQelIConnection* source, OxQelIConnection* destination);
    void clearAll();
    // Waits for every started copy; the earliest failing couple's result, else NoError.
    OxQel::SQLError run();

private:
    using Couple = std::pair<OxQelIConnection*, OxQelIConnection*>;
    struct ByAddress {
        bool operator()(const Couple& a, const Couple& b) const {
            const auto key = [](const Couple& c) {
                return std::make_pair(reinterpret_cast<uintptr_t>(c.first),
                                      reinterpret_cast<uintptr_t>(c.second));
            };
            return key(a) < key(b);
        }
    };
    std::set<Couple, ByAddress> m_couples;
};
