// Text allocated to its exact length, and text from records.
#pragma once

#include "core/owners.h"

#include <cstring>
#include <string_view>

namespace vlsys {

// asprintf with an owner; null when there is no memory (errno says so).
[[gnu::format(printf, 1, 2)]] Text format_text(const char *format, ...);

// std::string_view::starts_with, which needs the C++ run-time library unless it is optimized away.
inline bool starts_with(std::string_view text, std::string_view prefix) {
    return text.size() >= prefix.size() && memcmp(text.data(), prefix.data(), prefix.size()) == 0;
}

// A copy of a record's text field, terminated also when the field is full.
template <size_t Size>
struct FieldText {
    explicit FieldText(const char (&field)[Size]) {
        memcpy(text, field, Size);
        text[Size] = '\0';
    }

    bool is_empty() const { return text[0] == '\0'; }

    char text[Size + 1];
};

} // namespace vlsys
