// The disk ledger as a value.
#include <algorithm>
#include <iterator>

#include "diskio/ledger.h"
#include "snapshot/snapshot_rows.h"
#include "zanbase/snapshot.h"

namespace {

struct DiskIORules {
    using Row = HDiskIOSnapshot::Row;
    using Operation = HDiskIOSnapshot::Operation;

    static bool KeyLess(const Row& left, const Row& right) { return left.moName < right.moName; }

    static Row WithoutFigures(const Row& row) {
        Row key;
        key.moName = row.moName;
        return key;
    }

    static void Add(Row& row, const Row& other, int sign) {
        for (const auto member : kOperations) {
            Operation& sum = row.*member;
            const Operation& term = other.*member;
            sum.mnCount = Combined(sum.mnCount, term.mnCount, sign);
            sum.mdSeconds = Combined(sum.mdSeconds, term.mdSeconds, sign);
            sum.mnBytes = Combined(sum.mnBytes, term.mnBytes, sign);
        }
    }

    static bool IsZero(const Row& row) {
        return std::all_of(std::begin(kOperations), std::end(kOperations), [&row](auto member) {
            const Operation& operation = row.*member;
            return operation.mnCount == 0 && operation.mdSeconds == 0 && operation.mnBytes == 0;
        });
    }

private:
    static constexpr Operation Row::*kOperations[] = {&Row::moOpen, &Row::moClose, &Row::moSeek, &Row::moRead,
                                                      &Row::moWrite};
};

HDiskIOSnapshot::Row CopyOf(const DiskIOFileMap::value_type& file) {
    const DiskIOUsage& usage = file.second;
    return {file.first,
            {usage.mnOpenCount, usage.mdOpenTime, 0},
            {usage.mnCloseCount, usage.mdCloseTime, 0},
            {usage.mnSeekCount, usage.mdSeekTime, 0},
            {usage.mnReadCount, usage.mdReadTime, static_cast<long long>(usage.mnReadSize)},
            {usage.mnWriteCount, usage.mdWriteTime, static_cast<long long>(usage.mnWriteSize)}};
}

}  // namespace

HDiskIOSnapshot HDiskIOSnapshot::Take() {
    HDiskIOSnapshot snapshot;
    const HMutexLock lock(mpoDiskIOMutex);
    if (mpoDiskIOFileMap == nullptr) return snapshot;
    snapshot.maRows.reserve(mpoDiskIOFileMap->size());
    for (const auto& file : *mpoDiskIOFileMap) snapshot.maRows.push_back(CopyOf(file));
    return snapshot;
}

HDiskIOSnapshot HDiskIOSnapshot::Since(const HDiskIOSnapshot& earlier) const {
    return {RowsSince<DiskIORules>(maRows, earlier.maRows)};
}

void HDiskIOSnapshot::Merge(const HDiskIOSnapshot& other) {
    maRows = CombinedRows<DiskIORules>(maRows, other.maRows, 1);
}
