#pragma once

#include <functional>
#include <string>

#include "platform/core/OxExport.h"

// Stands in for the modal message box: the library hands a text to the sink and goes on
// when the sink returns. A desktop host installs a handler that shows a dialog; the
// default writes the text to standard error.
class OX_EXPORT OxMessageSink {
public:
    using Handler = std::function<void(const std::wstring& text)>;

    // Installs a handler (an empty one restores the default) and returns the previous one.
    static Handler setHandler(Handler handler);
    // Delivers the text; never throws (a throwing handler is caught and ignored).
    static void show(const std::wstring& text) noexcept;
};
