#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/jet/OxJetSchema.h"

class OxJetPageFile;

// Reads a table definition: the chain of definition pages, its columns, indexes and the
// pointer to the map of its data pages; the stored properties fill in what the pages
// leave out (Required, DefaultValue).
class OxJetTableDefReader {
public:
    // Throws OxJetError on a page that is no table definition or breaks its bounds.
    static OxJetTableDef read(const OxJetPageFile& file, uint32_t page, const std::wstring& name,
                              uint16_t codePage);
    // Applies a property blob (as MSysObjects keeps it) to the definition.
    static void applyProperties(OxJetTableDef& def, const std::vector<uint8_t>& blob, bool jet3,
                                uint16_t codePage);
};
