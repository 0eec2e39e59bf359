// The receiving end of the system log.
#pragma once

#include <string>

namespace unit {

// Binds a socket to /dev/log, in place of what is there; ends the process when that fails.
int open_log();

// Takes the next of the messages that have come; false when there is none.
bool take_log_datagram(int receiver, std::string *datagram);

struct LogMessage {
    int priority; // facility and level
    std::string text;
};
// Takes "<131>Nov 24 10:00:00 ident[process id]: [thread id]: text" apart. A datagram of another
// form is all text.
LogMessage parse_log_datagram(const std::string &datagram);

} // namespace unit
