#include "platform/workbook/OxXlsxWriter.h"

#include <charconv>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace {
constexpr const char* kMain = "http://schemas.openxmlformats.org/spreadsheetml/2006/main";
constexpr const char* kRel = "http://schemas.openxmlformats.org/officeDocument/2006/relationships";
constexpr const char* kHeader = "<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"yes\"?>\n";
constexpr size_t kFlush = 1 << 16;

void appendHex4(std::string& out, uint32_t v) {
    static const char* hex = "0123456789ABCDEF";
    out += "_x";
    for (int s = 12; s >= 0; s -= 4) out.push_back(hex[(v >> s) & 0xF]);
    out.push_back('_');
}

bool isEscapeAt(const std::wstring& s, size_t i) {
    if (i + 6 >= s.size() || s[i] != L'_' || s[i + 1] != L'x' || s[i + 6] != L'_')
        return false;
    for (size_t k = 2; k < 6; ++k)
        if (!std::iswxdigit(static_cast<wint_t>(s[i + k])))
            return false;
    return true;
}

// Text as XML character data. Characters XML cannot carry become _xHHHH_, and a literal
// "_xHHHH_" in the text is protected as _x005F_xHHHH_ so that it reads back unchanged.
void appendText(std::string& out, const std::wstring& s, bool attribute) {
    for (size_t i = 0; i < s.size(); ++i) {
        const uint32_t c = static_cast<uint32_t>(s[i]);
        switch (c) {
            case '&':
                out += "&amp;";
                continue;
            case '<':
                out += "&lt;";
                continue;
            case '>':
                out += "&gt;";
                continue;
            case '"':
                if (attribute) {
                    out += "&quot;";
                    continue;
                }
                break;
            case '_':
                if (!attribute && isEscapeAt(s, i)) {
                    out += "_x005F_";
                    continue;
                }
                break;
            default:
                break;
        }
        if ((c < 0x20 && c != '\t' && c != '\n') || c == '\r' || c == 0xFFFE || c == 0xFFFF ||
            (c >= 0xD800 && c <= 0xDFFF)) {
            if (attribute)
                out += "&#xFFFD;";
            else
                appendHex4(out, c);
            continue;
        }
        if (c < 0x80) {
            out.push_back(static_cast<char>(c));
        } else {
            wchar_t one = s[i];
            OxText::appendUtf8(out, std::wstring_view(&one, 1));
        }
    }
}

void appendCellRef(std::string& out, uint32_t col, uint32_t row) {
    char letters[4];
    int n = 0;
    for (uint32_t c = col + 1; c > 0; c = (c - 1) / 26)
        letters[n++] = static_cast<char>('A' + (c - 1) % 26);
    while (n > 0) out.push_back(letters[--n]);
    char buf[16];
    auto r = std::to_chars(buf, buf + sizeof buf, row + 1);
    out.append(buf, r.ptr);
}

void appendNumber(std::string& out, double v) {
    char buf[32];
    auto r = std::to_chars(buf, buf + sizeof buf, v);
    out.append(buf, r.ptr);
}

std::string utf8(const std::wstring& s) {
    std::string out;
    appendText(out, s, true);
    return out;
}
}  // namespace

OxXlsxWriter::OxXlsxWriter() : OxWorkbookWriter(1048576, 16384) {}

OxXlsxWriter::~OxXlsxWriter() {
    doAbandon();
}

void OxXlsxWriter::doAbandon() noexcept {
    m_zip.reset();
    m_out.discard();
}

void OxXlsxWriter::doCreate(const std::wstring& path) {
    m_out.create(path);
    m_zip = std::make_unique<OxZipWriter>(m_out);
    m_xml.reserve(kFlush * 2);
}

void OxXlsxWriter::flushXml(bool force) {
    if (force || m_xml.size() >= kFlush) {
        m_zip->write(m_xml);
        m_xml.clear();
    }
}

