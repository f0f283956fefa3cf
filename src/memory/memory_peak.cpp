// The tracker's peak, as budgets use it.
#include <algorithm>
#include <cstddef>
#include <utility>

#include "zanbase/account_data.h"
#include "zanbase/memory.h"

namespace {

class Peak : public HMemory {
public:
    static std::size_t Restart(std::size_t& total) {
        const HMutexLock lock(&moMutex);
        total = mnTotalMemory;
        return std::exchange(mnPeekMemory, mnTotalMemory);
    }

    static void Raise(std::size_t peak) {
        const HMutexLock lock(&moMutex);
        mnPeekMemory = std::max(mnPeekMemory, peak);
    }
};

}  // namespace

long long HRestartMemoryPeak(long long* total) noexcept {
    std::size_t current = 0;
    const std::size_t peak = Peak::Restart(current);
    *total = static_cast<long long>(current);
    return static_cast<long long>(peak);
}

void HRaiseMemoryPeak(long long peak) noexcept { Peak::Raise(static_cast<std::size_t>(peak)); }
