// Writes the accounts for other programs to read, and reads its JSON back.
#include <zanbase/integrations/pprof.h>
#include <zanbase/integrations/snapshot_json.h>
#include <zanbase/snapshot_text.h>

#include <cmath>
#include <cstdlib>
#include <fstream>
#include <limits>
#include <sstream>

namespace {

void Require(bool holds) {
    if (!holds) std::abort();
}

const HMemorySnapshot kMemory{{{"/src/\"a\\ b\".cpp", 7, 1, 64, 96, 32, 2, 1},
                               {"/src/\"a\\ b\".cpp", 7, 1, 6, 6, 0, 1, 0},
                               {"lone \x80", 3, 2, 1LL << 40, 1LL << 41, 8, 3, 1}},
                              (1LL << 40) + 70,
                              1LL << 41,
                              1750000000.25,
                              4711};
const HDiskIOSnapshot kDiskIO{
    {{"run\n.dat", {1, 0.1, 0}, {2, 1e-9, 0}, {3, 4, 0}, {5, 1e300, 1LL << 62}, {}}}};
const GlobalTimerSnapshot kTimers{{{"load", 1.5, {1, 0.5}, 0.25}, {"load", 2, {2}}}};

bool Reads(const std::string& text, HSnapshots& snapshots) {
    std::istringstream stream(text);
    std::string error;
    const bool is_read = HReadJson(stream, snapshots, error);
    Require(is_read == error.empty());
    return is_read;
}

void ReadBack() {
    std::ostringstream text;
    HSnapshots read;
    Require(HWriteJson(text, &kMemory, &kDiskIO, &kTimers) && Reads(text.str(), read));
    Require(*read.moMemory == kMemory && *read.moDiskIO == kDiskIO && *read.moTimers == kTimers);
    Require(read.moMemory->mdTime == kMemory.mdTime && read.moMemory->mnProcess == 4711);
    std::ostringstream lost;
    HWriteJson(lost, GlobalTimerSnapshot{{{"lost", std::numeric_limits<double>::infinity(), {}}}});
    Require(Reads(lost.str(), read) && std::isnan(read.moTimers->maRows[0].mdSeconds) && !read.moMemory);
    const std::string wrong[] = {
        "",
        "{}",
        R"({"schema":"zanbase-snapshot","version":2})",
        R"({"schema":"another","version":1})",
        R"({"schema":"zanbase-snapshot","version":1,"timers":{"rows":[{"name":7}]}})",
        R"({"schema":"zanbase-snapshot","version":1,"memory":{"total":1.5,"peak":0,"rows":[]}})",
        text.str() + "x"};
    for (const std::string& document : wrong) Require(!Reads(document, read) && read.moTimers);
}

}  // namespace

int main(int, char** arguments) {
    ReadBack();
    const std::string folder = arguments[1];
    std::ofstream metrics(folder + "/metrics", std::ios::binary);
    std::ofstream profile(folder + "/memory.pb.gz", std::ios::binary);
    std::ofstream full("/dev/full", std::ios::binary);
    Require(HWriteOpenMetrics(metrics, &kMemory, &kDiskIO, &kTimers));
    Require(HWritePprof(profile, kMemory) && !HWritePprof(full, kMemory));
    return 0;
}
