#include "netconf/keys.h"

#include <cstdio>

namespace vlsys {

static const char *text_of(Cell cell, const Fields &fields) {
    static constexpr const char *fixed[] = {nullptr, nullptr, "no", "yes",
                                            "none",  "dhcp",  " 0", " 1"};
    return cell < field_1 ? fixed[cell] : fields.text[cell - field_1];
}

void ItemList::add(const char *key, Cell cell, const Fields &fields) {
    if (cell == kept)
        return;
    const char *const text = text_of(cell, fields);
    items_[count_++] = {!text, key, text ? text : ""};
}

void SwitchKey::set(const char *interface, const char *name) {
    snprintf(text, sizeof text, "net.ipv6.conf.%s.%s ", interface, name);
}

} // namespace vlsys
