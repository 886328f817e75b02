#include "WorkbookTestSupport.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstring>
#include <map>
#include <sstream>
#include <tuple>

#include "platform/core/OxText.h"
#include "platform/workbook/OxCompoundFileWriter.h"
#include "platform/workbook/OxWorkbookOutputFile.h"
#include "support/TestSupport.h"

namespace OxWorkbookTest {
Run run(const std::vector<std::string>& argv) {
    Run r;
    int pipefd[2];
    if (::pipe(pipefd) != 0)
        return r;
    const pid_t pid = ::fork();
    if (pid == 0) {
        ::dup2(pipefd[1], 1);
        const int devnull = ::open("/dev/null", O_WRONLY);
        ::dup2(devnull, 2);
        ::close(pipefd[0]);
        std::vector<char*> args;
        for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
        args.push_back(nullptr);
        ::execvp(args[0], args.data());
        ::_exit(127);
    }
    ::close(pipefd[1]);
    char buf[65536];
    ssize_t n;
    while ((n = ::read(pipefd[0], buf, sizeof buf)) > 0) r.out.append(buf, static_cast<size_t>(n));
    ::close(pipefd[0]);
    int status = 0;
    ::waitpid(pid, &status, 0);
    r.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return r;
}

namespace {
std::string unescape(const std::string& s) {
    std::string out;
    for (size_t i = 0; i < s.size(); ++i) {
        if (s[i] == '\\' && i + 1 < s.size()) {
            const char c = s[++i];
            out.push_back(c == 't' ? '\t' : c == 'n' ? '\n' : c == 'r' ? '\r' : c);
        } else {
            out.push_back(s[i]);
        }
    }
    return out;
}

std::vector<std::string> split(const std::string& line) {
    std::vector<std::string> f;
    size_t i = 0;
    for (;;) {
        const size_t t = line.find('\t', i);
        f.push_back(line.substr(i, t == std::string::npos ? std::string::npos : t - i));
        if (t == std::string::npos)
            return f;
        i = t + 1;
    }
}

std::string describe(const OxWorkbookCell& c) {
    switch (c.type) {
        case OxWorkbookCell::Empty:
            return "empty";
        case OxWorkbookCell::Number:
            return "number " + std::to_string(c.number);
        case OxWorkbookCell::Date:
            return "date " + std::to_string(c.number);
        case OxWorkbookCell::Text:
            return "text '" + OxText::toUtf8(c.text) + "'";
        case OxWorkbookCell::Boolean:
            return c.boolean() ? "TRUE" : "FALSE";
        case OxWorkbookCell::Error:
            return OxText::toUtf8(OxWorkbookCell::errorText(c.errorCode()));
    }
    return "?";
}

bool close(double a, double b, double rel) {
    return a == b || std::fabs(a - b) <= rel * std::max(std::fabs(a), std::fabs(b));
}
}  // namespace

Oracle oracle(const std::filesystem::path& file, const std::string& reader) {
    Oracle o;
    std::vector<std::string> argv{OXQEL_PYTHON3, OXQEL_WORKBOOK_ORACLE, file.string()};
    if (!reader.empty()) {
        argv.push_back("--reader");
        argv.push_back(reader);
    }
    const Run r = run(argv);
    if (r.status != 0)
        return o;
    std::istringstream in(r.out);
    std::string line;
    while (std::getline(in, line)) {
        if (line.rfind("R ", 0) == 0) {
            o.reader = line.substr(2);
            continue;
        }
        const auto f = split(line);
        if (f[0] == "S" && f.size() >= 4)
            o.sheets.emplace_back(f[2], unescape(f[3]));
        else if (f[0] == "C" && f.size() >= 6)
            o.cells.push_back({std::stoul(f[1]), static_cast<uint32_t>(std::stoul(f[2])),
                               static_cast<uint32_t>(std::stoul(f[3])), f[4][0], unescape(f[5])});
    }
    o.ok = !o.reader.empty();
    return o;
}

std::vector<std::string> compare(const std::filesystem::path& file, const Oracle& o) {
    std::vector<std::string> problems;
    OxWorkbookError error;
    auto reader = OxWorkbookReader::open(file.wstring(), error);
    if (!reader) {
        problems.push_back("our reader failed: " + OxText::toUtf8(error.message()));
        return problems;
    }
    const bool csv = o.reader == "ssconvert" || o.reader == "soffice";
    const auto& sheets = reader->info().sheets;
    // The CSV readers name no sheets (ssconvert) or name them but not in tab order.
    std::vector<size_t> ours;
    if (o.reader == "soffice") {
        for (const auto& s : o.sheets) {
            const int i = reader->findSheet(OxText::fromUtf8(s.second));
            if (i < 0)
                problems.push_back("no sheet " + s.second);
            ours.push_back(i < 0 ? 0 : static_cast<size_t>(i));
        }
    } else {
        if (!csv && o.sheets.size() != sheets.size())
            problems.push_back("sheet count " + std::to_string(sheets.size()) + " instead of " +
                               std::to_string(o.sheets.size()));
        for (size_t i = 0; i < sheets.size(); ++i) {
            ours.push_back(i);
            if (csv || i >= o.sheets.size())
                continue;
            static const char* vis[] = {"visible", "hidden", "veryhidden"};
            if (OxText::toUtf8(sheets[i].name) != o.sheets[i].second ||
                vis[sheets[i].visibility] != o.sheets[i].first)
                problems.push_back("sheet " + std::to_string(i) + " is '" +
                                   OxText::toUtf8(sheets[i].name) + "' " +
                                   vis[sheets[i].visibility] + ", not '" + o.sheets[i].second +
                                   "' " + o.sheets[i].first);
        }
    }
    std::map<std::tuple<size_t, uint32_t, uint32_t>, OxWorkbookCell> cells;
    for (size_t k = 0; k < ours.size(); ++k) {
        reader->beginSheet(ours[k]);
        OxWorkbookRow row;
        while (reader->nextRow(row))
            for (auto& c : row.cells) cells[{k, row.index, c.column}] = c;
        if (reader->error())
            problems.push_back("sheet " + std::to_string(k) + ": " +
                               OxText::toUtf8(reader->error().message()));
    }
    const bool d1904 = reader->info().date1904;
    for (const OracleCell& oc : o.cells) {
        const std::string where = "sheet " + std::to_string(oc.sheet) + " row " +
                                  std::to_string(oc.row) + " col " + std::to_string(oc.col);
        const auto it = cells.find({oc.sheet, oc.row, oc.col});
        if (it == cells.end()) {
            problems.push_back(where + ": missing, oracle has " + oc.kind + " '" + oc.value + "'");
            continue;
        }
        const OxWorkbookCell c = it->second;
        cells.erase(it);
        bool same = false;
        switch (oc.kind) {
            case 's':
                same = c.type == OxWorkbookCell::Text && OxText::toUtf8(c.text) == oc.value;
                break;
            case 'n':
                same = c.type == OxWorkbookCell::Number &&
                       c.number == std::strtod(oc.value.c_str(), nullptr);
                break;
            case 'd':
                same = c.type == OxWorkbookCell::Date &&
                       std::fabs(c.toDateTime(d1904).serial() -
                                 std::strtod(oc.value.c_str(), nullptr)) < 2e-6;
                break;
            case 'b':
                same = c.type == OxWorkbookCell::Boolean && c.boolean() == (oc.value == "1");
                break;
            case 'e':
                same = c.type == OxWorkbookCell::Error &&
                       OxText::toUtf8(OxWorkbookCell::errorText(c.errorCode())) == oc.value;
                break;
            case 't':
                if (c.type == OxWorkbookCell::Text) {
                    same = OxText::toUtf8(c.text) == oc.value;
                } else if (c.type == OxWorkbookCell::Number) {
                    char* end = nullptr;
                    const double v = std::strtod(oc.value.c_str(), &end);
                    same = end && *end == 0 && close(v, c.number, 1e-9);
                } else if (c.type == OxWorkbookCell::Date) {
                    same = true;  // shown in the cell's own format
                } else if (c.type == OxWorkbookCell::Boolean) {
                    same = oc.value == (c.boolean() ? "TRUE" : "FALSE");
                } else if (c.type == OxWorkbookCell::Error) {
                    same = OxText::toUtf8(OxWorkbookCell::errorText(c.errorCode())) == oc.value;
                }
                break;
        }
        if (!same)
            problems.push_back(where + ": " + describe(c) + ", oracle has " + oc.kind + " '" +
                               oc.value + "'");
    }
    for (const auto& [pos, c] : cells) {
        // CSV shows an empty text as nothing at all.
        if (csv && c.type == OxWorkbookCell::Text && c.text.empty())
            continue;
        problems.push_back("sheet " + std::to_string(std::get<0>(pos)) + " row " +
                           std::to_string(std::get<1>(pos)) + " col " +
                           std::to_string(std::get<2>(pos)) + ": " + describe(c) +
                           " that the oracle does not have");
    }
    return problems;
}

std::string le16(uint32_t v) {
    return std::string{static_cast<char>(v & 0xFF), static_cast<char>((v >> 8) & 0xFF)};
}
std::string le32(uint32_t v) {
    return le16(v & 0xFFFF) + le16(v >> 16);
}
std::string record(uint16_t type, const std::string& data) {
    return le16(type) + le16(static_cast<uint32_t>(data.size())) + data;
}

std::string compoundFile(const std::string& stream, const std::wstring& name) {
    OxTest::TempDir dir;
    const auto path = dir.file("cfb.bin");
    OxWorkbookOutputFile out;
    out.create(path.wstring());
    OxCompoundFileWriter::write(out, name, stream.size(), [&] { out.write(stream); });
    out.commit();
    return OxTest::readFile(path);
}
}  // namespace OxWorkbookTest
