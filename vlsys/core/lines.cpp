#include "core/lines.h"

#include <cerrno>
#include <cstring>

namespace vlsys {

int next_byte(FILE *file) {
    int c = EOF;
    while ((c = getc_unlocked(file)) == EOF && ferror_unlocked(file) && errno == EINTR)
        clearerr_unlocked(file);
    return c;
}

int read_line(FILE *file, char *line, size_t size) {
    size_t length = 0;
    int c = 0;
    bool any = false;
    while (c != '\n' && (c = next_byte(file)) != EOF) {
        any = true;
        if (length + 1 < size)
            line[length++] = static_cast<char>(c);
    }
    line[length] = '\0';
    if (c == EOF && ferror_unlocked(file) && errno != EISDIR)
        return -errno;
    return any ? 1 : 0;
}

static char *remove_quotes(char *value) {
    if (*value != '"')
        return value;
    value++;
    value[strcspn(value, "\"")] = '\0';
    return value;
}

int next_setting(FILE *file, char *line, size_t size, Quotes quotes, Setting *setting) {
    do {
        const int result = read_line(file, line, size);
        if (result <= 0)
            return result;
    } while (line[0] == '\n' || line[0] == '#');

    char *rest = nullptr;
    setting->key = strtok_r(line, "=\n", &rest);
    if (!setting->key)
        return 0;
    char *value = strtok_r(nullptr, "=\n", &rest);
    if (value && quotes == Quotes::remove)
        value = remove_quotes(value);
    setting->value = value ? value : "";
    return 1;
}

} // namespace vlsys
