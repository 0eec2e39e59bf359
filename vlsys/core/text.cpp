#include "core/text.h"

#include "vlsys.h"

#include <cstdarg>
#include <cstring>

namespace vlsys {

Text format_text(const char *format, ...) {
    char *text = nullptr;
    va_list arguments;
    va_start(arguments, format);
    const int length = vasprintf(&text, format, arguments);
    va_end(arguments);
    return Text(length < 0 ? nullptr : text);
}

} // namespace vlsys

size_t vlsys_strlcpy(char *destination, const char *source, size_t size) {
    const size_t length = strlen(source);
    if (size > 0) {
        const size_t kept = length < size ? length : size - 1;
        memcpy(destination, source, kept);
        destination[kept] = '\0';
    }
    return length;
}

size_t vlsys_strlcat(char *destination, const char *source, size_t size) {
    const size_t length = strnlen(destination, size);
    if (length == size)
        return size + strlen(source);
    return length + vlsys_strlcpy(destination + length, source, size - length);
}
