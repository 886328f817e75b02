#include "platform/workbook/OxXlsxReader.h"

#include <expat.h>
#include <zip.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstring>
#include <exception>
#include <functional>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookNumberFormat.h"

namespace {
constexpr size_t kChunk = 1 << 16;
constexpr size_t kMaxSmallPart = 256u << 20;  // workbook, rels, styles
constexpr size_t kMaxText = 64u << 20;        // one cell's text, in bytes
constexpr size_t kMaxStrings = 1024u << 20;   // all shared strings, in UTF-8 bytes
constexpr int kMaxDepth = 256;
constexpr size_t kMaxRowText = 64u << 20;  // characters in one row
constexpr uint32_t kMaxRows = 1048576;
constexpr uint32_t kMaxColumns = 16384;

[[noreturn]] void corrupt(const std::wstring& what) {
    OxWorkbookError::raise(OxWorkbookError::Corrupt, L"damaged .xlsx workbook: " + what);
}

const char* localName(const char* name) {
    const char* sep = std::strrchr(name, '\x01');
    return sep ? sep + 1 : name;
}

bool is(const char* name, const char* local) {
    return std::strcmp(localName(name), local) == 0;
}

// The value of an attribute by local name; a namespace fragment, when given, must
// appear in the attribute's namespace.
const char* attr(const char** atts, const char* local, const char* nsPart = nullptr) {
    for (size_t i = 0; atts[i]; i += 2) {
        const char* name = atts[i];
        const char* sep = std::strrchr(name, '\x01');
        const char* l = sep ? sep + 1 : name;
        if (std::strcmp(l, local) != 0)
            continue;
        if (nsPart) {
            if (!sep || std::string(name, sep).find(nsPart) == std::string::npos)
                continue;
        } else if (sep) {
            continue;
        }
        return atts[i + 1];
    }
    return nullptr;
}

bool parseUnsigned(const char* s, uint64_t& out) {
    if (!s)
        return false;
    const char* end = s + std::strlen(s);
    while (s < end && *s == ' ') ++s;
    while (end > s && end[-1] == ' ') --end;
    auto r = std::from_chars(s, end, out);
    return r.ec == std::errc() && r.ptr == end && s != end;
}

bool parseDouble(std::string_view s, double& out) {
    while (!s.empty() &&
           (s.front() == ' ' || s.front() == '\t' || s.front() == '\n' || s.front() == '\r'))
        s.remove_prefix(1);
    while (!s.empty() &&
           (s.back() == ' ' || s.back() == '\t' || s.back() == '\n' || s.back() == '\r'))
        s.remove_suffix(1);
    if (!s.empty() && s.front() == '+')
        s.remove_prefix(1);
    auto r = std::from_chars(s.data(), s.data() + s.size(), out);
    return r.ec == std::errc() && r.ptr == s.data() + s.size() && !s.empty();
}

int hexValue(wchar_t c) {
    if (c >= L'0' && c <= L'9')
        return c - L'0';
    if (c >= L'a' && c <= L'f')
        return c - L'a' + 10;
    if (c >= L'A' && c <= L'F')
        return c - L'A' + 10;
    return -1;
}

// Text of the format ("ABC_x000D_" is "ABC\r"); _xHHHH_ pairs of surrogates join.
void decodeEscapes(std::wstring& s) {
    if (s.find(L"_x") == std::wstring::npos)
        return;
    std::wstring out;
    out.reserve(s.size());
    for (size_t i = 0; i < s.size(); ++i) {
        if (s[i] == L'_' && i + 6 < s.size() && s[i + 1] == L'x' && s[i + 6] == L'_') {
            int v = 0;
            bool ok = true;
            for (size_t k = 2; k < 6; ++k) {
                const int h = hexValue(s[i + k]);
                ok = ok && h >= 0;
                v = v * 16 + (h < 0 ? 0 : h);
            }
            if (ok) {
                if (v >= 0xDC00 && v <= 0xDFFF && !out.empty() && out.back() >= 0xD800 &&
                    out.back() <= 0xDBFF)
                    out.back() = static_cast<wchar_t>(0x10000 + ((out.back() - 0xD800) << 10) +
                                                      (v - 0xDC00));
                else
                    out.push_back(static_cast<wchar_t>(v));
                i += 6;
                continue;
            }
        }
        out.push_back(s[i]);
    }
    for (wchar_t& c : out)
        if (c >= 0xD800 && c <= 0xDFFF)
            c = 0xFFFD;  // half a pair left alone
    s.swap(out);
}

// Pulls a part through expat in chunks, rejecting document type declarations (no entity
// expansion from a hostile file).
class XmlParser {
public:
    using Start = std::function<void(const char*, const char**)>;
    using End = std::function<void(const char*)>;
    using Text = std::function<void(const char*, int)>;

