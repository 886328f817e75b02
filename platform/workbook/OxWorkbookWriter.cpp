#include "platform/workbook/OxWorkbookWriter.h"

#include <cmath>
#include <new>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxXlsWriter.h"
#include "platform/workbook/OxXlsxWriter.h"

namespace {
size_t utf16Length(const std::wstring& s) {
    size_t n = s.size();
    for (wchar_t c : s)
        if (static_cast<uint32_t>(c) > 0xFFFF)
            ++n;
    return n;
}

std::wstring columnName(uint32_t col) {
    std::wstring letters;
    for (uint64_t c = static_cast<uint64_t>(col) + 1; c > 0; c = (c - 1) / 26)
        letters.insert(letters.begin(), static_cast<wchar_t>(L'A' + (c - 1) % 26));
    return letters;
}
}  // namespace

OxWorkbookWriter::~OxWorkbookWriter() = default;

template <class F>
bool OxWorkbookWriter::guarded(F&& f) {
    if (m_error)
        return false;
    try {
        f();
        return true;
    } catch (const OxWorkbookError& e) {
        m_error = e;
    } catch (const std::bad_alloc&) {
        m_error = OxWorkbookError(OxWorkbookError::Limit, L"the workbook does not fit in memory");
    }
    doAbandon();
    return false;
}

std::unique_ptr<OxWorkbookWriter> OxWorkbookWriter::create(const std::wstring& path,
                                                           OxWorkbookInfo::Format format,
                                                           OxWorkbookError& error) {
    error.clear();
    std::unique_ptr<OxWorkbookWriter> w;
    if (format == OxWorkbookInfo::Xls)
        w = std::make_unique<OxXlsWriter>();
    else
        w = std::make_unique<OxXlsxWriter>();
    if (!w->guarded([&] { w->doCreate(path); })) {
        error = w->m_error;
        return nullptr;
    }
    return w;
}

bool OxWorkbookWriter::formatFromPath(const std::wstring& path, OxWorkbookInfo::Format& format) {
    const size_t dot = path.rfind(L'.');
    if (dot == std::wstring::npos)
        return false;
    const std::wstring ext = OxText::toLower(path.substr(dot));
    if (ext == L".xls")
        format = OxWorkbookInfo::Xls;
    else if (ext == L".xlsx")
        format = OxWorkbookInfo::Xlsx;
    else
        return false;
    return true;
}

bool OxWorkbookWriter::checkSheetName(const std::wstring& name,
                                      const std::vector<std::wstring>& taken,
                                      OxWorkbookError& error) {
    auto bad = [&](const std::wstring& why) {
        error = OxWorkbookError(OxWorkbookError::Invalid,
                                oxFormat(L"invalid sheet name \"%s\": %s", name, why));
        return false;
    };
    if (OxText::trim(name).empty())
        return bad(L"a sheet name cannot be empty");
    if (utf16Length(name) > 31)
        return bad(L"a sheet name has at most 31 characters");
    for (wchar_t c : name)
        if (c == L':' || c == L'\\' || c == L'/' || c == L'?' || c == L'*' || c == L'[' ||
            c == L']')
            return bad(L"a sheet name cannot hold any of : \\ / ? * [ ]");
    if (name.front() == L'\'' || name.back() == L'\'')
        return bad(L"a sheet name cannot begin or end with an apostrophe");
    for (const auto& t : taken)
        if (OxText::equalsNoCase(t, name))
            return bad(L"another sheet has that name");
    return true;
}

size_t OxWorkbookWriter::activeSheet() const {
    for (size_t i = 0; i < m_sheets.size(); ++i)
        if (m_sheets[i].visibility == OxWorkbookSheetInfo::Visible)
            return i;
    return 0;
}

bool OxWorkbookWriter::addSheet(const std::wstring& name,
                                OxWorkbookSheetInfo::Visibility visibility) {
    return guarded([&] {
        if (m_done)
            OxWorkbookError::raise(OxWorkbookError::Invalid, L"the workbook is already written");
        std::vector<std::wstring> taken;
        for (const auto& s : m_sheets) taken.push_back(s.name);
        OxWorkbookError e;
        if (!checkSheetName(name, taken, e))
            throw e;
        doAddSheet(name, visibility);
        m_sheets.push_back({name, visibility});
        m_rowWritten = false;
    });
}

void OxWorkbookWriter::check(const OxWorkbookRow& row) const {
    if (m_sheets.empty())
        OxWorkbookError::raise(OxWorkbookError::Invalid, L"rows need a sheet: add one first");
    if (row.index >= m_maxRows)
        OxWorkbookError::raise(
            OxWorkbookError::Limit,
            oxFormat(L"row %d does not fit: a sheet of this format holds at most %d rows",
                     static_cast<unsigned long long>(row.index) + 1, m_maxRows));
    if (m_rowWritten && row.index <= m_lastRow)
        OxWorkbookError::raise(OxWorkbookError::Invalid,
                               oxFormat(L"rows must be written in ascending order (row %d after "
                                        L"row %d)",
                                        static_cast<unsigned long long>(row.index) + 1,
                                        static_cast<unsigned long long>(m_lastRow) + 1));
    bool first = true;
    uint32_t last = 0;
    for (const OxWorkbookCell& c : row.cells) {
        if (c.type == OxWorkbookCell::Empty)
            continue;
        const std::wstring where = columnName(c.column) + std::to_wstring(row.index + 1ull);
        if (c.column >= m_maxColumns)
            OxWorkbookError::raise(
                OxWorkbookError::Limit,
                oxFormat(L"cell %s does not fit: a sheet of this format holds at most %d "
                         L"columns",
                         where, m_maxColumns));
        if (!first && c.column <= last)
            OxWorkbookError::raise(
                OxWorkbookError::Invalid,
                oxFormat(L"cells must be in ascending column order (at %s)", where));
        if ((c.type == OxWorkbookCell::Number || c.type == OxWorkbookCell::Date) &&
            !std::isfinite(c.number))
            OxWorkbookError::raise(
                OxWorkbookError::Invalid,
                oxFormat(L"cell %s: a workbook cannot hold an infinite or undefined number",
                         where));
        if (c.type == OxWorkbookCell::Text && utf16Length(c.text) > kMaxTextLength)
            OxWorkbookError::raise(
                OxWorkbookError::Limit,
                oxFormat(L"cell %s: a text has at most %d characters (it has %d)", where,
                         kMaxTextLength, utf16Length(c.text)));
        first = false;
        last = c.column;
    }
}

bool OxWorkbookWriter::writeRow(const OxWorkbookRow& row) {
    return guarded([&] {
        if (m_done)
            OxWorkbookError::raise(OxWorkbookError::Invalid, L"the workbook is already written");
        check(row);
        doWriteRow(row);
        m_rowWritten = true;
        m_lastRow = row.index;
    });
}

bool OxWorkbookWriter::commit() {
    return guarded([&] {
        if (m_done)
            OxWorkbookError::raise(OxWorkbookError::Invalid, L"the workbook is already written");
        if (m_sheets.empty())
            OxWorkbookError::raise(OxWorkbookError::Invalid,
                                   L"a workbook needs at least one sheet");
        bool visible = false;
        for (const auto& s : m_sheets)
            visible = visible || s.visibility == OxWorkbookSheetInfo::Visible;
        if (!visible)
            OxWorkbookError::raise(OxWorkbookError::Invalid,
                                   L"a workbook needs at least one visible sheet");
        doCommit();
        m_done = true;
    });
}
