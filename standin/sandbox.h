// The place a stand-in unit lives in: private namespaces over a read-only view of the machine.
// Every failure ends the process with a message: a half-made unit is of no use to anyone.
#pragma once

#include <string>
#include <vector>

namespace unit {

// Moves the caller into mount, network, UTS and PID namespaces of its own, and into a user
// namespace where there are any, as root there, and returns in a new process; the first one waits
// for it and ends with its exit status. Call it before the first thread is started. Inside:
// - the machine's files are read-only, and everything the unit writes is on private file systems:
//   /etc, /usr/bin, /usr/sbin and /dev begin as mirrors of the machine's, /run, /proc/driver and
//   /var/cache begin empty;
// - lo is up, /sys shows the unit's interfaces, and a second network namespace, "outside", holds
//   the other ends of the interfaces and forwards, as a router does. A command runs there by
//   `nsenter --net=/run/netns/outside`; `ip -n` needs a /sys that can be written.
void enter_namespaces();

// Puts the unit's files in place afresh: network files, clock file, link to the zone file, version
// file, commands, and the driver status that belongs to the kind of unit (kinds.h).
void make_unit_files(const char *kind_name);

// Makes exactly these interfaces present besides lo, all with carrier (removes the others). Each is
// a veth pair; its other end has the same name outside.
void set_interfaces(const std::vector<std::string> &names);

// Runs a shell command, which must exit with 0.
void run(const std::string &command);

} // namespace unit
