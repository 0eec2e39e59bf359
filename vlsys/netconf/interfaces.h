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

int compare_natural(const char *a, const char *b, int n);
// For qsort.
int compare_ifname(const void *a, const void *b);
// The unit's primary interface; see the source for the order of the search.
int get_primary_ifname(char *out);
// 0 when the name is a well-formed host or domain name (the empty text is), else -1.
int check_hostname_format(const char *name);

} // namespace vlsys