    XmlParser(Start start, End end, Text text)
        : m_start(std::move(start)), m_end(std::move(end)), m_text(std::move(text)) {
        m_parser = XML_ParserCreateNS(nullptr, '\x01');
        if (!m_parser)
            throw std::bad_alloc();
        XML_SetUserData(m_parser, this);
        XML_SetElementHandler(
            m_parser,
            [](void* u, const XML_Char* n, const XML_Char** a) {
                auto* self = static_cast<XmlParser*>(u);
                self->guard([&] {
                    // Workbook parts nest a few levels; a deep pile is an attack on memory.
                    if (++self->m_depth > kMaxDepth)
                        corrupt(L"XML elements are nested too deeply");
                    self->m_start(n, a);
                });
            },
            [](void* u, const XML_Char* n) {
                auto* self = static_cast<XmlParser*>(u);
                self->guard([&] {
                    --self->m_depth;
                    self->m_end(n);
                });
            });
        XML_SetCharacterDataHandler(m_parser, [](void* u, const XML_Char* s, int len) {
            auto* self = static_cast<XmlParser*>(u);
            self->guard([&] { self->m_text(s, len); });
        });
        XML_SetStartDoctypeDeclHandler(
            m_parser, [](void* u, const XML_Char*, const XML_Char*, const XML_Char*, int) {
                auto* self = static_cast<XmlParser*>(u);
                self->m_doctype = true;
                XML_StopParser(self->m_parser, XML_FALSE);
            });
    }
    ~XmlParser() { XML_ParserFree(m_parser); }
    XmlParser(const XmlParser&) = delete;
    XmlParser& operator=(const XmlParser&) = delete;

    void feed(const char* data, size_t len, bool last, const std::string& part) {
        const XML_Status status = XML_Parse(m_parser, data, static_cast<int>(len), last ? 1 : 0);
        if (m_failure)
            std::rethrow_exception(m_failure);
        if (status != XML_STATUS_OK) {
            if (m_doctype)
                corrupt(
                    oxFormat(L"%s declares a document type, which a workbook never does", part));
            corrupt(oxFormat(L"%s is not well-formed XML (line %d: %s)", part,
                             static_cast<long>(XML_GetCurrentLineNumber(m_parser)),
                             XML_ErrorString(XML_GetErrorCode(m_parser))));
        }
    }

private:
    // Exceptions must not cross expat's C frames: the handler's failure stops the parser
    // and is thrown again once XML_Parse has returned.
    template <class F>
    void guard(F&& f) {
        if (m_failure)
            return;
        try {
            f();
        } catch (...) {
            m_failure = std::current_exception();
            XML_StopParser(m_parser, XML_FALSE);
        }
    }

