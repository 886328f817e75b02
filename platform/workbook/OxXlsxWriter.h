#pragma once

#include <memory>
#include <string>

#include "platform/workbook/OxWorkbookOutputFile.h"
#include "platform/workbook/OxWorkbookWriter.h"
#include "platform/workbook/OxZipWriter.h"

// .xlsx (Transitional), streamed: each sheet's XML is deflated into the package as its
// rows arrive, so memory stays flat however large the sheet. Texts are inline; numbers
// are written with the shortest digits that read back to the same double.
class OxXlsxWriter : public OxWorkbookWriter {
public:
    OxXlsxWriter();
    ~OxXlsxWriter() override;

protected:
    void doCreate(const std::wstring& path) override;
    void doAddSheet(const std::wstring& name, OxWorkbookSheetInfo::Visibility v) override;
    void doWriteRow(const OxWorkbookRow& row) override;
    void doCommit() override;
    void doAbandon() noexcept override;

private:
    void finishSheet();
    void flushXml(bool force);

    OxWorkbookOutputFile m_out;
    std::unique_ptr<OxZipWriter> m_zip;
    bool m_sheetOpen = false;
    std::string m_xml;
};
