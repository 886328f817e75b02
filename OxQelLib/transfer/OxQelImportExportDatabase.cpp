#include "OxQelLib/transfer/OxQelImportExportDatabase.h"

#include <cstring>
#include <future>
#include <memory>

#include "OxClasses/OxPath.h"
#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"
#include "OxQelLib/transfer/OxQelImportExportTable.h"
#include "OxQelLib/transfer/OxQelWorkerPool.h"

using OxQel::SQLError;

namespace {
// The backends whose database is one file. They are named, not linked: the copy must not
// pull in every backend to ask what a connection is.
bool isFileDatabase(const OxRuntimeClass* c) {
    for (; c; c = c->baseClass()) {
        const char* name = c->m_lpszClassName;
        if (!std::strcmp(name, "OxQelConnectionSQLite") ||
            !std::strcmp(name, "OxQelConnectionADOAccess") ||
            !std::strcmp(name, "OxQelConnectionADOExcel"))
            return true;
    }
    return false;
}

// One table over its own pair of connections, on a worker thread. Whatever goes wrong
// becomes the table's result: nothing may escape a worker.
SQLError copyOnWorker(const std::shared_ptr<OxQelIConnection>& source,
                      const std::shared_ptr<OxQelIConnection>& destination,
                      const OxQelTableDef& table) {
    if (!source || !destination)
        return OxQel::ErrorConnection;
    SQLError result;
    try {
        result = OxQelImportExportTable(*source, *destination, table).run();
    } catch (...) {
        result = OxQel::ErrorUnknown;
    }
    source->closeDatabase();
    destination->closeDatabase();
    return result;
}
}  // namespace

OxQelImportExportDatabase::OxQelImportExportDatabase(OxQelIConnection& source,
                                                     OxQelIConnection& destination,
                                                     OxQelProgressReactor* reactor)
    : m_source(source), m_destination(destination), m_reactor(reactor) {}

bool OxQelImportExportDatabase::isValid() {
    return m_source.isOpen() && m_destination.isOpen();
}

SQLError OxQelImportExportDatabase::run() {
    if (!isValid())
        return OxQel::ErrorConnection;
    const SQLError asFile = copyDatabaseAsFile();
    if (asFile != OxQel::ErrorUnspecified)
        return asFile;
    if (!loadInputDatabaseDefinition())
        return OxQel::ErrorUnknown;
    if (m_source.canReadMultithread() && m_destination.canWriteMultiThread())
        return runMultiThread();
    return runSingleThread();
}

SQLError OxQelImportExportDatabase::copyDatabaseAsFile() {
    if (m_source.GetRuntimeClass() != m_destination.GetRuntimeClass())
        return OxQel::ErrorUnspecified;
    if (!isFileDatabase(m_source.GetRuntimeClass()))
        return OxQel::ErrorUnspecified;
    const std::wstring sourcePath = m_source.getConnectionParameter().getDatabase();
    const std::wstring destinationPath = m_destination.getConnectionParameter().getDatabase();
    // Deleting the destination first would delete the source itself.
    if (sourcePath == destinationPath || OxPath::isSameFile(sourcePath, destinationPath))
        return OxQel::ErrorUnknown;
    m_destination.closeDatabase();
    // A SQLite source may hold committed data outside its main file, or change while it is
    // read: the engine's own backup gives a complete, consistent copy. Either way the
    // destination is replaced only by a finished copy.
    if (auto* sqlite = OxQelConnectionSQLite::cast(&m_source))
        return sqlite->backupDatabaseTo(destinationPath) ? OxQel::NoError : OxQel::ErrorUnknown;
    return OxPath::copyFile(sourcePath, destinationPath, 0) ? OxQel::NoError : OxQel::ErrorUnknown;
}

bool OxQelImportExportDatabase::loadInputDatabaseDefinition() {
    if (!isValid())
        return false;
    m_tables.clear();
    m_source.getTableDef(m_tables, OxQelTableDef::Table);
    for (OxQelTableDef& table : m_tables)
        if (!m_source.getFieldDef(table.getTableName(), L"*", table.getFields()))
            return false;
    return true;
}

SQLError OxQelImportExportDatabase::runSingleThread() {
    if (m_reactor)
        m_reactor->setStepCount(static_cast<int>(m_tables.size()));
    for (const OxQelTableDef& table : m_tables) {
        const SQLError result = OxQelImportExportTable(m_source, m_destination, table).run();
        if (result != OxQel::NoError)
            return result;
        if (m_reactor)
            m_reactor->advance(1);
    }
    return OxQel::NoError;
}

SQLError OxQelImportExportDatabase::runMultiThread() {
    OxQelWorkerPool pool(OxQelWorkerPool::hardwareThreads());
    if (m_reactor)
        m_reactor->setStepCount(static_cast<int>(m_tables.size()));
    std::vector<std::future<SQLError>> results;
    results.reserve(m_tables.size());
    for (const OxQelTableDef& table : m_tables) {
        std::shared_ptr<OxQelIConnection> source(m_source.createNewConnection());
        std::shared_ptr<OxQelIConnection> destination(m_destination.createNewConnection());
        results.push_back(pool.enqueue([source, destination, table](int) {
            return copyOnWorker(source, destination, table);
        }));
    }
    SQLError first = OxQel::NoError;
    for (auto& result : results) {
        first = result.get();
        if (m_reactor)
            m_reactor->advance(1);
        if (first != OxQel::NoError)
            break;
    }
    results.clear();
    pool.stop();
    return first;
}
