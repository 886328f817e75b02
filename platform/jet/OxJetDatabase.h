#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/jet/OxJetPageFile.h"
#include "platform/jet/OxJetRowCursor.h"
#include "platform/jet/OxJetSchema.h"

struct OxJetOpenOptions {
    // The code page of Jet 3 text; 0 takes the one the file names. Files written on a
    // system with another code page than they claim need it set (936 for GBK).
    uint16_t codePage = 0;
    OxJetBadRows badRows = OxJetBadRows::Fail;
};

// An Access file (.mdb, .accdb) opened read-only: its catalog, the definitions of its
// tables and cursors over their rows. Nothing here writes to the file. The object is
// immutable once open: several threads may read definitions and run cursors at once.
class OxJetDatabase {
public:
    // The open database, or nullptr with error set: a missing file, a file that is no
    // Access database, an encrypted .accdb file, or a catalog that cannot be read.
    static std::shared_ptr<OxJetDatabase> open(const std::wstring& path,
                                               const OxJetOpenOptions& options,
                                               std::wstring& error);
    static std::shared_ptr<OxJetDatabase> openBuffer(std::vector<uint8_t> bytes,
                                                     const OxJetOpenOptions& options,
                                                     std::wstring& error);

    const OxJetHeader& header() const { return m_file->header(); }
    OxJetFormat format() const { return header().format; }
    uint16_t codePage() const { return m_codePage; }  // of Jet 3 text
    bool hasPassword() const { return !header().password.empty(); }
    // The file does not enforce its password; callers that must can compare it here.
    bool checkPassword(std::wstring_view password) const { return header().password == password; }

    // Local, system and linked tables and saved queries, in catalog order.
    const std::vector<OxJetCatalogEntry>& catalog() const { return m_catalog; }
    // Catalog rows and pages skipped as damaged (only when opened with OxJetBadRows::Skip):
    // objects that may be missing from catalog().
    uint64_t catalogSkipped() const { return m_catalogSkipped; }
    const std::wstring& catalogSkipReason() const { return m_catalogSkipReason; }
    // The entry of that name (case-insensitive), tables before queries; nullptr if none.
    const OxJetCatalogEntry* find(std::wstring_view name) const;

    // The definition of a local or system table; nullptr with error set for queries,
    // linked tables and damaged definitions.
    std::shared_ptr<const OxJetTableDef> tableDef(const OxJetCatalogEntry& entry,
                                                  std::wstring& error) const;
    std::shared_ptr<const OxJetTableDef> tableDef(std::wstring_view name,
                                                  std::wstring& error) const;

    // The relationships MSysRelationships lists (none when the file has no such table), in
    // its order; false with error set when the table cannot be read.
    bool relationships(std::vector<OxJetRelationship>& out, std::wstring& error) const;

    // A cursor over the table's rows (errors surface from its next()); nullptr for no table.
    std::unique_ptr<OxJetRowCursor> openCursor(std::shared_ptr<const OxJetTableDef> table) const;

private:
    static std::shared_ptr<OxJetDatabase> finishOpen(std::shared_ptr<OxJetPageFile> file,
                                                     const OxJetOpenOptions& options);
    void readCatalog();
    void readProperties(std::shared_ptr<const OxJetTableDef> catalog, int id, int props);

    std::shared_ptr<OxJetPageFile> m_file;
    OxJetOpenOptions m_options;
    uint16_t m_codePage = 0;
    std::vector<OxJetCatalogEntry> m_catalog;
    uint64_t m_catalogSkipped = 0;
    std::wstring m_catalogSkipReason;
};
