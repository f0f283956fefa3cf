// The C library's streams. Their calls of the kernel don't go through any function that can be replaced, but
// through two tables of the library that it exports; the entries for reading, writing, seeking and closing
// are replaced there. So each inner call is counted once, whatever made the stream. Opens are counted by
// hooks of the functions.
#include <cstdint>
#include <cstdio>

#include <dlfcn.h>
#include <sys/mman.h>
#include <unistd.h>

#include "disk_operation.h"
#include "next_function.h"

namespace recorder {
namespace {

NextFunction<ssize_t(std::FILE*, void*, ssize_t)> gFileRead{"_IO_file_read"};
NextFunction<ssize_t(std::FILE*, const void*, ssize_t)> gFileWrite{"_IO_file_write"};
NextFunction<off64_t(std::FILE*, off64_t, int)> gFileSeek{"_IO_file_seek"};
NextFunction<int(std::FILE*)> gFileClose{"_IO_file_close"};

ssize_t ReadStream(std::FILE* stream, void* to, ssize_t bytes) {
    return Operate(DiskOperation::kRead, stream->_fileno, [&] { return gFileRead(stream, to, bytes); });
}

ssize_t WriteStream(std::FILE* stream, const void* from, ssize_t bytes) {
    return Operate(DiskOperation::kWrite, stream->_fileno, [&] { return gFileWrite(stream, from, bytes); });
}

off64_t SeekStream(std::FILE* stream, off64_t place, int from) {
    return Operate(DiskOperation::kSeek, stream->_fileno, [&] { return gFileSeek(stream, place, from); });
}

int CloseStream(std::FILE* stream) {
    FileRow* const file = Wants(kDisk) ? ForgetDescriptor(stream->_fileno) : nullptr;
    if (file == nullptr) return gFileClose(stream);
    const std::uint64_t start = Now();
    const int result = gFileClose(stream);
    CountOperation(*file, DiskOperation::kClose, 0, Now() - start);
    return result;
}

template <class Function, class... Arguments>
std::FILE* OpenStream(NextFunction<Function>& next, const char* path, Arguments... arguments) {
    const auto descriptor_of = [](std::FILE* stream) { return stream != nullptr ? stream->_fileno : -1; };
    const bool sees_close = HookStreams();
    std::FILE* const opened = Open(
        path, [&] { return next(arguments...); }, descriptor_of);
    if (!sees_close) ForgetDescriptor(descriptor_of(opened));
    return opened;
}

using Entry = void (*)();
constexpr std::size_t kFirstSlot = 14;  // read, write, seek and close stand one after the other
constexpr std::size_t kSlots = 4;

template <class Function>
Entry AsEntry(Function* function) {
    return reinterpret_cast<Entry>(function);
}

bool ReplaceEntries(const char* table_name) {
    const RecursionGuard guard;
    auto* const table = static_cast<Entry*>(dlsym(RTLD_NEXT, table_name));
    if (table == nullptr) return false;
    const Entry expected[kSlots] = {AsEntry(gFileRead.Get()), AsEntry(gFileWrite.Get()),
                                    AsEntry(gFileSeek.Get()), AsEntry(gFileClose.Get())};
    const Entry ours[kSlots] = {AsEntry(&ReadStream), AsEntry(&WriteStream), AsEntry(&SeekStream),
                                AsEntry(&CloseStream)};
    Entry* const entries = table + kFirstSlot;
    for (std::size_t i = 0; i < kSlots; ++i)
        if (entries[i] != expected[i]) return false;
    const auto page = static_cast<std::uintptr_t>(sysconf(_SC_PAGESIZE));
    const auto first = reinterpret_cast<std::uintptr_t>(entries) & ~(page - 1);
    const std::size_t bytes = reinterpret_cast<std::uintptr_t>(entries + kSlots) - first;
    if (mprotect(reinterpret_cast<void*>(first), bytes, PROT_READ | PROT_WRITE) != 0) return false;
    for (std::size_t i = 0; i < kSlots; ++i) entries[i] = ours[i];
    mprotect(reinterpret_cast<void*>(first), bytes, PROT_READ);  // the loader had made it read-only
    return true;
}

}  // namespace

bool HookStreams() {
    static const bool hooked = ReplaceEntries("_IO_file_jumps") && ReplaceEntries("_IO_wfile_jumps");
    return hooked;
}

}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

#define ZANBASE_STREAM(name, path, parameters, ...) \
    ZANBASE_HOOK(std::FILE*, name, parameters, ) { return OpenStream(next::name, path, __VA_ARGS__); }

ZANBASE_STREAM(fopen, path, (const char* path, const char* mode), path, mode)
ZANBASE_STREAM(fopen64, path, (const char* path, const char* mode), path, mode)
ZANBASE_STREAM(freopen, path, (const char* path, const char* mode, std::FILE* stream), path, mode, stream)
ZANBASE_STREAM(freopen64, path, (const char* path, const char* mode, std::FILE* stream), path, mode, stream)
ZANBASE_HOOK(std::FILE*, tmpfile, (), ) { return OpenStream(next::tmpfile, nullptr); }
ZANBASE_HOOK(std::FILE*, tmpfile64, (), ) { return OpenStream(next::tmpfile64, nullptr); }
