#pragma once

#include <string>

#include "platform/core/OxExport.h"

// The host's receiver of a database copy's progress. Every call comes from the thread
// that called run, also when tables are copied on worker threads.
class OX_EXPORT OxQelProgressReactor {
public:
    virtual ~OxQelProgressReactor() = default;
    // Once, before the first table: how many tables will be copied.
    virtual void setStepCount(int steps) = 0;
    // Never called by the library: free for the host's own use.
    virtual void setStepText(const std::wstring& text) { (void)text; }
    // Once per finished table, always with 1.
    virtual void advance(int steps) = 0;
};
