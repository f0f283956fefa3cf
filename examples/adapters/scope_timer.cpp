// Times two phases of a sum over a team of threads. The timers print themselves when the process ends.
#include <zanbase/adapters/scope_timer.h>

#include <cstdio>
#include <vector>

namespace {

void Fill(std::vector<double>& values) {
    HTimedRegion("fill");
    for (double& value : values) value = 0.5;
}

double Sum(const std::vector<double>& values) {
    double sum = 0;
#pragma omp parallel for reduction(+ : sum)
    for (std::size_t block = 0; block < values.size(); block += 1000) {
        HTimedRegion("sum");
        for (std::size_t index = block; index < block + 1000; ++index) sum += values[index];
    }
    return sum;
}

}  // namespace

int main() {
    const HTimerScope whole(HTimerNamed("whole"));
    std::vector<double> values(100000);
    Fill(values);
    std::printf("sum %g\n", Sum(values));
    return 0;
}
