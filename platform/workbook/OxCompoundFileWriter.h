#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "platform/workbook/OxWorkbookOutputFile.h"

// Writes a compound file (512-byte sectors) holding one stream below the root. The
// stream's bytes go out in one piece right after the header; a stream under 4096 bytes
// lives in the mini stream, as readers insist.
class OxCompoundFileWriter {
public:
    // produce must write exactly size bytes to out.
    static void write(OxWorkbookOutputFile& out, const std::wstring& streamName, uint64_t size,
                      const std::function<void()>& produce);
};
