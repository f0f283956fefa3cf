// Reading an ELF file. A file that is cut or wrong gives fewer findings, never a bad access.
#include "elf_file.h"

#include <cstring>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace recorder {

ElfFile::ElfFile(const char* path) {
    const int file = open(path, O_RDONLY | O_CLOEXEC);
    if (file < 0) return;
    struct stat status {};
    if (fstat(file, &status) == 0 && S_ISREG(status.st_mode) && status.st_size > 0) {
        const auto size = static_cast<std::size_t>(status.st_size);
        void* const image = mmap(nullptr, size, PROT_READ, MAP_PRIVATE, file, 0);
        if (image != MAP_FAILED) {
            mpcImage = static_cast<char*>(image);
            mnImageBytes = size;
        }
    }
    close(file);
    const auto* const header = At<Elf64_Ehdr>(0);
    if (header == nullptr || std::memcmp(header->e_ident, ELFMAG, SELFMAG) != 0 ||
        header->e_ident[EI_CLASS] != ELFCLASS64 || header->e_shentsize != sizeof(Elf64_Shdr))
        return;
    mpoHeader = header;
}

ElfFile::~ElfFile() {
    if (mpcImage != nullptr) munmap(mpcImage, mnImageBytes);
}

template <class Object>
const Object* ElfFile::At(std::uint64_t offset, std::uint64_t count) const {
    if (offset > mnImageBytes || offset % alignof(Object) != 0 ||
        count > (mnImageBytes - offset) / sizeof(Object))
        return nullptr;
    return reinterpret_cast<const Object*>(mpcImage + offset);
}

const Elf64_Phdr* ElfFile::Segments() const { return At<Elf64_Phdr>(mpoHeader->e_phoff, mpoHeader->e_phnum); }

const Elf64_Shdr* ElfFile::Sections() const { return At<Elf64_Shdr>(mpoHeader->e_shoff, mpoHeader->e_shnum); }

const Elf64_Shdr* ElfFile::FindSection(std::uint32_t type) const {
    const Elf64_Shdr* const sections = Sections();
    if (sections == nullptr) return nullptr;
    for (unsigned int i = 0; i < mpoHeader->e_shnum; ++i)
        if (sections[i].sh_type == type) return &sections[i];
    return nullptr;
}

const char* ElfFile::TextAt(const Elf64_Shdr& strings, std::uint64_t offset) const {
    if (offset >= strings.sh_size || At<char>(strings.sh_offset, strings.sh_size) == nullptr) return "";
    const char* const text = At<char>(strings.sh_offset + offset);
    return std::memchr(text, 0, strings.sh_size - offset) != nullptr ? text : "";
}

bool ElfFile::HasInterpreter() const {
    const Elf64_Phdr* const segments = Segments();
    for (unsigned int i = 0; segments != nullptr && i < mpoHeader->e_phnum; ++i)
        if (segments[i].p_type == PT_INTERP) return true;
    return false;
}

std::vector<std::string> ElfFile::NeededLibraries() const {
    std::vector<std::string> libraries;
    const Elf64_Shdr* const dynamic = FindSection(SHT_DYNAMIC);
    if (dynamic == nullptr || dynamic->sh_link >= mpoHeader->e_shnum) return libraries;
    const std::uint64_t count = dynamic->sh_size / sizeof(Elf64_Dyn);
    const auto* const entries = At<Elf64_Dyn>(dynamic->sh_offset, count);
    for (std::uint64_t i = 0; entries != nullptr && i < count; ++i)
        if (entries[i].d_tag == DT_NEEDED)
            libraries.emplace_back(TextAt(Sections()[dynamic->sh_link], entries[i].d_un.d_val));
    return libraries;
}

void ElfFile::ForEachFunction(
    bool dynamic_only, const std::function<void(const char*, std::uint64_t, std::uint64_t)>& use) const {
    const Elf64_Shdr* symbols = dynamic_only ? nullptr : FindSection(SHT_SYMTAB);
    if (symbols == nullptr) symbols = FindSection(SHT_DYNSYM);
    if (symbols == nullptr || symbols->sh_link >= mpoHeader->e_shnum) return;
    const std::uint64_t count = symbols->sh_size / sizeof(Elf64_Sym);
    const auto* const all = At<Elf64_Sym>(symbols->sh_offset, count);
    for (std::uint64_t i = 0; all != nullptr && i < count; ++i) {
        const unsigned int type = ELF64_ST_TYPE(all[i].st_info);
        if (all[i].st_shndx != SHN_UNDEF && (type == STT_FUNC || type == STT_GNU_IFUNC))
            use(TextAt(Sections()[symbols->sh_link], all[i].st_name), all[i].st_value, all[i].st_size);
    }
}

}  // namespace recorder
