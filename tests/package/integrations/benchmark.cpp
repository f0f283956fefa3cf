// A benchmark that records three blocks in each iteration and keeps one.
#include <zanbase/integrations/benchmark_memory.h>

#include <zanbase/memory.h>

namespace {

void Blocks(benchmark::State& state) {
    static char blocks[3];
    for (auto iteration : state) {
        (void)iteration;
        for (char& block : blocks) HMemory::Alloc(&block, 10, "a.cpp", 1);
        for (int block : {0, 1}) HMemory::Free(&blocks[block]);
    }
    HMemory::Free(&blocks[2]);
}
BENCHMARK(Blocks)->Iterations(1);

}  // namespace

int main(int count, char** arguments) {
    benchmark::Initialize(&count, arguments);
    HBenchmarkMemory memory;
    benchmark::RegisterMemoryManager(&memory);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::RegisterMemoryManager(nullptr);
}
