#pragma once

#include <string>
#include <string_view>

// Joins count texts: before the element at position i (from 0, i > 0) stands the chunk
// separator when chunkSize > 0 and i is a multiple of it, else the separator.
template <class TextAt>
std::wstring oxJoinList(size_t count, TextAt textAt, std::wstring_view separator, int chunkSize,
                        std::wstring_view chunkSeparator) {
    std::wstring out;
    for (size_t i = 0; i < count; ++i) {
        if (i > 0) {
            const bool chunk = chunkSize > 0 && i % static_cast<size_t>(chunkSize) == 0;
            out += chunk ? chunkSeparator : separator;
        }
        out += textAt(i);
    }
    return out;
}
