// The surrogate parent's end of a connection.
#pragma once

#include <string>

namespace unit {

// A socket that listens on 127.0.0.1:12865; ends the process when that fails.
int listen_on_loopback();

// Sends a text; false when the client is gone.
bool say(int connection, const std::string &text);

} // namespace unit
