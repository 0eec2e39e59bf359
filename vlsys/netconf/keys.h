// What a setter gives the editor: items, one by one or from a table of keys with a column per mode.
#pragma once

#include "netconf/edit.h"

#include <cstddef>

namespace vlsys {

// What becomes of a key.
enum class Action : uint8_t { kept, removed, set };

// One key in one mode: kept as it is, removed, or set to a fixed text or to one of the texts of the
// setter's record. A null text of the record removes the key.
template <class Texts>
class Cell {
  public:
    constexpr Cell(Action action) : action_(action) {}
    constexpr Cell(const char *text) : action_(Action::set), text_(text) {}
    constexpr Cell(const char *Texts::*field) : action_(Action::set), field_(field) {}

    bool is_kept() const { return action_ == Action::kept; }
    // Null when the key is removed.
    const char *text(const Texts &texts) const { return field_ ? texts.*field_ : text_; }

  private:
    Action action_;
    const char *text_ = nullptr;
    const char *Texts::*field_ = nullptr;
};

template <class Texts, size_t Columns>
struct KeyRow {
    const char *key;
    Cell<Texts> cells[Columns];
};

// The items of one rewrite, in an array of the setter's. Keys and values must outlive the list.
class ItemList {
  public:
    explicit ItemList(std::span<edit_item> array) : array_(array) {}

    void set(const char *key, const char *value) { add({.remove = 0, .key = key, .value = value}); }
    void remove(const char *key) { add({.remove = 1, .key = key, .value = ""}); }

    template <class Texts>
    void add_cell(const char *key, const Cell<Texts> &cell, const Texts &texts) {
        if (cell.is_kept())
            return;
        const char *const text = cell.text(texts);
        if (text)
            set(key, text);
        else
            remove(key);
    }

    // The column is an enumerator or a mode.
    template <class Texts, size_t Rows, size_t Columns, class Column>
    void add_column(const KeyRow<Texts, Columns> (&table)[Rows], Column column,
                    const Texts &texts) {
        for (const auto &row : table)
            add_cell(row.key, row.cells[static_cast<size_t>(column)], texts);
    }

    // Null when there were more items than the array holds: the editor refuses that.
    std::span<const edit_item> items() const;

  private:
    void add(const edit_item &item);

    std::span<edit_item> array_;
    size_t count_ = 0; // of all items, also of those that found no room
};

// The drop-in's key of one of an interface's IPv6 switches. The editor joins key and value with
// "=": the blanks around it are the key's last byte and the value's first.
struct SwitchKey {
    char text[80];
};
SwitchKey switch_key(const char *interface, const char *name);

} // namespace vlsys
