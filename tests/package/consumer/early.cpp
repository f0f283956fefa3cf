// Another shared library, whose static initialiser already calls in: every object behind these calls must
// stand.
#include <zanbase/zanbase.h>

#include <cstring>

bool worked_at_load = [] {
    static int block;
    HMemory::Alloc(&block, sizeof block, __FILE__, __LINE__);
    HMemory::Free(&block);
    return std::strcmp(MkName(42), "42") == 0 && std::strcmp(_("early"), "early") == 0;
}();