    XML_Parser m_parser;
    std::exception_ptr m_failure;
    int m_depth = 0;
    Start m_start;
    End m_end;
    Text m_text;
    bool m_doctype = false;
};

void appendText(std::string& buf, const char* s, int len) {
    if (buf.size() + static_cast<size_t>(len) > kMaxText)
        OxWorkbookError::raise(OxWorkbookError::Limit, L"a text in the workbook is too long");
    buf.append(s, static_cast<size_t>(len));
}

std::string dirOf(const std::string& part) {
    const size_t slash = part.rfind('/');
    return slash == std::string::npos ? std::string() : part.substr(0, slash + 1);
}

// A relationship target made into a part name: absolute or relative, '\' as '/'.
std::string resolve(const std::string& base, std::string target) {
    std::replace(target.begin(), target.end(), '\\', '/');
    std::string path = !target.empty() && target[0] == '/' ? target.substr(1) : base + target;
    std::vector<std::string> parts;
    size_t i = 0;
    while (i <= path.size()) {
        size_t j = path.find('/', i);
        if (j == std::string::npos)
            j = path.size();
        const std::string seg = path.substr(i, j - i);
        if (seg == "..") {
            if (!parts.empty())
                parts.pop_back();
        } else if (!seg.empty() && seg != ".") {
            parts.push_back(seg);
        }
        i = j + 1;
    }
    std::string out;
    for (const auto& p : parts) out += (out.empty() ? "" : "/") + p;
    return out;
}

bool endsWith(const std::string& s, const char* suffix) {
    const size_t n = std::strlen(suffix);
    return s.size() >= n && s.compare(s.size() - n, n, suffix) == 0;
}

// "BC12" into column 54 and row 11; false when it is no cell reference.
bool parseRef(const char* r, uint32_t& col, uint32_t& row) {
    if (!r)
        return false;
    uint64_t c = 0;
    size_t i = 0;
    for (; r[i] && std::isalpha(static_cast<unsigned char>(r[i])); ++i) {
        c = c * 26 +
            static_cast<uint64_t>(std::toupper(static_cast<unsigned char>(r[i])) - 'A' + 1);
        if (c > kMaxColumns)
            return false;
    }
    uint64_t rw = 0;
    const bool hasRow = r[i] != 0;
    if (hasRow && !parseUnsigned(r + i, rw))
        return false;
    if (i == 0 || (hasRow && (rw == 0 || rw > kMaxRows)))
        return false;
    col = static_cast<uint32_t>(c - 1);
    row = hasRow ? static_cast<uint32_t>(rw - 1) : UINT32_MAX;
    return true;
}
}  // namespace

struct OxXlsxReader::SheetParser {
    explicit SheetParser(const Shared& shared, std::string part)
        : shared(shared),
          part(std::move(part)),
          xml([this](const char* n, const char** a) { start(n, a); },
              [this](const char* n) { end(n); },
              [this](const char* s, int len) {
                  if (capture && rphDepth == 0)
                      appendText(value, s, len);
              }) {}

    void start(const char* name, const char** atts) {
        const char* l = localName(name);
        if (!inData) {
            inData = std::strcmp(l, "sheetData") == 0;
            return;
        }
        if (std::strcmp(l, "row") == 0) {
            uint64_t r = 0;
            const char* rs = attr(atts, "r");
            if (rs && parseUnsigned(rs, r)) {
                if (r == 0 || r > kMaxRows)
                    corrupt(oxFormat(L"%s has a row number out of range (%s)", part, rs));
                rowIndex = static_cast<uint32_t>(r - 1);
            } else {
                rowIndex = haveRow ? rowIndex + 1 : 0;
            }
            haveRow = true;
            nextCol = 0;
            current.index = rowIndex;
            current.cells.clear();
            sorted = true;
            rowText = 0;
        } else if (std::strcmp(l, "c") == 0) {
            uint32_t col = 0, row = 0;
            if (parseRef(attr(atts, "r"), col, row)) {
                cellCol = col;
            } else {
                if (nextCol >= kMaxColumns)
                    corrupt(oxFormat(L"%s has too many cells in a row", part));
                cellCol = nextCol;
            }
            const char* t = attr(atts, "t");
            cellType = t ? t : "n";
            uint64_t s = 0;
            cellStyle = parseUnsigned(attr(atts, "s"), s) ? s : 0;
            value.clear();
            inCell = true;
            hasValue = false;
        } else if (inCell && std::strcmp(l, "v") == 0) {
            capture = true;
            hasValue = true;
        } else if (inCell && std::strcmp(l, "is") == 0) {
            inInline = true;
            hasValue = true;
        } else if (inInline && std::strcmp(l, "rPh") == 0) {
            ++rphDepth;
        } else if (inInline && std::strcmp(l, "t") == 0) {
            capture = true;
        }
    }

    void end(const char* name) {
        const char* l = localName(name);
        if (!inData)
            return;
        if (std::strcmp(l, "v") == 0 || std::strcmp(l, "t") == 0) {
            capture = false;
        } else if (std::strcmp(l, "rPh") == 0 && rphDepth > 0) {
            --rphDepth;
        } else if (std::strcmp(l, "is") == 0) {
            inInline = false;
        } else if (std::strcmp(l, "c") == 0) {
            finishCell();
            inCell = false;
            nextCol = cellCol + 1;
        } else if (std::strcmp(l, "row") == 0) {
            if (!current.cells.empty()) {
                if (!sorted) {
                    std::stable_sort(current.cells.begin(), current.cells.end(),
                                     [](const OxWorkbookCell& a, const OxWorkbookCell& b) {
                                         return a.column < b.column;
                                     });
                    auto last = std::unique(current.cells.rbegin(), current.cells.rend(),
                                            [](const OxWorkbookCell& a, const OxWorkbookCell& b) {
                                                return a.column == b.column;
                                            });
                    current.cells.erase(current.cells.begin(), last.base());
                }
                ready.push_back(std::move(current));
                current = OxWorkbookRow{};
            }
        } else if (std::strcmp(l, "sheetData") == 0) {
            inData = false;
        }
    }

