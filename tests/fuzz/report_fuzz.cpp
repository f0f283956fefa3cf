// Any file as a report in JSON: it is read whole, or refused by the exception that the command prints.
#include "compare.h"

#include <stdexcept>

#include "input_file.h"

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    const InputFile input(data, size);
    try {
        const recorder::Accounts accounts = recorder::ReadAccounts(input.Path());
        static_cast<void>(recorder::Compare({}, accounts, 1));
    } catch (const std::runtime_error&) {
    }
    return 0;
}
