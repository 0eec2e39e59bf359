// Key tables: what becomes of each key of a file, a column per mode.
#pragma once

#include "netconf/edit.h"

#include <cstddef>

namespace vlsys {

// A key is kept as it is, removed, or set: to a fixed text, or to a field of the setter's record.
enum Cell : uint8_t { kept, removed, no, yes, none, dhcp, zero, one, field_1, field_2, field_3 };

template <size_t Columns>
struct KeyRow {
    const char *key;
    Cell cells[Columns];
};

// The texts of field_1 to field_3; null removes the key.
struct Fields {
    const char *text[3];
};

// The items of one rewrite.
class ItemList {
  public:
    template <size_t Rows, size_t Columns>
    void add(const KeyRow<Columns> (&table)[Rows], size_t column, const Fields &fields) {
        for (const auto &row : table)
            add(row.key, row.cells[column], fields);
    }
    // The key must outlive the list.
    void add(const char *key, Cell cell, const Fields &fields);

    std::span<const edit_item> items() const { return {items_, count_}; }

  private:
    edit_item items_[15] = {}; // the longest list: an interface with IPv4 or IPv6
    size_t count_ = 0;
};

// The drop-in's key of one of an interface's IPv6 switches. The editor joins key and value with
// "=": the blanks around it are the key's last byte and the value's first.
struct SwitchKey {
    void set(const char *interface, const char *name);

    char text[80];
};

} // namespace vlsys
