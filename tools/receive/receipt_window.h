#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <functional>
#include <string_view>
#include <vector>

namespace kelo::tool {

// The last records, to recognise one that comes again: after a full disk syslog-ng appends up to
// flush-lines() messages a second time. Their numbers are counted up but come in any order; one is forgotten
// after four others of the same remainder, some thousands of messages later. A number alone says nothing, as
// syslog-ng begins with earlier ones again after a loss of power. Takes 512 KiB once it is used.
class ReceiptWindow {
public:
    // Notes the record with this number; returns whether it was there. 0 stands for none.
    bool Has(uint64_t receipt, std::string_view record) {
        if (receipt == 0)
            return false;
        if (places_.empty())
            places_.resize(kPlaces);
        std::array<uint64_t, 4> &place = places_[receipt % kPlaces];
        const uint64_t mark = std::hash<std::string_view>()(record);
        if (std::find(place.begin(), place.end(), mark) != place.end())
            return true;
        std::copy_backward(place.begin(), place.end() - 1, place.end());
        place[0] = mark;
        return false;
    }

    void Clear() { places_ = {}; }

private:
    static constexpr size_t kPlaces = 16 * 1024;
    std::vector<std::array<uint64_t, 4>> places_;
};

} // namespace kelo::tool
