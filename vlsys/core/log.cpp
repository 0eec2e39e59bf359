#include "core/log.h"

#include "core/owners.h"

#include <cstring>

namespace vlsys {

static const char *log_ident;    // null until the log is opened
static bool log_stdout;          // standard output instead of the system log
static uint32_t log_mask = 0xFF; // standard-output mode only: bit p set prints priority p
static constexpr const char *level_names[] = {"EMERG", "ALERT",  "CRIT", "ERR",
                                              "WARN",  "NOTICE", "INFO", "DEBUG"};

namespace {

// Keeps other threads from standard output, so that a line stays whole and its prefix true.
class StdoutLock {
  public:
    StdoutLock() { flockfile(stdout); }
    StdoutLock(const StdoutLock &) = delete;
    StdoutLock &operator=(const StdoutLock &) = delete;
    ~StdoutLock() { funlockfile(stdout); }
};

} // namespace

VLSYS_PRINTF(2, 0)
static void log_to_stdout(int priority, const char *format, va_list arguments) {
    const int reason = errno;
    const int level = LOG_PRI(priority);
    if ((log_mask & static_cast<uint32_t>(LOG_MASK(level))) == 0)
        return;
    const StdoutLock whole_line;
    if (priority != LOG_DEBUG)
        printf("%s[%d]: <%s>: [%d]: ", log_ident, getpid(), level_names[level], gettid());
    errno = reason; // for "%m"
    vprintf(format, arguments);
    const size_t length = strlen(format);
    if (length == 0 || format[length - 1] != '\n')
        putchar('\n');
}

VLSYS_PRINTF(2, 0)
static void log_to_system(int priority, const char *format, va_list arguments) {
    const int reason = errno;
    va_list again;
    va_copy(again, arguments);
    char *message = nullptr;
    if (vasprintf(&message, format, arguments) >= 0) {
        const Text owner(message);
        syslog(priority, "[%d]: %s", gettid(), message);
    } else {
        errno = reason; // for "%m"
        vsyslog(priority, format, again);
    }
    va_end(again);
}

int log_errno(const char *format, ...) {
    const int reason = errno;
    char with_reason[256];
    snprintf(with_reason, sizeof with_reason, "%s: %%m", format);
    va_list arguments;
    va_start(arguments, format);
    errno = reason; // for "%m"
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral" // the caller's format was checked
    vlsys_vlog(LOG_ERR, with_reason, arguments);
#pragma GCC diagnostic pop
    va_end(arguments);
    return -reason;
}

} // namespace vlsys

using namespace vlsys;

void vlsys_log(int priority, const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    vlsys_vlog(priority, format, arguments);
    va_end(arguments);
}

void vlsys_vlog(int priority, const char *format, va_list arguments) {
    const SavedErrno caller;
    if (!format)
        return;
    if (!log_ident)
        vlsys_openlog(program_invocation_short_name, LOG_PID, LOG_LOCAL0);
    errno = caller.value(); // for "%m"
    if (log_stdout)
        log_to_stdout(priority, format, arguments);
    else
        log_to_system(priority, format, arguments);
}

void vlsys_openlog(const char *ident, int option, int facility) {
    log_ident = ident;
    if (facility < 0) {
        log_stdout = true;
        return;
    }
    openlog(ident, option, facility);
}

void vlsys_closelog(void) {
    if (!log_stdout)
        closelog();
}

int vlsys_setlogmask(int mask) {
    const int system_mask = setlogmask(mask);
    const int previous = log_stdout ? static_cast<int>(log_mask) : system_mask;
    log_mask = static_cast<uint32_t>(mask);
    return previous;
}
