#pragma once

#include <vector>

#include "OxQelLib/interfaces/OxQelIConnection.h"
#include "OxQelLib/schema/OxQelTableDef.h"
#include "OxQelLib/transfer/OxQelProgressReactor.h"

// Copies a whole database between two connections: as a file when both are files of the
// same engine, otherwise table by table (each table its own transaction), on a pool of
// worker threads when the source can be read and the destination written from several
// threads at once. The connections and the reactor are not owned.
class OX_EXPORT OxQelImportExportDatabase {
public:
    OxQelImportExportDatabase(OxQelIConnection& source, OxQelIConnection& destination,
                              OxQelProgressReactor* reactor);

    bool isValid();
    OxQel::SQLError run();

private:
    OxQel::SQLError copyDatabaseAsFile();
    OxQel::SQLError runSingleThread();
    OxQel::SQLError runMultiThread();
    bool loadInputDatabaseDefinition();

    OxQelIConnection& m_source;
    OxQelIConnection& m_destination;
    std::vector<OxQelTableDef> m_tables;
    OxQelProgressReactor* m_reactor;
};
