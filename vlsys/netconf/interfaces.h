// The unit's interfaces: all but lo and virbr*, in natural order.
#pragma once

#include "core/owners.h"
#include "vlsys.h"

namespace vlsys {

using InterfaceName = char[VLSYS_IFNAME_SIZE];

// The interface list as an owned, iterable value; empty when there are none or on failure.
class InterfaceList {
  public:
    InterfaceList();
    int count() const { return count_; }
    const InterfaceName *begin() const { return names_.get(); }
    const InterfaceName *end() const { return names_.get() + count_; }

  private:
    int count_ = 0;
    Owned<InterfaceName[]> names_;
};

// Whether the kernel has an interface of that very name. It also finds one by an alternative name,
// and looks at a name up to its colon only ("eth0:/../../x"): neither counts.
// Returns 0, and its index through `index` unless that is null; -ENXIO when there is none (silent);
// else the negated errno of the look-up, logged.
int find_interface(const char *name, unsigned int *index = nullptr);

// Whether the name is one of the virtual bridges, virbr*.
bool is_virtual_bridge(const char *name);

// Compares at most n characters, runs of digits by their number: eth2 is below eth10, eth01 below
// eth1. Below, equal to or above 0. Numbers above 31 bits wrap, so the order is not always a
// consistent one.
int compare_natural(const char *a, const char *b, int n);

// Two interface names, in the form that qsort takes.
int compare_ifname(const void *a, const void *b);

// The unit's primary interface: eth0, else enp0s25, else the first of the list. Found once and kept
// for the life of the process. For code that works on one interface where none is named; no setter
// or reader of the library does. Returns its index with the name in `out` (VLSYS_IFNAME_SIZE
// bytes); 0 when there is no interface; -14 for a null `out`.
int get_primary_ifname(char *out);

} // namespace vlsys
