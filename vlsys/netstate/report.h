// The network state, as lines in the log.
#pragma once

namespace vlsys {

// Logs the modes, the first two interfaces, the default gateways and the name resolution in force.
// After a restart that ended with exit code 0 it waits for interfaces that are set to IPv6 and have
// no IPv6 address yet, up to 10 seconds each.
void print_network_info(int exit_code);

} // namespace vlsys
