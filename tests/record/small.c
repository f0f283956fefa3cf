// Programs of a few lines each, chosen by the first argument; with ALLOCATOR, also an allocator of its own.
#define _GNU_SOURCE
#include <pthread.h>
#include <signal.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

static void* volatile gSink;

#ifdef ALLOCATOR
// Hands out one array from front to back and takes nothing back.
static _Alignas(16) char gArray[1 << 26];
static size_t gUsed;

void* malloc(size_t size) {
    char* block = gArray + __atomic_fetch_add(&gUsed, (size + 31) / 16 * 16, __ATOMIC_RELAXED);
    *(size_t*)block = size;
    return block + 16;
}
void free(void* block) { (void)block; }
void* calloc(size_t count, size_t size) { return malloc(count * size); }
void* realloc(void* old, size_t size) {
    void* block = malloc(size);
    return old == NULL ? block : memcpy(block, old, size < ((size_t*)old)[-2] ? size : ((size_t*)old)[-2]);
}
int IsFromAllocator(void) { return 1; }

// Runs before the recorder's own constructor.
__attribute__((constructor)) static void ReadEarly(void) {
    FILE* file = fopen(__FILE__, "r");
    if (file == NULL || getc(file) == EOF || fclose(file) != 0) abort();
}
#endif
extern int IsFromAllocator(void) __attribute__((weak));

static void* FreeThere(void* block) {
    free(block);
    return NULL;
}

static void Threads(int count) {
    for (int i = 0; i < count; ++i) {
        pthread_t thread;
        void* const block = malloc(16);
        if (pthread_create(&thread, NULL, FreeThere, block) != 0) abort();
        pthread_join(thread, NULL);
    }
}

static FILE* gLog;
static volatile int gTicks;

static void Mark(int signal) {
    gTicks += signal != 0;
    if (write(fileno(gLog), "", 1) != 1) abort();
}

// Writes in a signal handler too.
static void Tick(int threads) {
    const struct itimerval often = {{0, 100}, {0, 100}};
    Threads(threads);
    gLog = fopen("log", "w");
    signal(SIGALRM, Mark);
    setitimer(ITIMER_REAL, &often, NULL);
    while (gTicks < 2000) Mark(0);
    signal(SIGALRM, SIG_IGN);
}

// Ends in a signal handler that interrupts an allocator.
static void Alarm(void) {
    Threads(1);
    signal(SIGALRM, _exit);
    ualarm(1000, 0);
    for (;;) free(gSink = malloc(2000));
}

static void Exhaust(size_t size) {
    const struct rlimit limit = {1 << 27, 1 << 27};
    int count = 0;
    if (setrlimit(RLIMIT_AS, &limit) != 0) abort();
    while ((gSink = malloc(size)) != NULL) ++count;
    printf("%d\n", count);
}

// One child allocates by itself, the other starts this program anew.
static void Children(char* program) {
    if (fork() == 0) {
        gSink = malloc(1000);
        exit(0);
    }
    wait(NULL);
    if (fork() == 0) execl(program, program, "one", NULL);
    wait(NULL);
}

// Asks the recorder for a report and waits for it, then leaves less behind.
static void Signal(void) {
    gSink = malloc(512);
    kill(getppid(), SIGUSR2);
    if (system("until tail -n1 signalled.json 2>&1 | grep -q '^}$'; do :; done; cp signalled.json kept.json") != 0)
        abort();
    free(gSink);
}

// Ends with one block of 512 bytes live.
static void End(const char* how) {
    gSink = malloc(512);
    if (strcmp(how, "fault") == 0) raise(SIGSEGV);
    if (strcmp(how, "kill") == 0) raise(SIGKILL);
    if (strcmp(how, "raw") == 0) syscall(SYS_exit_group, 0);
    if (strcmp(how, "replaced") == 0) execl("/bin/true", "true", NULL);
}

int main(int count, char** words) {
    const char* what = count > 1 ? words[1] : "";
    const int number = count > 2 ? atoi(words[2]) : 0;
    if (strcmp(what, "leak") == 0)
        for (int i = 0; i < number; ++i) gSink = malloc(16);
    if (strcmp(what, "print") == 0) puts("printed");
    if (strcmp(what, "one") == 0) gSink = malloc(1000);
    if (strcmp(what, "status") == 0) return gSink = malloc(1), number;
    if (strcmp(what, "threads") == 0) Threads(number);
    if (strcmp(what, "children") == 0) Children(words[0]);
    if (strcmp(what, "tick") == 0) Tick(number);
    if (strcmp(what, "alarm") == 0) Alarm();
    if (strcmp(what, "exhaust") == 0) Exhaust((size_t)number);
    if (strcmp(what, "signal") == 0) Signal();
    if (strcmp(what, "end") == 0) End(words[2]);
    if (IsFromAllocator != NULL) puts("blocks from the allocator: yes");
    return 0;
}
