#include "core/lines.h"

#include <cstring>

namespace vlsys {

bool read_line(FILE *file, char *line, size_t size) {
    size_t length = 0;
    int c = 0;
    bool any = false;
    while (c != '\n' && (c = getc_unlocked(file)) != EOF) {
        any = true;
        if (length + 1 < size)
            line[length++] = static_cast<char>(c);
    }
    line[length] = '\0';
    return any;
}

static char *remove_quotes(char *value) {
    if (*value != '"')
        return value;
    value++;
    value[strcspn(value, "\"")] = '\0';
    return value;
}

bool next_setting(FILE *file, char *line, size_t size, Quotes quotes, Setting *setting) {
    do {
        if (!read_line(file, line, size))
            return false;
    } while (line[0] == '\n' || line[0] == '#');

    char *rest = nullptr;
    setting->key = strtok_r(line, "=\n", &rest);
    if (!setting->key)
        return false;
    char *value = strtok_r(nullptr, "=\n", &rest);
    if (value && quotes == Quotes::remove)
        value = remove_quotes(value);
    setting->value = value ? value : "";
    return true;
}

} // namespace vlsys
