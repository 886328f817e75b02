// "oxqel dump" for workbooks: lists sheets, prints one sheet as CSV or JSON, and writes a
// workbook from CSV files (--write). The CSV it prints reads back through --write with the
// same values: texts that would read as another type are quoted, and quoted fields are
// always texts.
#include <charconv>
#include <cmath>
#include <cstdio>
#include <fstream>
#include <sstream>

#include "OxqelCommand.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookReader.h"
#include "platform/workbook/OxWorkbookWriter.h"

namespace {
std::string utf8(const std::wstring& s) {
    return OxText::toUtf8(s);
}

std::string numberText(double v) {
    if (std::isnan(v))
        return "NaN";
    if (std::isinf(v))
        return v > 0 ? "Infinity" : "-Infinity";
    char buf[32];
    auto r = std::to_chars(buf, buf + sizeof buf, v);
    return std::string(buf, r.ptr);
}

// A CSV field without quotes read as a typed value; false when it is plain text.
bool typedField(const std::string& f, OxWorkbookCell& cell) {
    if (f.empty()) {
        cell.type = OxWorkbookCell::Empty;
        return true;
    }
    if (f == "TRUE" || f == "FALSE") {
        cell = OxWorkbookCell::makeBoolean(cell.column, f == "TRUE");
        return true;
    }
    uint8_t code = 0;
    if (f[0] == '#' && OxWorkbookCell::errorFromText(OxText::fromUtf8(f), code)) {
        cell = OxWorkbookCell::makeError(cell.column, code);
        return true;
    }
    if (f.find_first_not_of("0123456789+-.eE") == std::string::npos) {
        double v = 0;
        const char* b = f.data() + (f[0] == '+' ? 1 : 0);
        auto r = std::from_chars(b, f.data() + f.size(), v);
        if (r.ec == std::errc() && r.ptr == f.data() + f.size() && std::isfinite(v)) {
            cell = OxWorkbookCell::makeNumber(cell.column, v);
            return true;
        }
    }
    double platform = 0, serial = 0;
    if ((f.size() >= 8 && f[2] == ':') || (f.size() >= 10 && f[4] == '-')) {
        if (OxWorkbookCell::parseIsoDate(f, platform)) {
            if (OxWorkbookCell::platformToWorkbookSerial(platform, false, serial))
                cell = OxWorkbookCell::makeDate(cell.column, serial);
            else
                cell = OxWorkbookCell::makeNumber(cell.column, platform);
            return true;
        }
    }
    return false;
}

std::string csvText(const std::wstring& text) {
    const std::string s = utf8(text);
    OxWorkbookCell probe;
    const bool quote = s.empty() || s.find_first_of(",\"\r\n") != std::string::npos ||
                       s.front() == ' ' || s.back() == ' ' || typedField(s, probe);
    if (!quote)
        return s;
    std::string q = "\"";
    for (char c : s) {
        q.push_back(c);
        if (c == '"')
            q.push_back('"');
    }
    return q + "\"";
}

std::string jsonText(const std::string& s) {
    std::string q = "\"";
    for (unsigned char c : s) {
        if (c == '"' || c == '\\') {
            q.push_back('\\');
            q.push_back(static_cast<char>(c));
        } else if (c < 0x20) {
            char buf[8];
            std::snprintf(buf, sizeof buf, "\\u%04x", c);
            q += buf;
        } else {
            q.push_back(static_cast<char>(c));
        }
    }
    return q + "\"";
}

std::string dateText(const OxWorkbookCell& c, bool date1904) {
    double platform = 0;
    if (!OxWorkbookCell::workbookToPlatformSerial(c.number, date1904, platform))
        return numberText(c.number);
    return OxWorkbookCell::formatIsoDate(platform, !date1904 && c.number < 1);
}

std::string cellText(const OxWorkbookCell& c, bool date1904, bool json) {
    switch (c.type) {
        case OxWorkbookCell::Empty:
            return json ? "null" : "";
        case OxWorkbookCell::Number:
            return json && !std::isfinite(c.number) ? jsonText(numberText(c.number))
                                                    : numberText(c.number);
        case OxWorkbookCell::Date:
            return json ? jsonText(dateText(c, date1904)) : dateText(c, date1904);
        case OxWorkbookCell::Text:
            return json ? jsonText(utf8(c.text)) : csvText(c.text);
        case OxWorkbookCell::Boolean:
            return json ? (c.boolean() ? "true" : "false") : (c.boolean() ? "TRUE" : "FALSE");
        case OxWorkbookCell::Error: {
            const std::string e = utf8(OxWorkbookCell::errorText(c.errorCode()));
            return json ? jsonText(e) : e;
        }
    }
    return {};
}

const char* visibilityText(OxWorkbookSheetInfo::Visibility v) {
    return v == OxWorkbookSheetInfo::Hidden       ? "hidden"
           : v == OxWorkbookSheetInfo::VeryHidden ? "veryhidden"
                                                  : "visible";
}

int failWith(const OxWorkbookError& e) {
    return oxqelFail(utf8(e.message()));
}

int printSheet(OxWorkbookReader& r, size_t index, bool json) {
    uint32_t rows = 0, cols = 0;
    if (!r.sheetExtent(index, rows, cols))
        return failWith(r.error());
    const bool d1904 = r.info().date1904;
    std::string out;
    if (json)
        out = "{\"sheet\":" + jsonText(utf8(r.info().sheets[index].name)) +
              ",\"columns\":" + std::to_string(cols) + ",\"rows\":[";
    OxWorkbookRow row;
    uint32_t next = 0;
    auto emit = [&](const OxWorkbookRow* rw) {
        std::string line = json ? (next ? ",[" : "[") : "";
        size_t k = 0;
        for (uint32_t c = 0; c < cols; ++c) {
            if (c)
                line += ',';
            if (rw && k < rw->cells.size() && rw->cells[k].column == c)
                line += cellText(rw->cells[k++], d1904, json);
            else if (json)
                line += "null";
        }
        line += json ? "]" : "\n";
        out += line;
        ++next;
        if (out.size() > (1 << 16)) {
            std::fwrite(out.data(), 1, out.size(), stdout);
            out.clear();
        }
    };
    if (!r.beginSheet(index))
        return failWith(r.error());
    while (r.nextRow(row)) {
        while (next < row.index) emit(nullptr);
        if (next == row.index)
            emit(&row);
    }
    if (r.error())
        return failWith(r.error());
    if (json)
        out += "]}\n";
    std::fwrite(out.data(), 1, out.size(), stdout);
    return 0;
}

int runRead(const OxqelArgs& in) {
    OxqelArgs args = in;
    const bool json = oxqelTakeFlag(args, "--json");
    oxqelTakeFlag(args, "--csv");
    if (oxqelTakeFlag(args, "--schema"))
        return oxqelFail("dump: --schema is for databases; a workbook sheet has no schema");
    OxWorkbookError error;
    auto r = OxWorkbookReader::open(OxText::fromUtf8(args[0]), error);
    if (!r)
        return failWith(error);
    if (args.size() < 2) {
        std::printf("sheet\tvisibility\trows\tcolumns\n");
        for (size_t i = 0; i < r->sheetCount(); ++i) {
            uint32_t rows = 0, cols = 0;
            if (!r->sheetExtent(i, rows, cols))
                return failWith(r->error());
            std::printf("%s\t%s\t%u\t%u\n", utf8(r->info().sheets[i].name).c_str(),
                        visibilityText(r->info().sheets[i].visibility), rows, cols);
        }
        return 0;
    }
    const int index = r->findSheet(OxText::fromUtf8(args[1]));
    if (index < 0)
        return oxqelFail("dump: " + args[0] + " has no sheet named " + args[1]);
    return printSheet(*r, static_cast<size_t>(index), json);
}

// RFC 4180 records: quoted fields may hold separators, quotes ("") and line breaks.
bool readCsv(const std::string& data, std::vector<std::vector<std::pair<std::string, bool>>>& rows,
             std::string& error) {
    size_t i = data.compare(0, 3, "\xEF\xBB\xBF") == 0 ? 3 : 0;
    std::vector<std::pair<std::string, bool>> row;
    std::string field;
    bool quoted = false, any = false;
    while (i < data.size()) {
        const char c = data[i];
        if (c == '"' && field.empty() && !quoted) {
            quoted = true;
            ++i;
            for (;;) {
                if (i >= data.size()) {
                    error = "a quoted field is not closed";
                    return false;
                }
                if (data[i] == '"') {
                    if (i + 1 < data.size() && data[i + 1] == '"') {
                        field.push_back('"');
                        i += 2;
                        continue;
                    }
                    ++i;
                    break;
                }
                field.push_back(data[i++]);
            }
            any = true;
            continue;
        }
        if (c == ',') {
            row.emplace_back(std::move(field), quoted);
            field.clear();
            quoted = false;
            any = true;
            ++i;
            continue;
        }
        if (c == '\r' || c == '\n') {
            if (any || !field.empty())
                row.emplace_back(std::move(field), quoted);
            rows.push_back(std::move(row));
            row.clear();
            field.clear();
            quoted = false;
            any = false;
            i += (c == '\r' && i + 1 < data.size() && data[i + 1] == '\n') ? 2 : 1;
            continue;
        }
        if (quoted) {
            error = "text follows a closing quote";
            return false;
        }
        field.push_back(c);
        any = true;
        ++i;
    }
    if (any || !field.empty()) {
        row.emplace_back(std::move(field), quoted);
        rows.push_back(std::move(row));
    }
    return true;
}

int runWrite(const OxqelArgs& args) {
    if (args.size() < 3)
        return oxqelFail(
            "dump --write: usage: oxqel dump --write OUT.xls|OUT.xlsx [SHEET=]IN.csv ...");
    const std::wstring out = OxText::fromUtf8(args[1]);
    OxWorkbookInfo::Format format;
    if (!OxWorkbookWriter::formatFromPath(out, format))
        return oxqelFail("dump --write: the output must end in .xls or .xlsx: " + args[1]);
    OxWorkbookError error;
    auto w = OxWorkbookWriter::create(out, format, error);
    if (!w)
        return failWith(error);
    for (size_t a = 2; a < args.size(); ++a) {
        std::string spec = args[a], name, path = spec;
        const size_t eq = spec.find('=');
        if (eq != std::string::npos) {
            name = spec.substr(0, eq);
            path = spec.substr(eq + 1);
        } else {
            const size_t slash = path.rfind('/');
            name = path.substr(slash == std::string::npos ? 0 : slash + 1);
            const size_t dot = name.rfind('.');
            if (dot != std::string::npos && dot > 0)
                name.resize(dot);
        }
        std::ifstream in(path, std::ios::binary);
        if (!in)
            return oxqelFail("dump --write: cannot read " + path);
        std::ostringstream s;
        s << in.rdbuf();
        std::vector<std::vector<std::pair<std::string, bool>>> rows;
        std::string why;
        if (!readCsv(s.str(), rows, why))
            return oxqelFail("dump --write: " + path + ": " + why);
        if (!w->addSheet(OxText::fromUtf8(name)))
            return failWith(w->error());
        OxWorkbookRow row;
        for (size_t r = 0; r < rows.size(); ++r) {
            row.index = static_cast<uint32_t>(r);
            row.cells.clear();
            for (size_t c = 0; c < rows[r].size(); ++c) {
                const auto& [text, quoted] = rows[r][c];
                OxWorkbookCell cell;
                cell.column = static_cast<uint32_t>(c);
                if (quoted || !typedField(text, cell))
                    cell = OxWorkbookCell::makeText(cell.column, OxText::fromUtf8(text));
                if (cell.type != OxWorkbookCell::Empty)
                    row.cells.push_back(std::move(cell));
            }
            if (r > UINT32_MAX - 1 || (!row.cells.empty() && !w->writeRow(row)))
                return failWith(w->error());
        }
    }
    if (!w->commit())
        return failWith(w->error());
    return 0;
}

int run(const OxqelArgs& args) {
    return args[0] == "--write" ? runWrite(args) : runRead(args);
}

bool handles(OxFileInfo::OxFileType type, const std::string& path) {
    return (type == OxFileInfo::FileMissing && path == "--write") ||
           type == OxFileInfo::FileCompound || type == OxFileInfo::FileZipPackage ||
           type == OxFileInfo::FileBiffStream;
}

const OxqelRegisterDump workbook({"workbook", handles, run});
}  // namespace
