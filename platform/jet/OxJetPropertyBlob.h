#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/jet/OxJetSchema.h"

// The stored properties of an object and of its columns (Required, DefaultValue, Format,
// ...): a names block, then one block of values per object, each value as text.
class OxJetPropertyBlob {
public:
    struct Block {
        std::wstring objectName;  // empty or the object's own name for the object itself
        bool isColumn = false;
        OxJetProperties values;
    };

    // Throws OxJetError on a malformed blob. jet3 blobs keep names and text in the code page.
    static std::vector<Block> parse(const std::vector<uint8_t>& blob, bool jet3, uint16_t codePage);
};