    std::wstring cellName() const {
        std::wstring letters;
        for (uint32_t c = cellCol + 1; c > 0; c = (c - 1) / 26)
            letters.insert(letters.begin(), static_cast<wchar_t>(L'A' + (c - 1) % 26));
        return letters + std::to_wstring(rowIndex + 1);
    }

    void finishCell() {
        if (!hasValue)
            return;  // formatted but empty
        OxWorkbookCell cell;
        cell.column = cellCol;
        const std::string& t = cellType;
        if (t == "s") {
            uint64_t i = 0;
            const size_t count = shared.starts.size() - 1;
            if (!parseUnsigned(value.c_str(), i) || i >= count)
                corrupt(oxFormat(L"cell %s of %s refers to string %s, past the %d shared strings",
                                 cellName(), part, value, count));
            cell.type = OxWorkbookCell::Text;
            OxText::appendFromUtf8(
                cell.text, std::string_view(shared.pool)
                               .substr(shared.starts[i], shared.starts[i + 1] - shared.starts[i]));
        } else if (t == "str" || t == "inlineStr") {
            cell.type = OxWorkbookCell::Text;
            OxText::appendFromUtf8(cell.text, value);
            decodeEscapes(cell.text);
        } else if (t == "b") {
            double v = 0;
            cell = OxWorkbookCell::makeBoolean(
                cellCol, value == "true" || (parseDouble(value, v) && v != 0));
        } else if (t == "e") {
            uint8_t code = OxWorkbookCell::ErrNA;
            OxWorkbookCell::errorFromText(OxText::fromUtf8(value), code);
            cell = OxWorkbookCell::makeError(cellCol, code);
        } else if (t == "d") {
            double platform = 0, serial = 0;
            if (value.empty())
                return;
            if (!OxWorkbookCell::parseIsoDate(value, platform))
                corrupt(oxFormat(L"cell %s of %s holds no ISO 8601 date (%s)", cellName(), part,
                                 value));
            if (OxWorkbookCell::platformToWorkbookSerial(platform, shared.date1904, serial))
                cell = OxWorkbookCell::makeDate(cellCol, serial);
            else
                cell = OxWorkbookCell::makeNumber(cellCol, platform);
        } else {
            double v = 0;
            if (value.find_first_not_of(" \t\r\n") == std::string::npos)
                return;
            if (!parseDouble(value, v))
                corrupt(oxFormat(L"cell %s of %s holds no number (%s)", cellName(), part, value));
            cell = OxWorkbookCell::makeNumber(cellCol, v);
            double platform = 0;
            if (cellStyle < shared.xfIsDate.size() && shared.xfIsDate[cellStyle] &&
                OxWorkbookCell::workbookToPlatformSerial(v, shared.date1904, platform))
                cell.type = OxWorkbookCell::Date;
        }
        if (!haveRow)
            corrupt(oxFormat(L"%s has a cell outside any row", part));
        if (!current.cells.empty() && current.cells.back().column >= cell.column)
            sorted = false;
        // A compressed part can hold a huge row: bound what one row may take.
        rowText += cell.text.size();
        if (current.cells.size() >= 4 * kMaxColumns || rowText > kMaxRowText)
            OxWorkbookError::raise(OxWorkbookError::Limit,
                                   oxFormat(L"row %d of %s holds more cells or text than "
                                            L"this reader takes in one row",
                                            static_cast<unsigned long long>(rowIndex) + 1, part));
        current.cells.push_back(std::move(cell));
    }

    const Shared& shared;
    std::string part;
    XmlParser xml;
    std::deque<OxWorkbookRow> ready;
    OxWorkbookRow current;
    bool inData = false, inCell = false, inInline = false, capture = false, hasValue = false;
    bool haveRow = false, sorted = true;
    int rphDepth = 0;
    uint32_t rowIndex = 0, nextCol = 0, cellCol = 0;
    uint64_t cellStyle = 0;
    size_t rowText = 0;
    std::string cellType;
    std::string value;
    bool done = false;
};

