// Ownership of a file descriptor, and descriptors that keep clear of the standard streams.
#ifndef ZANBASE_PLATFORM_LINUX_DESCRIPTOR_H
#define ZANBASE_PLATFORM_LINUX_DESCRIPTOR_H

#include <utility>

#include <fcntl.h>
#include <unistd.h>

// Owns a descriptor and closes it in the destructor; -1 is none.
class Descriptor {
public:
    explicit Descriptor(int descriptor) noexcept : mnDescriptor(descriptor) {}
    ~Descriptor() { Close(); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;

    int Get() const noexcept { return mnDescriptor; }
    int Release() noexcept { return std::exchange(mnDescriptor, -1); }
    void Close() noexcept {
        if (mnDescriptor >= 0) close(Release());
    }

private:
    int mnDescriptor;
};

// Moves an open descriptor above those of the standard streams, even if one of those is free: a file there would
// be taken for the stream's. Returns the descriptor, closed on exec if it was moved, or -1 on failure.
inline int MoveAboveStreams(int descriptor) noexcept {
    Descriptor opened(descriptor);
    if (opened.Get() > STDERR_FILENO) return opened.Release();
    return fcntl(opened.Get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
}

// Opens `path` for reading and writing on a descriptor above those of the standard streams. The descriptor is
// closed on exec. The file never becomes the controlling terminal. -1 on failure.
inline int OpenAboveStreams(const char* path) noexcept {
    return MoveAboveStreams(open(path, O_RDWR | O_NOCTTY | O_CLOEXEC));
}

#endif
