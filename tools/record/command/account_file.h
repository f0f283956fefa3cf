// Reading what the preload library counts. Everything in the file is checked, so a file that is cut or wrong
// gives fewer findings, never a bad access.
#ifndef ZANBASE_RECORD_ACCOUNT_FILE_H
#define ZANBASE_RECORD_ACCOUNT_FILE_H

#include <string>
#include <vector>

#include "common/account.h"

namespace recorder {

struct Module {
    std::uint64_t start;
    std::uint64_t bias;
    std::string path;  // empty if it is not known
    std::string build_id;
};

struct Address {
    std::uint64_t offset;
    std::uint32_t module;
};

struct Node {
    std::uint32_t parent;  // below the node's own number
    std::uint32_t address;
};

// What the allocations of one stack came to.
struct StackUsage {
    NodeId node;
    std::uint64_t allocations;
    std::uint64_t allocated;
    std::uint64_t frees;
    std::uint64_t freed;
    std::uint64_t temporary;
    std::uint64_t at_peak;
};

struct OperationSum {
    std::uint64_t count;
    std::uint64_t nanoseconds;
    std::uint64_t bytes;
};

struct FileSums {
    std::string name;
    std::array<OperationSum, kDiskOperations> sums;
};

// One account, copied. Numbers of modules, addresses and nodes are indices; the first of each stands for
// none.
struct ProcessAccount {
    int process;
    int parent;
    std::int64_t started;  // nanoseconds since 1970
    std::int64_t ended;    // 0 if that was not seen
    End end;
    int status;
    bool streams_unseen;
    std::vector<std::string> arguments;
    std::uint64_t total;
    std::uint64_t peak;
    std::uint64_t lost_blocks;
    std::uint64_t lost_files;
    std::vector<Module> modules;
    std::vector<Address> addresses;
    std::vector<Node> nodes;
    std::vector<StackUsage> usage;
    std::vector<FileSums> files;
};

class AccountFile {
public:
    // Makes the file, with a Control that is filled with zeros but for its magic number. Throws
    // std::runtime_error.
    AccountFile();
    // Reads a copy of such a file.
    AccountFile(const char* image, std::size_t bytes) : mpcImage(const_cast<char*>(image)), mnBytes(bytes) {}
    ~AccountFile();
    AccountFile(const AccountFile&) = delete;
    AccountFile& operator=(const AccountFile&) = delete;

    Control& control() { return *reinterpret_cast<Control*>(mpcImage); }
    int descriptor() const { return mnDescriptor; }

    // The positions of all accounts, the first one that was added first.
    std::vector<Position> Accounts();

    // Brings `account` up to date with what is at `position`: the modules, addresses and nodes that were
    // added since the last call.
    void ReadStacks(Position position, ProcessAccount& account);
    // And everything else.
    void Read(Position position, ProcessAccount& account);

    // Marks the last frame of `node` as the one that is credited.
    void MarkStop(Position position, NodeId node);

private:
    // Maps what was taken of the file since. No pointer into it stays valid.
    void Refresh();
    // `count` objects at `position`, or null if they are not all in the file.
    template <class Object>
    Object* At(Position position, std::uint64_t count = 1);
    template <class Table>
    typename Table::Row* RowOf(const Table& table, std::uint64_t row);
    std::string TextAt(const TextPlace& place);
    void ReadUsage(const Account& from, ProcessAccount& account);
    void ReadFiles(const Account& from, ProcessAccount& account);

    int mnDescriptor = -1;
    char* mpcImage = nullptr;
    std::size_t mnBytes = 0;
};

}  // namespace recorder

#endif