OxXlsxReader::OxXlsxReader(std::unique_ptr<OxWorkbookSource> source) : m_source(std::move(source)) {
    m_info.format = OxWorkbookInfo::Xlsx;
}

OxXlsxReader::~OxXlsxReader() {
    closeSheet();
    if (m_zip)
        zip_discard(m_zip);
}

void OxXlsxReader::closeSheet() {
    m_parser.reset();
    if (m_file) {
        zip_fclose(m_file);
        m_file = nullptr;
    }
}

std::string OxXlsxReader::partKey(const std::string& name) const {
    std::string key = name;
    std::replace(key.begin(), key.end(), '\\', '/');
    while (!key.empty() && key[0] == '/') key.erase(0, 1);
    for (char& c : key) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return key;
}

bool OxXlsxReader::hasPart(const std::string& name) const {
    return m_parts.count(partKey(name)) != 0;
}

std::string OxXlsxReader::readPart(const std::string& name, size_t limit) const {
    const auto it = m_parts.find(partKey(name));
    if (it == m_parts.end())
        corrupt(oxFormat(L"the package has no part %s", name));
    zip_file* f = zip_fopen_index(m_zip, it->second, 0);
    if (!f)
        corrupt(oxFormat(L"cannot open part %s: %s", name, zip_strerror(m_zip)));
    std::string out;
    char buf[kChunk];
    for (;;) {
        const zip_int64_t n = zip_fread(f, buf, sizeof buf);
        if (n < 0) {
            zip_fclose(f);
            corrupt(oxFormat(L"cannot read part %s (damaged compression)", name));
        }
        if (n == 0)
            break;
        if (out.size() + static_cast<size_t>(n) > limit) {
            zip_fclose(f);
            OxWorkbookError::raise(OxWorkbookError::Limit,
                                   oxFormat(L"part %s of the workbook is too large", name));
        }
        out.append(buf, static_cast<size_t>(n));
    }
    zip_fclose(f);
    return out;
}

std::map<std::string, OxXlsxReader::Rel> OxXlsxReader::readRels(const std::string& part) const {
    std::map<std::string, Rel> rels;
    const std::string base = dirOf(part);
    std::string relsName = base + "_rels/" + part.substr(base.size()) + ".rels";
    if (!hasPart(relsName))
        return rels;
    const std::string xml = readPart(relsName, kMaxSmallPart);
    XmlParser p(
        [&](const char* n, const char** a) {
            if (!is(n, "Relationship"))
                return;
            const char* id = attr(a, "Id");
            const char* type = attr(a, "Type");
            const char* target = attr(a, "Target");
            const char* mode = attr(a, "TargetMode");
            if (id && type && target && !(mode && std::strcmp(mode, "External") == 0))
                rels[id] = Rel{type, resolve(base, target)};
        },
        [](const char*) {}, [](const char*, int) {});
    p.feed(xml.data(), xml.size(), true, relsName);
    return rels;
}

