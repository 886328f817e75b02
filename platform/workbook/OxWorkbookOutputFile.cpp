#include "platform/workbook/OxWorkbookOutputFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace {
constexpr size_t kBuffer = 1 << 18;
}

OxWorkbookOutputFile::~OxWorkbookOutputFile() {
    discard();
}

void OxWorkbookOutputFile::fail(const wchar_t* what) const {
    const int err = errno;
    OxWorkbookError::raise(OxWorkbookError::Io,
                           oxFormat(L"cannot %s %s: %s", what, m_targetName, std::strerror(err)));
}

void OxWorkbookOutputFile::create(const std::wstring& target) {
    discard();
    m_targetName = target;
    m_target = OxText::toUtf8(target);
    const size_t slash = m_target.rfind('/');
    const std::string dir =
        slash == std::string::npos ? std::string() : m_target.substr(0, slash + 1);
    const std::string base = slash == std::string::npos ? m_target : m_target.substr(slash + 1);
    m_temp = dir + "." + base + ".tmp-XXXXXX";
    m_fd = ::mkostemp(m_temp.data(), O_CLOEXEC);
    if (m_fd < 0) {
        m_temp.clear();
        fail(L"create");
    }
    // mkstemp makes the file private; give it the mode a new file (or the old one) has.
    struct stat st {};
    mode_t mode = 0;
    if (::stat(m_target.c_str(), &st) == 0) {
        mode = st.st_mode & 07777;
    } else {
        const mode_t mask = ::umask(0);
        ::umask(mask);
        mode = 0666 & ~mask;
    }
    if (::fchmod(m_fd, mode) != 0)
        fail(L"create");
    m_buffer.reserve(kBuffer);
    m_written = 0;
}

void OxWorkbookOutputFile::flush() {
    const char* p = m_buffer.data();
    size_t left = m_buffer.size();
    while (left > 0) {
        const ssize_t n = ::write(m_fd, p, left);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            fail(L"write");
        p += n;
        left -= static_cast<size_t>(n);
    }
    m_written += m_buffer.size();
    m_buffer.clear();
}

void OxWorkbookOutputFile::write(const void* data, size_t len) {
    if (m_fd < 0)
        OxWorkbookError::raise(OxWorkbookError::Io, L"the workbook file is not open");
    if (m_buffer.size() + len > kBuffer)
        flush();
    if (len >= kBuffer) {
        m_buffer.assign(static_cast<const char*>(data), len);
        flush();
        return;
    }
    m_buffer.append(static_cast<const char*>(data), len);
}

void OxWorkbookOutputFile::writeAt(uint64_t offset, const void* data, size_t len) {
    flush();
    const char* p = static_cast<const char*>(data);
    while (len > 0) {
        const ssize_t n = ::pwrite(m_fd, p, len, static_cast<off_t>(offset));
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            fail(L"write");
        p += n;
        len -= static_cast<size_t>(n);
        offset += static_cast<uint64_t>(n);
    }
}

void OxWorkbookOutputFile::commit() {
    flush();
    if (::fsync(m_fd) != 0)
        fail(L"write");
    const int fd = m_fd;
    m_fd = -1;
    if (::close(fd) != 0)
        fail(L"write");
    if (::rename(m_temp.c_str(), m_target.c_str()) != 0) {
        const int err = errno;
        ::unlink(m_temp.c_str());
        m_temp.clear();
        errno = err;
        fail(L"replace");
    }
    m_temp.clear();
}

void OxWorkbookOutputFile::discard() {
    if (m_fd >= 0) {
        ::close(m_fd);
        m_fd = -1;
    }
    if (!m_temp.empty()) {
        ::unlink(m_temp.c_str());
        m_temp.clear();
    }
    m_buffer.clear();
}
