#include "OxQelLib/transfer/OxQelImportExportMultiDatabase.h"

#include <future>
#include <vector>

#include "OxQelLib/transfer/OxQelImportExportDatabase.h"

bool OxQelImportExportMultiDatabase::addCoupleOfConnection(OxQelIConnection* source,
                                                           OxQelIConnection* destination) {
    if (!source || !source->isOpen())
        return false;
    if (!destination || !destination->isOpen())
        return false;
    return m_couples.insert({source, destination}).second;
}

void OxQelImportExportMultiDatabase::clearAll() {
    m_couples.clear();
}

OxQel::SQLError OxQelImportExportMultiDatabase::run() {
    OxQel::SQLError result = OxQel::NoError;
    // Handles of std::async tasks wait for their task when released, so every started
    // copy has ended when this vector goes, on every path.
    std::vector<std::future<OxQel::SQLError>> copies;
    for (const Couple& couple : m_couples) {
        if (!couple.first || !couple.second) {
            result = OxQel::ErrorConnection;
            break;
        }
        copies.push_back(std::async(std::launch::async, [couple] {
            try {
                return OxQelImportExportDatabase(*couple.first, *couple.second, nullptr).run();
            } catch (...) {
                return OxQel::ErrorUnknown;
            }
        }));
    }
    for (auto& copy : copies) {
        const OxQel::SQLError r = copy.get();
        if (result == OxQel::NoError && r != OxQel::NoError) {
            result = r;
            break;
        }
    }
    return result;
}