void OxXlsxReader::doOpen() {
    zip_error_t zerr;
    zip_error_init(&zerr);
    zip_source_t* src = nullptr;
    if (m_source->isMemory())
        src = zip_source_buffer_create(m_source->memory().data(), m_source->memory().size(), 0,
                                       &zerr);
    else
        src = zip_source_file_create(OxText::toUtf8(m_source->path()).c_str(), 0, -1, &zerr);
    if (src)
        m_zip = zip_open_from_source(src, ZIP_RDONLY, &zerr);
    if (!m_zip) {
        if (src)
            zip_source_free(src);
        const std::wstring why = OxText::fromUtf8(zip_error_strerror(&zerr));
        zip_error_fini(&zerr);
        corrupt(L"the zip container cannot be read: " + why);
    }
    zip_error_fini(&zerr);

    const zip_int64_t count = zip_get_num_entries(m_zip, 0);
    for (zip_int64_t i = 0; i < count; ++i) {
        const char* name = zip_get_name(m_zip, static_cast<zip_uint64_t>(i), ZIP_FL_ENC_RAW);
        if (name)
            m_parts.emplace(partKey(name), static_cast<uint64_t>(i));
    }

    std::string workbookPart;
    for (const auto& [id, rel] : readRels(""))
        if (endsWith(rel.type, "/officeDocument"))
            workbookPart = rel.target;
    if (workbookPart.empty() || !hasPart(workbookPart))
        workbookPart = "xl/workbook.xml";
    if (!hasPart(workbookPart))
        OxWorkbookError::raise(OxWorkbookError::Unsupported,
                               L"the zip package holds no workbook part (not an .xlsx file)");
    const auto rels = readRels(workbookPart);

    // Sheets, names and the date system.
    struct SheetRef {
        OxWorkbookSheetInfo info;
        std::string rid;
    };
    std::vector<SheetRef> sheets;
    std::vector<std::string> sheetOrder;
    {
        const std::string xml = readPart(workbookPart, kMaxSmallPart);
        OxWorkbookDefinedName pending;
        bool inName = false;
        std::string nameText;
        XmlParser p(
            [&](const char* n, const char** a) {
                const char* l = localName(n);
                if (std::strcmp(l, "workbookPr") == 0) {
                    const char* d = attr(a, "date1904");
                    m_info.date1904 =
                        d && (std::strcmp(d, "1") == 0 || std::strcmp(d, "true") == 0);
                } else if (std::strcmp(l, "sheet") == 0) {
                    SheetRef s;
                    s.info.name = OxText::fromUtf8(attr(a, "name") ? attr(a, "name") : "");
                    const char* state = attr(a, "state");
                    if (state && std::strcmp(state, "hidden") == 0)
                        s.info.visibility = OxWorkbookSheetInfo::Hidden;
                    else if (state && std::strcmp(state, "veryHidden") == 0)
                        s.info.visibility = OxWorkbookSheetInfo::VeryHidden;
                    const char* rid = attr(a, "id", "relationships");
                    s.rid = rid ? rid : "";
                    sheets.push_back(std::move(s));
                } else if (std::strcmp(l, "definedName") == 0) {
                    inName = true;
                    nameText.clear();
                    pending = OxWorkbookDefinedName{};
                    pending.name = OxText::fromUtf8(attr(a, "name") ? attr(a, "name") : "");
                    uint64_t sheet = 0;
                    if (parseUnsigned(attr(a, "localSheetId"), sheet) && sheet < 65536)
                        pending.sheet = static_cast<int>(sheet);
                    const char* h = attr(a, "hidden");
                    pending.hidden = h && (std::strcmp(h, "1") == 0 || std::strcmp(h, "true") == 0);
                }
            },
            [&](const char* n) {
                if (inName && is(n, "definedName")) {
                    inName = false;
                    pending.formula = OxText::fromUtf8(nameText);
                    m_info.names.push_back(std::move(pending));
                }
            },
            [&](const char* s, int len) {
                if (inName)
                    appendText(nameText, s, len);
            });
        p.feed(xml.data(), xml.size(), true, workbookPart);
    }

    // localSheetId counts every sheet; worksheet indexes skip chart sheets.
    std::vector<int> tabToSheet;
    for (const SheetRef& s : sheets) {
        const auto it = rels.find(s.rid);
        const bool worksheet = it != rels.end() && endsWith(it->second.type, "/worksheet");
        tabToSheet.push_back(worksheet ? static_cast<int>(m_info.sheets.size()) : -1);
        if (!worksheet)
            continue;
        m_info.sheets.push_back(s.info);
        m_sheetParts.push_back(it->second.target);
    }
    for (auto& n : m_info.names)
        if (n.sheet >= 0)
            n.sheet = static_cast<size_t>(n.sheet) < tabToSheet.size() ? tabToSheet[n.sheet] : -1;

    std::string stylesPart, stringsPart;
    for (const auto& [id, rel] : rels) {
        if (endsWith(rel.type, "/styles"))
            stylesPart = rel.target;
        else if (endsWith(rel.type, "/sharedStrings"))
            stringsPart = rel.target;
    }
    m_shared.date1904 = m_info.date1904;

    if (!stylesPart.empty() && hasPart(stylesPart)) {
        const std::string xml = readPart(stylesPart, kMaxSmallPart);
        std::map<uint64_t, std::wstring> codes;
        std::vector<uint64_t> xfFormats;
        bool inCellXfs = false;
        XmlParser p(
            [&](const char* n, const char** a) {
                const char* l = localName(n);
                uint64_t id = 0;
                if (std::strcmp(l, "numFmt") == 0 && parseUnsigned(attr(a, "numFmtId"), id)) {
                    codes[id] =
                        OxText::fromUtf8(attr(a, "formatCode") ? attr(a, "formatCode") : "");
                } else if (std::strcmp(l, "cellXfs") == 0) {
                    inCellXfs = true;
                } else if (inCellXfs && std::strcmp(l, "xf") == 0) {
                    xfFormats.push_back(parseUnsigned(attr(a, "numFmtId"), id) ? id : 0);
                }
            },
            [&](const char* n) {
                if (is(n, "cellXfs"))
                    inCellXfs = false;
            },
            [](const char*, int) {});
        p.feed(xml.data(), xml.size(), true, stylesPart);
        for (uint64_t id : xfFormats) {
            const auto c = codes.find(id);
            m_shared.xfIsDate.push_back(
                c != codes.end()
                    ? OxWorkbookNumberFormat::isDateCode(c->second)
                    : id < 164 && OxWorkbookNumberFormat::isBuiltinDate(static_cast<uint32_t>(id)));
        }
    }

    if (!stringsPart.empty() && hasPart(stringsPart)) {
        const auto it = m_parts.find(partKey(stringsPart));
        zip_file* f = zip_fopen_index(m_zip, it->second, 0);
        if (!f)
            corrupt(oxFormat(L"cannot open part %s", stringsPart));
        std::string text;
        bool inSi = false, capture = false;
        int rph = 0;
        std::wstring item;
        XmlParser p(
            [&](const char* n, const char**) {
                const char* l = localName(n);
                if (std::strcmp(l, "si") == 0) {
                    inSi = true;
                    text.clear();
                } else if (inSi && std::strcmp(l, "rPh") == 0) {
                    ++rph;
                } else if (inSi && std::strcmp(l, "t") == 0) {
                    capture = rph == 0;
                }
            },
            [&](const char* n) {
                const char* l = localName(n);
                if (std::strcmp(l, "t") == 0) {
                    capture = false;
                } else if (std::strcmp(l, "rPh") == 0 && rph > 0) {
                    --rph;
                } else if (std::strcmp(l, "si") == 0 && inSi) {
                    inSi = false;
                    item.clear();
                    OxText::appendFromUtf8(item, text);
                    decodeEscapes(item);
                    if (m_shared.pool.size() + item.size() > kMaxStrings)
                        OxWorkbookError::raise(OxWorkbookError::Limit,
                                               L"the workbook's shared strings are too large");
                    OxText::appendUtf8(m_shared.pool, item);
                    m_shared.starts.push_back(m_shared.pool.size());
                }
            },
            [&](const char* s, int len) {
                if (capture)
                    appendText(text, s, len);
            });
        std::string buf(kChunk, '\0');
        try {
            for (;;) {
                const zip_int64_t n = zip_fread(f, buf.data(), buf.size());
                if (n < 0)
                    corrupt(oxFormat(L"cannot read part %s (damaged compression)", stringsPart));
                p.feed(buf.data(), static_cast<size_t>(n), n == 0, stringsPart);
                if (n == 0)
                    break;
            }
        } catch (...) {
            zip_fclose(f);
            throw;
        }
        zip_fclose(f);
    }
}

