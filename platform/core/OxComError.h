#pragma once

#include <cstdint>
#include <exception>
#include <string>

#include "platform/core/OxExport.h"

// HRESULT values keep the numbers Windows gives them, so logs and callers compare alike.
using OxHResult = int32_t;

namespace OxHr {
constexpr OxHResult S_OK = 0;
constexpr OxHResult E_NOTIMPL = static_cast<OxHResult>(0x80004001);
constexpr OxHResult E_POINTER = static_cast<OxHResult>(0x80004003);
constexpr OxHResult E_FAIL = static_cast<OxHResult>(0x80004005);
constexpr OxHResult E_UNEXPECTED = static_cast<OxHResult>(0x8000FFFF);
constexpr OxHResult E_OUTOFMEMORY = static_cast<OxHResult>(0x8007000E);
constexpr OxHResult E_INVALIDARG = static_cast<OxHResult>(0x80070057);
constexpr OxHResult DISP_E_BADVARTYPE = static_cast<OxHResult>(0x80020008);
constexpr OxHResult DISP_E_TYPEMISMATCH = static_cast<OxHResult>(0x80020005);
constexpr OxHResult DISP_E_OVERFLOW = static_cast<OxHResult>(0x8002000A);
constexpr OxHResult DISP_E_DIVBYZERO = static_cast<OxHResult>(0x80020012);

constexpr bool failed(OxHResult hr) {
    return hr < 0;
}

// The system's text for a known HRESULT ("Type mismatch."), or "Unknown error 0x%08X".
OX_EXPORT std::wstring messageOf(OxHResult hr);
}  // namespace OxHr

// The COM-style error: an HRESULT and a description. Thrown by the platform stand-ins
// (variant type changes, the ADO layer); the library catches it inside its operations.
class OX_EXPORT OxComError : public std::exception {
public:
    explicit OxComError(OxHResult hr, std::wstring description = {});

    OxHResult Error() const noexcept { return m_hr; }
    // The provider's description; the system's text for the HRESULT when none was given.
    const std::wstring& Description() const noexcept { return m_description; }
    std::wstring ErrorMessage() const { return OxHr::messageOf(m_hr); }
    const char* what() const noexcept override { return m_what.c_str(); }

private:
    OxHResult m_hr;
    std::wstring m_description;
    std::string m_what;
};
