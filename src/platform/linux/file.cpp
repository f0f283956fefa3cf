// Files as POSIX has them. The C library's calls already have 64-bit positions: the system is 64-bit Linux.
#include "platform/file.h"

#include <cstring>
#include <string>

#include <fcntl.h>
#include <stdio_ext.h>
#include <sys/uio.h>
#include <unistd.h>

static_assert(sizeof(off_t) == sizeof(long long));

int OpenDescriptor(const char* name, int flags, int permissions, bool is_inherited) {
    return open(name, is_inherited ? flags : flags | O_CLOEXEC, permissions);
}

long long ReadDescriptor(int file, void* block, std::size_t size) { return read(file, block, size); }

long long WriteDescriptor(int file, const void* block, std::size_t size) { return write(file, block, size); }

long long WriteDescriptorTwo(int file, const void* first, std::size_t first_size, const void* second,
                             std::size_t second_size) {
    // writev only reads the blocks; its structure is the one of readv.
    const iovec blocks[] = {{const_cast<void*>(first), first_size}, {const_cast<void*>(second), second_size}};
    return writev(file, blocks, 2);
}

long long SeekDescriptor(int file, long long offset, int origin) { return lseek(file, offset, origin); }

int CloseDescriptor(int file) { return close(file); }

// The C library reads the letter for O_CLOEXEC among the first few of the mode.
std::FILE* OpenStream(const char* name, const char* mode) {
    return std::fopen(name, (std::string(mode, 1) + 'e' + (mode + 1)).c_str());
}

// fwrite first fills the buffer, then writes it, then writes whole blocks of the rest past the buffer, and then keeps what
// is left. Where it keeps bytes until the end of a line only the last step can fail, and otherwise only the third can
// fail with the earlier bytes safe. So a count beyond the room in the buffer is certain, and of a lower one nothing is.
std::size_t WriteStream(std::FILE* stream, const void* block, std::size_t size) {
    const std::size_t buffer = __fbufsize(stream);
    const std::size_t room = buffer > 1 ? buffer - __fpending(stream) : 0;  // 1: unbuffered
    const std::size_t count = std::fwrite(block, 1, size, stream);
    return std::ferror(stream) != 0 && (count <= room || __flbf(stream) != 0) ? 0 : count;
}

long long SeekStream(std::FILE* stream, long long offset, int origin) {
    return fseeko(stream, offset, origin) == 0 ? ftello(stream) : -1;
}
