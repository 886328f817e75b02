#include "OxQelLib/odbc/OxQelODBCTerminalDialog.h"

#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <memory>

#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace {
// Restores the terminal's echo however the read ends.
class EchoOff {
public:
    explicit EchoOff(int fd) : m_fd(fd) {
        if (::tcgetattr(fd, &m_saved) == 0) {
            termios quiet = m_saved;
            quiet.c_lflag &= static_cast<tcflag_t>(~ECHO);
            // TCSANOW: an answer typed ahead must not be thrown away.
            m_active = ::tcsetattr(fd, TCSANOW, &quiet) == 0;
        }
    }
    ~EchoOff() {
        if (m_active)
            ::tcsetattr(m_fd, TCSANOW, &m_saved);
    }
    EchoOff(const EchoOff&) = delete;
    EchoOff& operator=(const EchoOff&) = delete;

private:
    int m_fd;
    termios m_saved{};
    bool m_active = false;
};

bool isKey(const std::wstring& key, std::initializer_list<const wchar_t*> names) {
    for (const wchar_t* n : names)
        if (OxText::equalsNoCase(OxText::trim(key), n))
            return true;
    return false;
}
}  // namespace

void OxQelODBCTerminalDialog::write(const std::wstring& text) {
    const std::string bytes = OxText::toUtf8(text);
    size_t done = 0;
    while (done < bytes.size()) {
        const ssize_t n = ::write(m_out, bytes.data() + done, bytes.size() - done);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return;
        done += static_cast<size_t>(n);
    }
}

bool OxQelODBCTerminalDialog::readLine(std::wstring& line) {
    // Byte by byte, so that nothing after the line is taken from the terminal.
    std::string bytes;
    bool gotLine = false;
    for (;;) {
        char c = 0;
        const ssize_t n = ::read(m_in, &c, 1);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            break;
        if (c == '\n') {
            gotLine = true;
            break;
        }
        if (c != '\r')
            bytes.push_back(c);
    }
    line = OxText::fromUtf8(bytes);
    return gotLine || !bytes.empty();
}

bool OxQelODBCTerminalDialog::ask(const std::wstring& prompt, std::wstring& answer, bool hidden) {
    // The echo goes off before the prompt shows, so no typed character is ever echoed.
    std::unique_ptr<EchoOff> quiet;
    if (hidden && ::isatty(m_in))
        quiet = std::make_unique<EchoOff>(m_in);
    write(prompt);
    const bool answered = readLine(answer);
    if (quiet)
        write(L"\n");  // the user's Enter was not echoed
    return answered;
}

std::wstring OxQelODBCTerminalDialog::run(const std::vector<DataSource>& sources,
                                          Attributes (*attributes)(const std::wstring&)) {
    if (sources.empty()) {
        write(L"No ODBC data source is configured.\n");
        return {};
    }
    write(L"ODBC data sources:\n");
    for (size_t i = 0; i < sources.size(); ++i)
        write(oxFormat(L"  %2d  %-24s %s\n", static_cast<int>(i + 1), sources[i].name,
                       sources[i].driver));
    const DataSource* chosen = nullptr;
    while (!chosen) {
        std::wstring answer;
        if (!ask(L"Data source (number or name, empty to cancel): ", answer))
            return {};
        answer = OxText::trim(answer);
        if (answer.empty())
            return {};
        for (const DataSource& s : sources)
            if (s.name == answer)
                chosen = &s;
        if (!chosen && answer.find_first_not_of(L"0123456789") == std::wstring::npos &&
            answer.size() < 6) {
            const size_t n = std::stoul(answer);
            if (n >= 1 && n <= sources.size())
                chosen = &sources[n - 1];
        }
        if (!chosen)
            write(oxFormat(L"There is no data source %s.\n", answer));
    }

    std::wstring userId;
    bool hasPassword = false;
    for (const auto& [key, value] : attributes ? attributes(chosen->name) : Attributes()) {
        if (isKey(key, {L"UID", L"USER", L"USERNAME"}))
            userId = value;
        if (isKey(key, {L"PWD", L"PASSWORD"}) && !value.empty())
            hasPassword = true;
    }
    std::wstring answer;
    const std::wstring userPrompt = userId.empty() ? std::wstring(L"User id (empty for none): ")
                                                   : oxFormat(L"User id (empty for %s): ", userId);
    if (!ask(userPrompt, answer))
        return {};
    if (!OxText::trim(answer).empty())
        userId = OxText::trim(answer);
    std::wstring password;
    if (!hasPassword && !ask(L"Password (empty for none): ", password, true))
        return {};
    std::wstring more;
    if (!ask(L"Other keys (KEY=value;..., empty for none): ", more))
        return {};
    more = OxText::trim(more);
    // The user's keys come first: the data source's name and the credentials then win.
    std::wstring host = more;
    if (!host.empty() && host.back() != L';')
        host += L';';
    host += L"DSN=" + chosen->name;
    return OxQelConnectionODBC::_composeConnectString(L"", host, userId, password);
}
