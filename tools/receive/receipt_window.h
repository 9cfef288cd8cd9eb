#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <vector>

namespace kelo::tool {

// The numbers of the last messages, to recognise one that comes again: after a full disk syslog-ng appends up
// to flush-lines() messages a second time. Numbers are counted up but come in any order; one is forgotten
// after four others of the same remainder, some thousands of messages later. Takes 512 KiB once it is used.
class ReceiptWindow {
public:
    // Notes the number; returns whether it was there. 0 stands for none.
    bool Has(uint64_t receipt) {
        if (receipt == 0)
            return false;
        if (places_.empty())
            places_.resize(kPlaces);
        std::array<uint64_t, 4> &place = places_[receipt % kPlaces];
        if (std::find(place.begin(), place.end(), receipt) != place.end())
            return true;
        std::copy_backward(place.begin(), place.end() - 1, place.end());
        place[0] = receipt;
        return false;
    }

    void Clear() { places_ = {}; }

private:
    static constexpr size_t kPlaces = 16 * 1024;
    std::vector<std::array<uint64_t, 4>> places_;
};

} // namespace kelo::tool
