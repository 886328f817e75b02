#include "platform/core/OxMessageSink.h"

#include <cstdio>
#include <mutex>

#include "platform/core/OxText.h"

namespace {
std::mutex g_mutex;
OxMessageSink::Handler g_handler;

void writeToStandardError(const std::wstring& text) {
    std::string utf8 = OxText::toUtf8(text);
    if (utf8.empty() || utf8.back() != '\n')
        utf8.push_back('\n');
    std::fwrite(utf8.data(), 1, utf8.size(), stderr);
    std::fflush(stderr);
}
}  // namespace

OxMessageSink::Handler OxMessageSink::setHandler(Handler handler) {
    std::lock_guard lock(g_mutex);
    Handler previous = std::move(g_handler);
    g_handler = std::move(handler);
    return previous;
}

void OxMessageSink::show(const std::wstring& text) noexcept {
    try {
        Handler handler;
        {
            std::lock_guard lock(g_mutex);
            handler = g_handler;
        }
        // Called outside the lock: a handler may wait for the user or report itself.
        if (handler)
            handler(text);
        else
            writeToStandardError(text);
    } catch (...) {
        // A message that cannot be shown is lost; reporting never fails its caller.
    }
}
