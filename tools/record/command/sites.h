// Call sites: which frame of a stack is credited with what it allocated, and how it is named.
#ifndef ZANBASE_RECORD_SITES_H
#define ZANBASE_RECORD_SITES_H

#include <map>
#include <set>
#include <string>
#include <unordered_map>
#include <vector>

#include "account_file.h"
#include "source_lines.h"

namespace recorder {

// What a return address stands for.
struct AddressInfo {
    std::vector<SourcePlace> places;  // innermost first; those without a file have a function at most
    std::size_t credited;             // of the places; their number if the caller is credited instead
    std::string name;                 // of the module's function or offset, for places without a file
};

// A call site, as a row of a report names it: a file and a line, or `module!function` or `module+0xoffset`
// and 0.
struct Site {
    std::string file;
    int line;
    std::string function;   // that has the line; empty if it is not known
    int function_line = 0;  // where that is declared
};

// Symbolizes addresses, each once, whichever processes have it.
class Symbolizer {
public:
    // Functions with a name in `skipped` are credited to their callers. In names "*" stands for any
    // characters.
    explicit Symbolizer(std::vector<std::string> skipped);
    ~Symbolizer();

    const AddressInfo& InfoOf(const ProcessAccount& account, std::uint32_t address);

    // True if one of the address's places is credited. Opens no file of the C and C++ runtimes, which never
    // are.
    bool IsCredited(const ProcessAccount& account, std::uint32_t address);

    // The files that had to do without lines so far, by name.
    const std::set<std::string>& ModulesWithoutLines() const { return moWithoutLines; }

private:
    struct ModuleFile;
    ModuleFile& FileOf(const Module& module);
    static void Open(ModuleFile& file, const Module& module, int process);
    AddressInfo Symbolize(const ModuleFile& file, std::uint64_t address);
    bool IsSkipped(const char* linker_name) const;

    std::vector<std::string> maSkipped;
    std::map<std::pair<std::string, std::string>, std::unique_ptr<ModuleFile>> moFiles;
    std::set<std::string> moWithoutLines;
    AddressInfo moNoModule;
};

// The stacks of one process.
class StackSites {
public:
    // Looks at the nodes that `account` has got since the last call. Returns those whose last frame is the
    // first that is credited.
    std::vector<NodeId> Update(const ProcessAccount& account, Symbolizer& symbolizer);

    // The site of a stack: that of its first frame if none is credited.
    Site SiteOf(NodeId node, const ProcessAccount& account, Symbolizer& symbolizer) const;

    // True if the block of such a stack stays allocated on purpose: it is the runtimes' own (buffers of streams, the
    // loader's lists, the pool for exceptions), or a frame has a name that `suppressed` holds.
    bool IsKept(NodeId node, const ProcessAccount& account, Symbolizer& symbolizer,
                const std::vector<std::string>& suppressed) const;

    // The node of the stack whose last frame is credited; 0 if there is none.
    NodeId CreditedNode(NodeId node) const { return node < maCredited.size() ? maCredited[node] : 0; }

private:
    std::vector<NodeId> maCredited;
    std::vector<NodeId> maFirst;  // the node of the stack's first frame
};

}  // namespace recorder

#endif
