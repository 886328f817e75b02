#pragma once

#include <cstdint>
#include <vector>

class OxJetPageFile;

// A map of pages (the data pages a table owns): a bitmap kept in a row, either inline with
// a start page or as a list of bitmap pages.
class OxJetUsageMap {
public:
    struct Pages {
        std::vector<uint32_t> pages;  // ascending, each once, all inside the file
        uint64_t pastEnd = 0;         // marked pages the file does not hold (truncated file)
    };
    // The pages the map marks. pointer is the map's row (low byte) and page (upper three
    // bytes). Throws OxJetError when the map cannot be read.
    static Pages pages(const OxJetPageFile& file, uint32_t pointer);
};
