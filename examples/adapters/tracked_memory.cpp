// Containers and an object whose memory is recorded by adapters. Prints what is live at each line.
#include <zanbase/adapters/tracked_memory.h>

#include <cstdio>
#include <memory_resource>
#include <string>
#include <vector>

namespace {

struct Shape {
    virtual ~Shape() = default;
};

struct Circle : Shape {
    explicit Circle(double radius) : mdRadius(radius) {}
    double mdRadius;
};

}  // namespace

int main() {
    HTrackedResource memory;
    std::pmr::vector<int> numbers(&memory);
    numbers.resize(1000);

    std::vector<double, HTrackedAllocator<double>> weights(HCallSite::Here());
    weights.resize(100);

    const HTrackedPtr<Shape> shape = HMakeTracked<Circle>(HCallSite::Here(), 2.5);

    HMemory::LeakReport(stdout);
    return 0;
}