void OxXlsxReader::doBeginSheet(size_t index) {
    closeSheet();
    const std::string& part = m_sheetParts[index];
    const auto it = m_parts.find(partKey(part));
    if (it == m_parts.end())
        corrupt(oxFormat(L"the part %s of sheet %s is missing", part, m_info.sheets[index].name));
    m_file = zip_fopen_index(m_zip, it->second, 0);
    if (!m_file)
        corrupt(oxFormat(L"cannot open part %s", part));
    m_parser = std::make_unique<SheetParser>(m_shared, part);
}

bool OxXlsxReader::doNextRow(OxWorkbookRow& row) {
    if (!m_parser)
        return false;
    std::string buf;
    while (m_parser->ready.empty() && !m_parser->done) {
        buf.resize(kChunk);
        const zip_int64_t n = zip_fread(m_file, buf.data(), buf.size());
        if (n < 0)
            corrupt(oxFormat(L"cannot read part %s (damaged compression)", m_parser->part));
        m_parser->xml.feed(buf.data(), static_cast<size_t>(n), n == 0, m_parser->part);
        if (n == 0)
            m_parser->done = true;
    }
    if (m_parser->ready.empty()) {
        closeSheet();
        return false;
    }
    row = std::move(m_parser->ready.front());
    m_parser->ready.pop_front();
    return true;
}
