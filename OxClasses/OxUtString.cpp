#include "OxClasses/OxUtString.h"

#include <fcntl.h>
#include <unistd.h>
#include <cerrno>

#include "platform/core/OxText.h"

std::wstring OxUtString::LPCSTR_TO_LPCTSTR(const char* text) {
    return text ? OxText::fromUtf8(text) : std::wstring();
}

bool OxUtString::writeStringArrayToUnicodeFile(const std::wstring& path,
                                               const std::vector<std::wstring>& lines,
                                               bool append) {
    if (path.empty())
        return false;
    std::string buffer;
    for (const auto& line : lines) {
        OxText::appendUtf8(buffer, line);
        if (line.empty() || line.back() != L'\n')
            buffer.push_back('\n');
    }
    const int flags = O_WRONLY | O_CREAT | O_CLOEXEC | (append ? O_APPEND : O_TRUNC);
    const int fd = ::open(OxText::toUtf8(path).c_str(), flags, 0644);
    if (fd < 0)
        return false;
    size_t done = 0;
    bool ok = true;
    while (done < buffer.size()) {
        const ssize_t n = ::write(fd, buffer.data() + done, buffer.size() - done);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0) {
            ok = false;
            break;
        }
        done += static_cast<size_t>(n);
    }
    return ::close(fd) == 0 && ok;
}
