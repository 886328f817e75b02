#include "platform/workbook/OxWorkbookReader.h"

#include <cstring>
#include <new>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookSource.h"
#include "platform/workbook/OxXlsReader.h"
#include "platform/workbook/OxXlsxReader.h"

OxWorkbookReader::~OxWorkbookReader() = default;

template <class F>
bool OxWorkbookReader::guarded(F&& f) {
    if (m_error)
        return false;
    try {
        return f();
    } catch (const OxWorkbookError& e) {
        m_error = e;
    } catch (const std::bad_alloc&) {
        m_error = OxWorkbookError(OxWorkbookError::Limit, L"the workbook does not fit in memory");
    } catch (const std::length_error&) {
        m_error = OxWorkbookError(OxWorkbookError::Limit, L"the workbook does not fit in memory");
    }
    m_inSheet = false;
    return false;
}

std::unique_ptr<OxWorkbookReader> OxWorkbookReader::open(const std::wstring& path,
                                                         OxWorkbookError& error) {
    auto src = std::make_unique<OxWorkbookSource>();
    if (!src->openFile(path, error))
        return nullptr;
    return create(std::move(src), error);
}

std::unique_ptr<OxWorkbookReader> OxWorkbookReader::openMemory(std::string bytes,
                                                               OxWorkbookError& error) {
    auto src = std::make_unique<OxWorkbookSource>();
    src->openMemory(std::move(bytes));
    return create(std::move(src), error);
}

std::unique_ptr<OxWorkbookReader> OxWorkbookReader::create(std::unique_ptr<OxWorkbookSource> src,
                                                           OxWorkbookError& error) {
    error.clear();
    unsigned char h[8] = {};
    const size_t n = src->size() < 8 ? static_cast<size_t>(src->size()) : 8;
    if (!src->read(0, h, n)) {
        error = OxWorkbookError(OxWorkbookError::Io, oxFormat(L"cannot read %s", src->path()));
        return nullptr;
    }
    static const unsigned char kCompound[] = {0xD0, 0xCF, 0x11, 0xE0, 0xA1, 0xB1, 0x1A, 0xE1};
    std::unique_ptr<OxWorkbookReader> reader;
    if (n == 8 && std::memcmp(h, kCompound, 8) == 0) {
        reader = std::make_unique<OxXlsReader>(std::move(src));
    } else if (n >= 4 && std::memcmp(h, "PK\x03\x04", 4) == 0) {
        reader = std::make_unique<OxXlsxReader>(std::move(src));
    } else if (n >= 4 && h[0] == 0x09 && (h[1] == 0x00 || h[1] == 0x02 || h[1] == 0x04) &&
               h[3] == 0) {
        const int version = h[1] == 0 ? 2 : h[1] == 2 ? 3 : 4;
        error = OxWorkbookError(
            OxWorkbookError::Unsupported,
            oxFormat(L"unsupported version: %s is a BIFF%d worksheet (only BIFF5 and BIFF8 "
                     L"workbooks and .xlsx files are read)",
                     src->path(), version));
        return nullptr;
    } else {
        error = OxWorkbookError(OxWorkbookError::Unsupported,
                                oxFormat(L"%s is not a workbook (.xls or .xlsx)", src->path()));
        return nullptr;
    }
    if (!reader->guarded([&] {
            reader->doOpen();
            return true;
        })) {
        error = reader->m_error;
        return nullptr;
    }
    return reader;
}

int OxWorkbookReader::findSheet(const std::wstring& name) const {
    for (size_t i = 0; i < m_info.sheets.size(); ++i)
        if (OxText::equalsNoCase(m_info.sheets[i].name, name))
            return static_cast<int>(i);
    return -1;
}

bool OxWorkbookReader::beginSheet(size_t index) {
    return guarded([&] {
        if (index >= m_info.sheets.size())
            OxWorkbookError::raise(OxWorkbookError::Invalid,
                                   oxFormat(L"there is no sheet number %d", index + 1));
        doBeginSheet(index);
        m_inSheet = true;
        return true;
    });
}

bool OxWorkbookReader::nextRow(OxWorkbookRow& row) {
    row.cells.clear();
    if (!m_inSheet)
        return false;
    return guarded([&] {
        if (doNextRow(row))
            return true;
        m_inSheet = false;
        return false;
    });
}

bool OxWorkbookReader::sheetExtent(size_t index, uint32_t& rows, uint32_t& columns) {
    rows = columns = 0;
    if (!beginSheet(index))
        return false;
    OxWorkbookRow row;
    while (nextRow(row)) {
        rows = row.index + 1 > rows ? row.index + 1 : rows;
        if (!row.cells.empty() && row.cells.back().column + 1 > columns)
            columns = row.cells.back().column + 1;
    }
    return !m_error;
}
