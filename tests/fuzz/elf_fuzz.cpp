// Any file as an ELF file: every read of its tables stays in the file.
#include "elf_file.h"

#include "input_file.h"

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    const InputFile input(data, size);
    const recorder::ElfFile file(input.Path().c_str());
    if (!file.ok()) return 0;
    static_cast<void>(file.HasInterpreter());
    static_cast<void>(file.NeededLibraries());
    for (const bool dynamic_only : {false, true}) {
        file.ForEachFunction(dynamic_only, [](const char* name, std::uint64_t, std::uint64_t) {
            if (std::string(name).size() > 1U << 20) std::abort();  // longer than any input
        });
    }
    return 0;
}
