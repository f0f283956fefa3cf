// An account that was taken: the plain data with the storage that it points to.
#ifndef ZANBASE_SNAPSHOT_TAKEN_DATA_H
#define ZANBASE_SNAPSHOT_TAKEN_DATA_H

#include <deque>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <vector>

#include "platform/clock.h"
#include "platform/process.h"
#include "zanbase/account_data.h"
#include "zanbase/tracker_pause.h"

// `Data` is one of the accounts of zanbase/account_data.h, `Row` the type of its rows.
template <class Data, class Row>
struct TakenData : Data {
    std::vector<Row> maRows;
    std::deque<std::string> maTexts;  // its elements don't move

    HTextData Keep(std::string_view text) {
        const std::string& kept = maTexts.emplace_back(text);
        return {kept.data(), kept.size()};
    }

    // Requires: the rows are complete.
    void Finish() {
        const WallClock now = ReadWallClock();
        this->mdTime = static_cast<double>(now.seconds) + now.milliseconds / 1000.0;
        this->mnProcess = ProcessNumber();
        this->mpoRows = maRows.data();
        this->mnRows = maRows.size();
    }
};

// Fills a `Taken` by `fill`; null if there is no memory. The thread's tracking is paused meanwhile.
template <class Taken, class Fill>
const Taken* Take(Fill fill) noexcept {
    const HTrackerPause pause;
    try {
        auto taken = std::make_unique<Taken>();
        fill(*taken);
        taken->Finish();
        return taken.release();
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

template <class Taken, class Data>
void Release(const Data* data) noexcept {
    const HTrackerPause pause;
    delete static_cast<const Taken*>(data);
}

#endif
