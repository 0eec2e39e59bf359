// vlsys-measure COMMAND [ARGUMENT...]: runs the command with its standard output dropped and prints
// wall time and CPU time in seconds, peak memory in kB, wait status; children count in.
#include <cstdio>
#include <ctime>
#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

static double seconds(const timeval &time) {
    return static_cast<double>(time.tv_sec) + 1e-6 * static_cast<double>(time.tv_usec);
}

static double now() {
    timespec time = {};
    clock_gettime(CLOCK_MONOTONIC, &time);
    return static_cast<double>(time.tv_sec) + 1e-9 * static_cast<double>(time.tv_nsec);
}

int main(int argc, char **argv) {
    if (argc < 2)
        return 2;
    const double start = now();
    const pid_t child = fork();
    if (child == 0) {
        dup2(open("/dev/null", O_WRONLY | O_CLOEXEC), STDOUT_FILENO);
        execvp(argv[1], argv + 1);
        _exit(127);
    }
    int status = 0;
    rusage usage = {};
    wait4(child, &status, 0, &usage);
    printf("%.9f %.6f %ld %d\n", now() - start, seconds(usage.ru_utime) + seconds(usage.ru_stime),
           usage.ru_maxrss, status);
}
