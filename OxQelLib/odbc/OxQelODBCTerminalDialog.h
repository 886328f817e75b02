#pragma once

#include <string>
#include <vector>

#include "platform/odbc/OxOdbcEnvironment.h"

// The terminal form of the data-source dialog: lists the data sources, reads the user's
// choice and the keys to add, and composes the connection string. Not a public header.
class OxQelODBCTerminalDialog {
public:
    using DataSource = OxOdbcEnvironment::DataSource;
    using Attributes = std::vector<std::pair<std::wstring, std::wstring>>;

    // Reads from and writes to the file descriptors (normally both the terminal).
    OxQelODBCTerminalDialog(int input, int output) : m_in(input), m_out(output) {}

    // "DSN=name;UID=...;PWD=...;more keys", or empty when the user cancelled (an empty
    // answer, end of input). attributes gives a data source's own keys, whose user id is
    // offered as the default and whose password is not asked for again.
    std::wstring run(const std::vector<DataSource>& sources,
                     Attributes (*attributes)(const std::wstring& dataSource));

private:
    // False at the end of input.
    bool readLine(std::wstring& line);
    void write(const std::wstring& text);
    // hidden switches the terminal's echo off for the answer.
    bool ask(const std::wstring& prompt, std::wstring& answer, bool hidden = false);

    int m_in;
    int m_out;
};
