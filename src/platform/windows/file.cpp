// Files as the C runtime has them, by its wide functions: the others read names in the process's code page.
#include "platform/file.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <io.h>
#include <sys/stat.h>

#include "platform/windows/wide_name.h"

namespace {

constexpr std::size_t kLargest = std::size_t{1} << 30;  // the runtime counts in unsigned int

unsigned int Piece(std::size_t size) { return static_cast<unsigned int>(std::min(size, kLargest)); }

// The flags of a mode of std::fopen.
int FlagsOf(const char* mode) {
    const bool updates = std::strchr(mode, '+') != nullptr;
    const int access = updates ? _O_RDWR : *mode == 'r' ? _O_RDONLY : _O_WRONLY;
    const int creation = *mode == 'r' ? 0 : *mode == 'w' ? _O_CREAT | _O_TRUNC : _O_CREAT | _O_APPEND;
    const int exclusive = std::strchr(mode, 'x') != nullptr ? _O_EXCL : 0;
    const int translation = std::strchr(mode, 'b') != nullptr ? _O_BINARY : _O_TEXT;
    return access | creation | exclusive | translation | _O_NOINHERIT;
}

}  // namespace

int OpenDescriptor(const char* name, int flags, int permissions, bool is_inherited) {
    const std::wstring wide = WideName(name);
    if (wide.empty()) return -1;
    return _wopen(wide.c_str(), flags | _O_BINARY | (is_inherited ? 0 : _O_NOINHERIT),
                  permissions & (_S_IREAD | _S_IWRITE));
}

long long ReadDescriptor(int file, void* block, std::size_t size) { return _read(file, block, Piece(size)); }

long long WriteDescriptor(int file, const void* block, std::size_t size) {
    return _write(file, block, Piece(size));
}

long long WriteDescriptorTwo(int file, const void* first, std::size_t first_size, const void* second,
                             std::size_t second_size) {
    const long long written = WriteDescriptor(file, first, first_size);
    if (written < 0 || static_cast<std::size_t>(written) < first_size) return written;
    const long long further = WriteDescriptor(file, second, second_size);
    if (further >= 0) return written + further;
    return written != 0 ? written : -1;
}

long long SeekDescriptor(int file, long long offset, int origin) { return _lseeki64(file, offset, origin); }

int CloseDescriptor(int file) { return _close(file); }

// Not _wfopen: msvcrt's ignores 'x' and would overwrite the file.
std::FILE* OpenStream(const char* name, const char* mode) {
    const std::wstring wide = WideName(name);
    if (wide.empty()) return nullptr;
    const int file = _wopen(wide.c_str(), FlagsOf(mode), _S_IREAD | _S_IWRITE);
    if (file < 0) return nullptr;
    const bool updates = std::strchr(mode, '+') != nullptr;
    const bool is_binary = std::strchr(mode, 'b') != nullptr;
    const char form[] = {*mode, is_binary ? 'b' : 't', updates ? '+' : '\0', '\0'};
    std::FILE* const stream = _fdopen(file, form);
    if (stream == nullptr) _close(file);
    return stream;
}

// The runtime does not show how much lies in a stream's buffer, so after an error no byte is certain.
std::size_t WriteStream(std::FILE* stream, const void* block, std::size_t size) {
    const std::size_t count = std::fwrite(block, 1, size, stream);
    return std::ferror(stream) != 0 ? 0 : count;
}

long long SeekStream(std::FILE* stream, long long offset, int origin) {
    return _fseeki64(stream, offset, origin) == 0 ? _ftelli64(stream) : -1;
}
