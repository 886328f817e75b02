#pragma once

#include <string>

#include "platform/core/OxExport.h"

class OX_EXPORT OxPath {
public:
    // True when a file (not a directory) exists at the path.
    static bool pathFileExists(const std::wstring& path);
    // Removes the file; true when it is gone afterwards.
    static bool deleteFile(const std::wstring& path);
    // Copies source to target through a temporary file beside the target that is renamed
    // over it when complete, so the target is never left half written. With failIfExists
    // an existing target is kept and the copy fails.
    static bool copyFile(const std::wstring& source, const std::wstring& target, int failIfExists);
    // The path with the extension of its file name replaced (the extension has its dot:
    // ".mdb"); an extension is added when the name has none.
    static std::wstring changeFileExt(const std::wstring& path, const std::wstring& extension);
    // True when both paths name the same existing file (links and other spellings included).
    static bool isSameFile(const std::wstring& a, const std::wstring& b);
};
