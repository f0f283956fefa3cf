// The recorder's parts that need no recorded program: the memory account against a model, and the command
// line.
#include <map>
#include <random>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "command/options.h"
#include "preload/block_table.h"

namespace {

using recorder::AddBlock;
using recorder::DropBlock;
using recorder::SiteId;
using recorder::SiteUsage;

const void* BlockAt(std::uint64_t address) { return reinterpret_cast<const void*>(address); }

// Random records and drops in a range of addresses that is small enough for chains and for blocks that come
// back.
void CheckAgainstModel(std::uint64_t first, SiteId first_site) {
    std::map<std::uint64_t, std::pair<std::size_t, SiteId>> live;
    std::map<SiteId, SiteUsage> usage;
    std::mt19937 random(first_site);
    for (int i = 0; i < 40000; ++i) {
        const std::uint64_t address = first + 8 * (random() % 2000);
        const SiteId site = first_site + static_cast<SiteId>(random() % 3);
        const std::size_t size = random() % 100;
        const auto block = live.find(address);
        const bool adds = random() % 8 < 5;
        if (block != live.end()) {
            ++usage[block->second.second].frees;
            usage[block->second.second].freed_bytes += block->second.first;
        }
        if (adds) {
            AddBlock(BlockAt(address), size, site);
            live[address] = {size, site};
            ++usage[site].allocations;
            usage[site].allocated_bytes += size;
        } else {
            ASSERT_EQ(DropBlock(BlockAt(address)).found, block != live.end());
            live.erase(address);
        }
    }
    for (const auto& [site, expected] : usage) {
        const SiteUsage found = recorder::UsageOfSite(site);
        EXPECT_EQ(found.allocations, expected.allocations);
        EXPECT_EQ(found.frees, expected.frees);
        EXPECT_EQ(found.allocated_bytes, expected.allocated_bytes);
        EXPECT_EQ(found.freed_bytes, expected.freed_bytes);
    }
    for (const auto& [address, block] : live) EXPECT_EQ(DropBlock(BlockAt(address)).size, block.first);
}

TEST(RecordBlockTable, KeepsEveryBlockOfThreadsThatShareShards) {
    std::vector<std::thread> threads;
    for (unsigned int part = 0; part < 4; ++part)
        threads.emplace_back(CheckAgainstModel, 0x7f0000000000 + part * 0x100000L, 100 * part);
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(recorder::TotalBytes(), 0U);
    EXPECT_GT(recorder::PeakBytes(), 0U);
}

TEST(RecordBlockTable, TakesBackTheDropOfAFailedReallocation) {
    AddBlock(BlockAt(64), 10, 1000);
    recorder::RestoreBlock(BlockAt(64), DropBlock(BlockAt(64)));
    EXPECT_EQ(recorder::UsageOfSite(1000).allocations, 1U);
    EXPECT_EQ(recorder::UsageOfSite(1000).frees, 0U);
    EXPECT_EQ(DropBlock(BlockAt(64)).size, 10U);
}

TEST(RecordOptions, RefusesWhatItDoesNotUnderstand) {
    const std::vector<std::string> calls[] = {{},
                                              {"--output"},
                                              {"--bogus", "program"},
                                              {"--max-peak", "12X", "program"},
                                              {"--max-peak", "-1", "program"},
                                              {"--max-peak", "9999999999G", "program"},
                                              {"--signal", "KILL", "program"}};
    for (const auto& call : calls) EXPECT_THROW(recorder::ReadRunOptions(call), recorder::UsageError);
    const auto options =
        recorder::ReadRunOptions({"--disk", "--max-read", "2K", "--", "--program", "--json"});
    EXPECT_EQ(options.settings.budgets.read_bytes, 2048);
    EXPECT_FALSE(options.settings.memory);
    EXPECT_EQ(options.program, (std::vector<std::string>{"--program", "--json"}));
}

}  // namespace
