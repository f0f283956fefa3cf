// The recorder's parts that need no recorded program: the memory account against a model, as the command
// reads it, also from files that are damaged, and the command line.
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <new>
#include <random>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "command/account_file.h"
#include "command/options.h"
#include "preload/block_table.h"
#include "preload/shared_memory.h"

namespace {

using recorder::NodeId;

constexpr NodeId kNodes = 1200;

const void* BlockAt(std::uint64_t address) { return reinterpret_cast<const void*>(address); }

// An account as a recorded process has it, in a file as the command has it. There is one, since a process has
// one.
struct Fixture {
    recorder::AccountFile file;
    recorder::Account* account = nullptr;
    recorder::Position position = 0;

    Fixture() {
        recorder::MapControl(file.descriptor());
        account = recorder::TakeAccount(position);
        account->nodes.count = kNodes;
        file.control().newest = position;
    }
    static Fixture& Get() {
        static auto* const fixture = new Fixture;
        return *fixture;
    }
    recorder::StackUsage Usage(NodeId node) {
        recorder::ProcessAccount read{};
        file.Read(position, read);
        for (const recorder::StackUsage& usage : read.usage)
            if (usage.node == node) return usage;
        return {};
    }
};

// Random records and drops in a range of addresses that is small enough for chains and for blocks that come
// back.
void CheckAgainstModel(std::uint64_t first, NodeId first_node) {
    recorder::Account& account = *Fixture::Get().account;
    std::map<std::uint64_t, std::pair<std::size_t, NodeId>> live;
    std::map<NodeId, recorder::StackUsage> expected;
    std::mt19937 random(first_node);
    for (int i = 0; i < 40000; ++i) {
        const std::uint64_t address = first + 8 * (random() % 2000);
        const NodeId node = first_node + static_cast<NodeId>(random() % 3);
        const std::size_t size = random() % 100;
        const auto block = live.find(address);
        if (block != live.end()) {
            ++expected[block->second.second].frees;
            expected[block->second.second].freed += block->second.first;
        }
        if (random() % 8 < 5) {
            recorder::AddBlock(account, BlockAt(address), size, node);
            live[address] = {size, node};
            ++expected[node].allocations;
            expected[node].allocated += size;
        } else {
            ASSERT_EQ(recorder::DropBlock(account, BlockAt(address), false).found, block != live.end());
            live.erase(address);
        }
    }
    for (const auto& [address, block] : live)
        EXPECT_EQ(recorder::DropBlock(account, BlockAt(address), false).size, block.first);
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    for (const auto& [node, usage] : expected) {
        const recorder::StackUsage found = Fixture::Get().Usage(node);
        EXPECT_EQ(found.allocations, usage.allocations);
        EXPECT_EQ(found.frees, usage.allocations);
        EXPECT_EQ(found.allocated, usage.allocated);
        EXPECT_EQ(found.freed, usage.allocated);
    }
}

TEST(RecordBlockTable, KeepsEveryBlockOfThreadsThatShareShards) {
    std::vector<std::thread> threads;
    for (unsigned int part = 0; part < 4; ++part)
        threads.emplace_back(CheckAgainstModel, 0x7f0000000000 + part * 0x100000L, 1 + 250 * part);
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(Fixture::Get().account->total, 0U);
}

TEST(RecordBlockTable, TakesBackTheDropOfAFailedReallocation) {
    recorder::Account& account = *Fixture::Get().account;
    recorder::AddBlock(account, BlockAt(64), 10, 1100);
    recorder::RestoreBlock(account, BlockAt(64), recorder::DropBlock(account, BlockAt(64), false));
    EXPECT_EQ(Fixture::Get().Usage(1100).allocations, 1U);
    EXPECT_EQ(Fixture::Get().Usage(1100).frees, 0U);
    EXPECT_EQ(recorder::DropBlock(account, BlockAt(64), false).size, 10U);
}

TEST(RecordBlockTable, KnowsWhatWasLiveAtThePeakByStack) {
    recorder::Account& account = *Fixture::Get().account;
    constexpr std::size_t kLarge = 1 << 30;  // above the peak that the other tests reach
    recorder::AddBlock(account, BlockAt(64), kLarge, 1101);
    recorder::AddBlock(account, BlockAt(128), 20, 1102);
    recorder::DropBlock(account, BlockAt(64), true);
    recorder::AddBlock(account, BlockAt(192), 30, 1102);
    EXPECT_EQ(account.peak, kLarge + 20);
    EXPECT_EQ(Fixture::Get().Usage(1101).at_peak, kLarge);
    EXPECT_EQ(Fixture::Get().Usage(1101).temporary, 1U);
    EXPECT_EQ(Fixture::Get().Usage(1102).at_peak, 20U);
    recorder::DropBlock(account, BlockAt(128), false);
    recorder::DropBlock(account, BlockAt(192), false);
}

// Under the address sanitizer each bad access would show.
TEST(RecordAccountFile, IsReadWhateverIsWrongInIt) {
    Fixture& fixture = Fixture::Get();
    recorder::AddBlock(*fixture.account, BlockAt(64), 10, 1);
    ASSERT_EQ(fixture.file.Accounts().size(), 1U);  // maps all of the file
    const std::size_t bytes = fixture.file.control().end;
    struct Release {
        void operator()(char* image) const { ::operator delete(image, std::align_val_t(4096)); }
    };
    const std::unique_ptr<char, Release> image(
        static_cast<char*>(::operator new(bytes, std::align_val_t(4096))));
    std::mt19937_64 random(7);
    for (int round = 0; round < 200; ++round) {
        std::memcpy(image.get(), &fixture.file.control(), bytes);
        for (int change = 0; change < 40; ++change) {
            // Most of the file is empty; the account's first fields and tables are not.
            const std::size_t at = random() % 2 == 0
                                       ? random() % (bytes / 8)
                                       : (fixture.position + random() % sizeof(recorder::Account)) / 8;
            const std::uint64_t value = random() % 2 == 0 ? random() : random() % (2 * bytes);
            std::memcpy(image.get() + at * 8, &value, sizeof value);
        }
        recorder::AccountFile file(image.get(), round % 4 == 0 ? random() % bytes : bytes);
        for (const recorder::Position position : file.Accounts()) {
            recorder::ProcessAccount account{};
            file.Read(position, account);
            for (std::size_t i = 0; i < account.nodes.size(); ++i) {
                ASSERT_LE(account.nodes[i].parent, i);
                ASSERT_LE(account.nodes[i].address, account.addresses.size());
            }
        }
    }
    recorder::DropBlock(*fixture.account, BlockAt(64), false);
}

TEST(RecordOptions, RefusesWhatItDoesNotUnderstand) {
    const std::vector<std::string> calls[] = {{},
                                              {"--output"},
                                              {"--bogus", "program"},
                                              {"--json", "--csv", "program"},
                                              {"--stacks", "64", "program"},
                                              {"--every", "0", "program"},
                                              {"--max-peak", "12X", "program"},
                                              {"--max-peak", "-1", "program"},
                                              {"--max-peak", "9999999999G", "program"},
                                              {"--signal", "SEGV", "program"},
                                              {"--signal", "KILL", "program"}};
    for (const auto& call : calls) EXPECT_THROW(recorder::ReadRunOptions(call), recorder::UsageError);
    const auto options =
        recorder::ReadRunOptions({"--disk", "-o", "/file", "--max-read=2K", "--", "--program", "--json"});
    EXPECT_EQ(options.budgets.read_bytes, 2048);
    EXPECT_EQ(options.output, "/file");
    EXPECT_FALSE(options.memory);
    EXPECT_EQ(options.program, (std::vector<std::string>{"--program", "--json"}));
}

}  // namespace
