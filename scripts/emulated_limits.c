// What qemu's user emulation does otherwise than the kernel: one system call each, without our library. Prints the
// limits that it meets; built for the processor that it runs on, it meets none.
#define _GNU_SOURCE
#include <signal.h>
#include <stdio.h>
#include <stdlib.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

int main(void) {
    // A copy of the process whose end raises no signal.
    const long copy = syscall(SYS_clone, 0L, 0L, 0L, 0L, 0L);
    if (copy == 0) _exit(0);
    if (copy == -1) puts("clone-without-signal");

    // A process that a signal ends leaves the standard error alone.
    int ends[2];
    char byte;
    if (pipe(ends) != 0) return 1;
    if (fork() == 0) {
        dup2(ends[1], STDERR_FILENO);
        abort();
    }
    close(ends[1]);
    if (read(ends[0], &byte, 1) == 1) puts("line-at-abort");
    return 0;
}
