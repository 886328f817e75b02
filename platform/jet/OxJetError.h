#pragma once

#include <stdexcept>
#include <string>

#include "platform/core/OxExport.h"
#include "platform/core/OxText.h"

// A file that breaks the format's rules (a size or offset out of bounds, a broken chain).
// Thrown inside the reader and turned into an error text at the public calls.
class OxJetError : public std::runtime_error {
public:
    explicit OxJetError(const std::wstring& message)
        : std::runtime_error(OxText::toUtf8(message)), m_message(message) {}
    const std::wstring& message() const noexcept { return m_message; }

private:
    std::wstring m_message;
};
