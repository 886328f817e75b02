#include "platform/core/OxComError.h"

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace OxHr {
std::wstring messageOf(OxHResult hr) {
    switch (hr) {
        case S_OK:
            return L"The operation completed successfully.";
        case E_NOTIMPL:
            return L"Not implemented";
        case E_POINTER:
            return L"Invalid pointer";
        case E_FAIL:
            return L"Unspecified error";
        case E_UNEXPECTED:
            return L"Catastrophic failure";
        case E_OUTOFMEMORY:
            return L"Not enough memory resources are available to complete this operation.";
        case E_INVALIDARG:
            return L"The parameter is incorrect.";
        case DISP_E_BADVARTYPE:
            return L"Bad variable type.";
        case DISP_E_TYPEMISMATCH:
            return L"Type mismatch.";
        case DISP_E_OVERFLOW:
            return L"Out of present range.";
        case DISP_E_DIVBYZERO:
            return L"Division by zero.";
        default:
            return oxFormat(L"Unknown error 0x%08X", static_cast<uint32_t>(hr));
    }
}
}  // namespace OxHr

OxComError::OxComError(OxHResult hr, std::wstring description)
    : m_hr(hr),
      m_description(description.empty() ? OxHr::messageOf(hr) : std::move(description)),
      m_what(OxText::toUtf8(m_description)) {}
