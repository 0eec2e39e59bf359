#include "vlsys.h"

#include <cstdio>
#include <sys/wait.h>

int vlsys_exit_status_text(char *buffer, size_t size, pid_t pid, const char *name, int status) {
    char status_part[32];
    char signal_part[32] = "";
    char pid_part[16] = "";
    int result = 256;

    if (WIFEXITED(status)) {
        result = WEXITSTATUS(status);
        snprintf(status_part, sizeof status_part, ", status: %d", result);
    } else {
        vlsys_strlcpy(status_part, ", abnormally", sizeof status_part);
    }
    if (WIFSIGNALED(status))
        snprintf(signal_part, sizeof signal_part, ", signaled: %d", WTERMSIG(status));
    if (pid != 0)
        snprintf(pid_part, sizeof pid_part, " pid: %d", pid);
    snprintf(buffer, size, "exited%s (%s)%s%s", pid_part, name ? name : "?", status_part,
             signal_part);
    return result;
}