void OxXlsxWriter::doAddSheet(const std::wstring&, OxWorkbookSheetInfo::Visibility) {
    finishSheet();
    const size_t n = m_sheets.size() + 1;
    m_zip->beginEntry("xl/worksheets/sheet" + std::to_string(n) + ".xml");
    m_xml += kHeader;
    m_xml += "<worksheet xmlns=\"";
    m_xml += kMain;
    m_xml += "\" xmlns:r=\"";
    m_xml += kRel;
    m_xml += "\"><sheetFormatPr defaultRowHeight=\"15\"/><sheetData>";
    m_sheetOpen = true;
}

void OxXlsxWriter::doWriteRow(const OxWorkbookRow& row) {
    bool any = false;
    for (const OxWorkbookCell& c : row.cells) {
        if (c.type == OxWorkbookCell::Empty)
            continue;
        if (!any) {
            m_xml += "<row r=\"";
            char buf[16];
            auto r = std::to_chars(buf, buf + sizeof buf, row.index + 1);
            m_xml.append(buf, r.ptr);
            m_xml += "\">";
            any = true;
        }
        m_xml += "<c r=\"";
        appendCellRef(m_xml, c.column, row.index);
        switch (c.type) {
            case OxWorkbookCell::Number:
                m_xml += "\"><v>";
                appendNumber(m_xml, c.number);
                m_xml += "</v></c>";
                break;
            case OxWorkbookCell::Date: {
                double platform = 0;
                const bool date =
                    OxWorkbookCell::workbookToPlatformSerial(c.number, false, platform);
                m_xml += date ? "\" s=\"1\"><v>" : "\"><v>";
                appendNumber(m_xml, c.number);
                m_xml += "</v></c>";
                break;
            }
            case OxWorkbookCell::Text: {
                const bool preserve =
                    !c.text.empty() && (std::iswspace(static_cast<wint_t>(c.text.front())) ||
                                        std::iswspace(static_cast<wint_t>(c.text.back())));
                m_xml += preserve ? "\" t=\"inlineStr\"><is><t xml:space=\"preserve\">"
                                  : "\" t=\"inlineStr\"><is><t>";
                appendText(m_xml, c.text, false);
                m_xml += "</t></is></c>";
                break;
            }
            case OxWorkbookCell::Boolean:
                m_xml += c.boolean() ? "\" t=\"b\"><v>1</v></c>" : "\" t=\"b\"><v>0</v></c>";
                break;
            case OxWorkbookCell::Error:
                m_xml += "\" t=\"e\"><v>";
                m_xml += OxText::toUtf8(OxWorkbookCell::errorText(c.errorCode()));
                m_xml += "</v></c>";
                break;
            case OxWorkbookCell::Empty:
                break;
        }
    }
    if (any)
        m_xml += "</row>";
    flushXml(false);
}

void OxXlsxWriter::finishSheet() {
    if (!m_sheetOpen)
        return;
    m_xml +=
        "</sheetData><pageMargins left=\"0.7\" right=\"0.7\" top=\"0.75\" bottom=\"0.75\" "
        "header=\"0.3\" footer=\"0.3\"/></worksheet>";
    flushXml(true);
    m_zip->endEntry();
    m_sheetOpen = false;
}

