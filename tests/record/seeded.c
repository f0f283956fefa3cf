// A C program with known rows: a comment "row" states calls, bytes, live blocks and live bytes of its line.
#define _GNU_SOURCE
#include <fcntl.h>
#include <malloc.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

static void* volatile gSink;

__attribute__((noinline)) static void* xmalloc(size_t size) {
    void* block = malloc(size);
    if (block == NULL) abort();
    return block;
}

static void Memory(void) {
    gSink = malloc(100);                                  // row 1 100 1 100
    gSink = calloc(10, 7);                                // row 1 70 1 70
    gSink = xmalloc(33);                                  // row 1 33 1 33
    for (int i = 0; i < 5; ++i) free(gSink = malloc(8));  // row 5 40 0 0
    void* volatile grown = malloc(10);                    // row 1 10 0 0
    grown = realloc(grown, 1000);                         // row 1 1000 0 0
    grown = reallocarray(grown, 10, 300);                 // row 1 3000 1 3000
    if (realloc(grown, (size_t)-1 / 4) != NULL) abort();
    volatile size_t half = (size_t)-1 / 2;
    if (reallocarray(grown, half, 4) != NULL) abort();
    gSink = aligned_alloc(64, 128);                            // row 1 128 1 128
    gSink = memalign(32, 40);                                  // row 1 40 1 40
    if (posix_memalign((void**)&gSink, 64, 65) != 0) abort();  // row 1 65 1 65
    gSink = valloc(11);                                        // row 1 11 1 11
    gSink = strdup("twelve chars");                            // row 1 13 1 13
    free(NULL);
}

static void Disk(const char* path) {
    char text[100] = "";
    int file = open(path, O_RDWR | O_CREAT | O_TRUNC, 0644);
    if (write(file, text, 100) != 100 || lseek(file, 10, SEEK_SET) != 10 || read(file, text, 20) != 20)
        abort();
    const int copy = dup2(file, 100);
    if (pread(copy, text, 7, 0) != 7) abort();
    close(file);
    close(copy);
    // The number of the file is now a socket's, whose bytes are not a file's.
    int pair[2];
    if (socketpair(AF_UNIX, SOCK_STREAM, 0, pair) != 0 || write(pair[0], text, 50) != 50) abort();
    close(pair[0]);
    close(pair[1]);
    FILE* stream = fopen(path, "a+");  // row 1 472 0 0
    fputs("fifteen letters", stream);  // row 1 4096 0 0
    rewind(stream);
    if (fread(text, 1, 100, stream) != 100) abort();
    fclose(stream);
}

int main(int argc, char** argv) {
    if (argc != 2) return 1;
    Memory();
    Disk(argv[1]);
    const pid_t child = fork();
    if (child == 0) {
        gSink = malloc(1 << 20);
        exit(0);
    }
    waitpid(child, NULL, 0);
    fclose(stdin);
    close(1);
    close(2);
    closefrom(3);
    return 0;
}
