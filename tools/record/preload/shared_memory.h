// Memory of the recorder's own, taken from the system rather than from the program's heap: pages of the file
// that the command reads, and private pages. No descriptor is needed once the file's first page is mapped.
#ifndef ZANBASE_RECORD_SHARED_MEMORY_H
#define ZANBASE_RECORD_SHARED_MEMORY_H

#include <cstring>

#include "common/account.h"
#include "spin_lock.h"

namespace recorder {

// Whole private pages, filled with zeros, or null. A forked child gets a copy only if `inherited`.
void* MapPages(std::size_t bytes, bool inherited = false);
void UnmapPages(void* pages, std::size_t bytes);

// Maps the first page of the file that is open as `descriptor`. Null if it is not the command's.
Control* MapControl(int descriptor);

// Takes the space of an account for this process and maps it. Null if memory ran out.
Account* TakeAccount(Position& position);

// `bytes` zero bytes of the file, aligned for any row, or null if memory ran out.
void* TakeShared(std::size_t bytes, Position& position);

// Forgets the space that was taken: a forked child shares it with its parent.
void ResetSharedMemory();

// A copy of `text` in the file; empty if memory ran out.
TextPlace KeepText(const char* text, std::size_t bytes);

// Where this process sees the rows of a table in the file. All but Find require that no other thread does the
// same.
template <class Table>
class TableRows {
public:
    using Row = typename Table::Row;

    // The row, or null if its chunk was not taken yet. Any thread may call it at any time.
    Row* Find(std::uint64_t row) const {
        Row* const chunk =
            maChunks[row / Table::kChunkRows].load(std::memory_order_acquire);  // pairs with Make
        return chunk == nullptr ? nullptr : &chunk[row % Table::kChunkRows];
    }

    // The row, whose chunk is taken if need be. Null if there are no more rows or memory ran out.
    Row* Make(Table& table, std::uint64_t row) {
        if (row >= Table::kRows) return nullptr;
        std::atomic<Row*>& chunk = maChunks[row / Table::kChunkRows];
        if (chunk.load(std::memory_order_relaxed) == nullptr) {
            Position position = 0;
            void* const fresh = TakeShared(Table::kChunkRows * sizeof(Row), position);
            if (fresh == nullptr) return nullptr;
            table.chunks[row / Table::kChunkRows].store(position, std::memory_order_release);
            chunk.store(static_cast<Row*>(fresh), std::memory_order_release);
        }
        return Find(row);
    }

    // Forgets the chunks, which were those of rows below `count`.
    void Reset(std::uint64_t count) {
        for (std::size_t chunk = 0; chunk * Table::kChunkRows < count; ++chunk) maChunks[chunk] = nullptr;
    }

private:
    std::array<std::atomic<Row*>, Table::kChunks> maChunks{};
};

}  // namespace recorder

#endif