void OxXlsxWriter::doCommit() {
    finishSheet();
    const size_t n = m_sheets.size();

    std::string wb = kHeader;
    wb += "<workbook xmlns=\"";
    wb += kMain;
    wb += "\" xmlns:r=\"";
    wb += kRel;
    wb += "\"><workbookPr/><bookViews><workbookView activeTab=\"" + std::to_string(activeSheet()) +
          "\"/></bookViews><sheets>";
    for (size_t i = 0; i < n; ++i) {
        wb += "<sheet name=\"" + utf8(m_sheets[i].name) + "\" sheetId=\"" + std::to_string(i + 1) +
              "\"";
        if (m_sheets[i].visibility == OxWorkbookSheetInfo::Hidden)
            wb += " state=\"hidden\"";
        else if (m_sheets[i].visibility == OxWorkbookSheetInfo::VeryHidden)
            wb += " state=\"veryHidden\"";
        wb += " r:id=\"rId" + std::to_string(i + 1) + "\"/>";
    }
    wb += "</sheets></workbook>";
    m_zip->addEntry("xl/workbook.xml", wb);

    std::string rels = kHeader;
    rels +=
        "<Relationships xmlns=\"http://schemas.openxmlformats.org/package/2006/relationships\">";
    for (size_t i = 0; i < n; ++i)
        rels += "<Relationship Id=\"rId" + std::to_string(i + 1) + "\" Type=\"" + kRel +
                "/worksheet\" Target=\"worksheets/sheet" + std::to_string(i + 1) + ".xml\"/>";
    rels += "<Relationship Id=\"rId" + std::to_string(n + 1) + "\" Type=\"" + kRel +
            "/styles\" Target=\"styles.xml\"/></Relationships>";
    m_zip->addEntry("xl/_rels/workbook.xml.rels", rels);

    std::string styles = kHeader;
    styles += "<styleSheet xmlns=\"";
    styles += kMain;
    styles +=
        "\"><numFmts count=\"1\"><numFmt numFmtId=\"164\" formatCode=\"yyyy-mm-dd hh:mm:ss\"/>"
        "</numFmts><fonts count=\"1\"><font><sz val=\"11\"/><name val=\"Calibri\"/>"
        "<family val=\"2\"/></font></fonts><fills count=\"2\"><fill><patternFill "
        "patternType=\"none\"/></fill><fill><patternFill patternType=\"gray125\"/></fill>"
        "</fills><borders count=\"1\"><border><left/><right/><top/><bottom/><diagonal/>"
        "</border></borders><cellStyleXfs count=\"1\"><xf numFmtId=\"0\" fontId=\"0\" "
        "fillId=\"0\" borderId=\"0\"/></cellStyleXfs><cellXfs count=\"2\"><xf numFmtId=\"0\" "
        "fontId=\"0\" fillId=\"0\" borderId=\"0\" xfId=\"0\"/><xf numFmtId=\"164\" fontId=\"0\" "
        "fillId=\"0\" borderId=\"0\" xfId=\"0\" applyNumberFormat=\"1\"/></cellXfs>"
        "<cellStyles count=\"1\"><cellStyle name=\"Normal\" xfId=\"0\" builtinId=\"0\"/>"
        "</cellStyles><dxfs count=\"0\"/><tableStyles count=\"0\"/></styleSheet>";
    m_zip->addEntry("xl/styles.xml", styles);

    m_zip->addEntry("_rels/.rels",
                    std::string(kHeader) +
                        "<Relationships "
                        "xmlns=\"http://schemas.openxmlformats.org/package/2006/relationships\">"
                        "<Relationship Id=\"rId1\" Type=\"" +
                        kRel + "/officeDocument\" Target=\"xl/workbook.xml\"/></Relationships>");

    std::string types = kHeader;
    types +=
        "<Types xmlns=\"http://schemas.openxmlformats.org/package/2006/content-types\">"
        "<Default Extension=\"rels\" "
        "ContentType=\"application/vnd.openxmlformats-package.relationships+xml\"/>"
        "<Default Extension=\"xml\" ContentType=\"application/xml\"/>"
        "<Override PartName=\"/xl/workbook.xml\" "
        "ContentType=\"application/vnd.openxmlformats-officedocument.spreadsheetml.sheet.main+"
        "xml\"/>"
        "<Override PartName=\"/xl/styles.xml\" "
        "ContentType=\"application/vnd.openxmlformats-officedocument.spreadsheetml.styles+xml\"/>";
    for (size_t i = 0; i < n; ++i)
        types += "<Override PartName=\"/xl/worksheets/sheet" + std::to_string(i + 1) +
                 ".xml\" "
                 "ContentType=\"application/"
                 "vnd.openxmlformats-officedocument.spreadsheetml.worksheet+xml\"/>";
    types += "</Types>";
    m_zip->addEntry("[Content_Types].xml", types);
    m_zip->finish();
    m_zip.reset();
    m_out.commit();
}
