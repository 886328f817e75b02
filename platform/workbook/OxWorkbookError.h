#pragma once

#include <string>

// Why a workbook could not be read or written. Readers and writers never throw to their
// callers: they answer false and keep one of these.
class OxWorkbookError {
public:
    enum Code {
        None = 0,
        Io,           // missing, unreadable or unwritable file
        Unsupported,  // a format or version this code does not read
        Encrypted,    // the workbook needs a password
        Corrupt,      // malformed or truncated content
        Limit,        // the content exceeds what the format or this reader can hold
        Invalid,      // a caller's request the format cannot honour (sheet name, order)
    };

    OxWorkbookError() = default;
    OxWorkbookError(Code code, std::wstring message)
        : m_code(code), m_message(std::move(message)) {}

    Code code() const { return m_code; }
    const std::wstring& message() const { return m_message; }
    explicit operator bool() const { return m_code != None; }
    void clear() {
        m_code = None;
        m_message.clear();
    }

    static const wchar_t* codeName(Code code);
    // Parsers deep inside a reader throw the error itself; the public entry points catch it
    // and answer false.
    [[noreturn]] static void raise(Code code, std::wstring message);

private:
    Code m_code = None;
    std::wstring m_message;
};
