#pragma once

#include <string>

#include "platform/core/OxExport.h"

class OX_EXPORT OxFileInfo {
public:
    enum OxFileType {
        FileUnknown = 0,     // readable, but of no kind listed here
        FileMissing = 1,     // missing, a directory, or unreadable
        FileEmpty = 2,       // an empty file
        FileSQLite3 = 3,     // "SQLite format 3"
        FileAccessJet = 4,   // Access .mdb ("Standard Jet DB")
        FileAccessAce = 5,   // Access .accdb ("Standard ACE DB")
        FileCompound = 6,    // OLE2 compound file: .xls (BIFF5/8) and other office files
        FileZipPackage = 7,  // zip container: .xlsx and other packages
        FileBiffStream = 8,  // bare BIFF2-4 worksheet stream (old .xls)
    };

    // The kind of file at the path, read from its first bytes only.
    static OxFileType _getFileType(const std::wstring& path);
};
