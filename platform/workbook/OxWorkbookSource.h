#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/workbook/OxWorkbookError.h"

// The bytes of a workbook file: an open file read with pread, or a buffer in memory
// (tests and fuzzing). Reads are bounds-checked; nothing is mapped or read ahead.
class OxWorkbookSource {
public:
    OxWorkbookSource() = default;
    ~OxWorkbookSource();
    OxWorkbookSource(const OxWorkbookSource&) = delete;
    OxWorkbookSource& operator=(const OxWorkbookSource&) = delete;

    bool openFile(const std::wstring& path, OxWorkbookError& error);
    void openMemory(std::string data);

    uint64_t size() const { return m_size; }
    // Exactly len bytes at offset, or false (past the end, or a read failure).
    bool read(uint64_t offset, void* out, size_t len) const;
    const std::wstring& path() const { return m_path; }
    bool isMemory() const { return m_fd < 0; }
    const std::string& memory() const { return m_data; }

private:
    int m_fd = -1;
    uint64_t m_size = 0;
    std::string m_data;
    std::wstring m_path;
};
