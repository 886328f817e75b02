#include "OxClasses/OxFileInfo.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cstring>

#include "platform/core/OxText.h"

OxFileInfo::OxFileType OxFileInfo::_getFileType(const std::wstring& path) {
    if (path.empty())
        return FileMissing;
    const int fd = ::open(OxText::toUtf8(path).c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return FileMissing;
    struct stat st {};
    if (::fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        ::close(fd);
        return FileMissing;
    }
    unsigned char h[32] = {};
    const ssize_t n = ::read(fd, h, sizeof h);
    ::close(fd);
    if (n < 0)
        return FileMissing;
    if (n == 0)
        return FileEmpty;
    const size_t size = static_cast<size_t>(n);
    if (size >= 16 && std::memcmp(h, "SQLite format 3\0", 16) == 0)
        return FileSQLite3;
    if (size >= 19 && std::memcmp(h + 4, "Standard Jet DB", 15) == 0)
        return FileAccessJet;
    if (size >= 19 && std::memcmp(h + 4, "Standard ACE DB", 15) == 0)
        return FileAccessAce;
    static const unsigned char kCompound[] = {0xD0, 0xCF, 0x11, 0xE0, 0xA1, 0xB1, 0x1A, 0xE1};
    if (size >= 8 && std::memcmp(h, kCompound, 8) == 0)
        return FileCompound;
    if (size >= 4 && std::memcmp(h, "PK\x03\x04", 4) == 0)
        return FileZipPackage;
    // A BOF record (BIFF2 0x0009, BIFF3 0x0209, BIFF4 0x0409) with a plausible length.
    if (size >= 4 && (h[0] == 0x09) && (h[1] == 0x00 || h[1] == 0x02 || h[1] == 0x04) &&
        h[3] == 0 && h[2] >= 4 && h[2] <= 16)
        return FileBiffStream;
    return FileUnknown;
}
