#include "platform/workbook/OxWorkbookError.h"

const wchar_t* OxWorkbookError::codeName(Code code) {
    switch (code) {
        case None:
            return L"no error";
        case Io:
            return L"input/output error";
        case Unsupported:
            return L"unsupported";
        case Encrypted:
            return L"encrypted";
        case Corrupt:
            return L"corrupt";
        case Limit:
            return L"too large";
        case Invalid:
            return L"invalid";
    }
    return L"error";
}

void OxWorkbookError::raise(Code code, std::wstring message) {
    throw OxWorkbookError(code, std::move(message));
}
