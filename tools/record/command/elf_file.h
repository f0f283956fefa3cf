// An ELF file of this machine's class, mapped and read with every offset checked: what the command looks at
// before a run.
#ifndef ZANBASE_RECORD_ELF_FILE_H
#define ZANBASE_RECORD_ELF_FILE_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include <elf.h>

namespace recorder {

class ElfFile {
public:
    // `ok()` states whether the file at `path` could be read as an ELF file of this machine's class.
    explicit ElfFile(const char* path);
    ~ElfFile();
    ElfFile(const ElfFile&) = delete;
    ElfFile& operator=(const ElfFile&) = delete;

    bool ok() const { return mpoHeader != nullptr; }

    bool HasInterpreter() const;

    // The names of the libraries that the file is linked against.
    std::vector<std::string> NeededLibraries() const;

    // Calls `use` with the name, address and size of every function that the file defines; `dynamic_only`
    // leaves out those that the loader doesn't see.
    void ForEachFunction(bool dynamic_only,
                         const std::function<void(const char*, std::uint64_t, std::uint64_t)>& use) const;

private:
    // `count` objects at `offset`, or null if they are not all in the file or not aligned.
    template <class Object>
    const Object* At(std::uint64_t offset, std::uint64_t count = 1) const;
    const Elf64_Phdr* Segments() const;
    const Elf64_Shdr* Sections() const;
    const Elf64_Shdr* FindSection(std::uint32_t type) const;
    const char* TextAt(const Elf64_Shdr& strings, std::uint64_t offset) const;

    char* mpcImage = nullptr;
    std::size_t mnImageBytes = 0;
    const Elf64_Ehdr* mpoHeader = nullptr;
};

}  // namespace recorder

#endif
