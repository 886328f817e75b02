#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/workbook/OxWorkbookError.h"

// A new file written under a temporary name beside its target and renamed over the
// target only when commit() succeeds; dropped unfinished, it leaves the target untouched.
// Writes are buffered; failures throw OxWorkbookError.
class OxWorkbookOutputFile {
public:
    OxWorkbookOutputFile() = default;
    ~OxWorkbookOutputFile();
    OxWorkbookOutputFile(const OxWorkbookOutputFile&) = delete;
    OxWorkbookOutputFile& operator=(const OxWorkbookOutputFile&) = delete;

    void create(const std::wstring& target);
    void write(const void* data, size_t len);
    void write(const std::string& data) { write(data.data(), data.size()); }
    // Overwrites bytes already written (headers patched once sizes are known).
    void writeAt(uint64_t offset, const void* data, size_t len);
    uint64_t position() const { return m_written + m_buffer.size(); }
    void commit();
    void discard();

private:
    void flush();
    [[noreturn]] void fail(const wchar_t* what) const;

    int m_fd = -1;
    std::string m_temp;
    std::string m_target;
    std::wstring m_targetName;
    std::string m_buffer;
    uint64_t m_written = 0;
};
