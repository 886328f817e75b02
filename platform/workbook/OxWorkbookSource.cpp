#include "platform/workbook/OxWorkbookSource.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cerrno>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OxWorkbookSource::~OxWorkbookSource() {
    if (m_fd >= 0)
        ::close(m_fd);
}

bool OxWorkbookSource::openFile(const std::wstring& path, OxWorkbookError& error) {
    m_path = path;
    const int fd = ::open(OxText::toUtf8(path).c_str(), O_RDONLY | O_CLOEXEC);
    struct stat st {};
    if (fd < 0 || ::fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        const int err = errno;
        if (fd >= 0)
            ::close(fd);
        error = OxWorkbookError(OxWorkbookError::Io,
                                oxFormat(L"cannot open %s: %s", path,
                                         fd >= 0 ? "not a regular file" : std::strerror(err)));
        return false;
    }
    m_fd = fd;
    m_size = static_cast<uint64_t>(st.st_size);
    return true;
}

void OxWorkbookSource::openMemory(std::string data) {
    m_data = std::move(data);
    m_size = m_data.size();
    m_path = L"(memory)";
}

bool OxWorkbookSource::read(uint64_t offset, void* out, size_t len) const {
    if (offset > m_size || len > m_size - offset)
        return false;
    if (m_fd < 0) {
        std::memcpy(out, m_data.data() + offset, len);
        return true;
    }
    auto* p = static_cast<char*>(out);
    while (len > 0) {
        const ssize_t n = ::pread(m_fd, p, len, static_cast<off_t>(offset));
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return false;
        p += n;
        len -= static_cast<size_t>(n);
        offset += static_cast<uint64_t>(n);
    }
    return true;
}
