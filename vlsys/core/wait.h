// Waiting.
#pragma once

namespace vlsys {

// Waits that long, whatever signals arrive meanwhile.
void wait_seconds(int seconds);

} // namespace vlsys
