#include "OxClasses/OxPath.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cerrno>

#include "platform/core/OxText.h"

namespace {
std::string native(const std::wstring& path) {
    return OxText::toUtf8(path);
}

bool writeAll(int fd, const char* data, size_t size) {
    while (size > 0) {
        const ssize_t n = ::write(fd, data, size);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return false;
        data += n;
        size -= static_cast<size_t>(n);
    }
    return true;
}
}  // namespace

bool OxPath::pathFileExists(const std::wstring& path) {
    struct stat st {};
    return !path.empty() && ::stat(native(path).c_str(), &st) == 0 && S_ISREG(st.st_mode);
}

bool OxPath::deleteFile(const std::wstring& path) {
    const std::string p = native(path);
    return ::unlink(p.c_str()) == 0 || errno == ENOENT;
}

bool OxPath::copyFile(const std::wstring& source, const std::wstring& target, int failIfExists) {
    if (source.empty() || target.empty())
        return false;
    if (failIfExists && pathFileExists(target))
        return false;
    if (isSameFile(source, target))
        return false;
    const std::string src = native(source);
    const std::string dst = native(target);
    const int in = ::open(src.c_str(), O_RDONLY | O_CLOEXEC);
    if (in < 0)
        return false;
    struct stat st {};
    if (::fstat(in, &st) != 0 || !S_ISREG(st.st_mode)) {
        ::close(in);
        return false;
    }
    std::string tmp = dst + ".oxtmp-XXXXXX";
    const int out = ::mkstemp(tmp.data());
    if (out < 0) {
        ::close(in);
        return false;
    }
    bool ok = true;
    char buf[1 << 16];
    for (;;) {
        const ssize_t n = ::read(in, buf, sizeof buf);
        if (n < 0 && errno == EINTR)
            continue;
        if (n < 0)
            ok = false;
        if (n <= 0)
            break;
        if (!writeAll(out, buf, static_cast<size_t>(n))) {
            ok = false;
            break;
        }
    }
    ::close(in);
    ok = ::fchmod(out, st.st_mode & 07777) == 0 && ok;
    ok = ::fsync(out) == 0 && ok;
    ok = ::close(out) == 0 && ok;
    if (ok && failIfExists) {
        // link() refuses an existing target, where rename() would replace it.
        ok = ::link(tmp.c_str(), dst.c_str()) == 0;
    } else if (ok) {
        ok = ::rename(tmp.c_str(), dst.c_str()) == 0;
    }
    ::unlink(tmp.c_str());
    return ok;
}

std::wstring OxPath::changeFileExt(const std::wstring& path, const std::wstring& extension) {
    const size_t slash = path.find_last_of(L'/');
    const size_t dot = path.find_last_of(L'.');
    const bool hasExt =
        dot != std::wstring::npos && (slash == std::wstring::npos || dot > slash + 1);
    return (hasExt ? path.substr(0, dot) : path) + extension;
}

bool OxPath::isSameFile(const std::wstring& a, const std::wstring& b) {
    struct stat sa {
    }, sb{};
    if (::stat(native(a).c_str(), &sa) != 0 || ::stat(native(b).c_str(), &sb) != 0)
        return false;
    return sa.st_dev == sb.st_dev && sa.st_ino == sb.st_ino;
}
