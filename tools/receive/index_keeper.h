#pragma once

#include <cstdint>
#include <string>
#include <utility>

namespace kelo::tool {

// Has the index for keywords of the database extended by another process of the lowest priority, for which
// nothing waits. Its failure does no harm: searches are slower then.
class IndexKeeper {
public:
    // `program` runs "db index --build"; "" for none.
    explicit IndexKeeper(std::string program) : program_(std::move(program)) {}

    // To be called now and then with the number of records that were stored so far. Starts the process when
    // there are many new ones; that takes about a millisecond.
    void Tick(const std::string &database, uint64_t stored);

private:
    std::string program_;
    uint64_t covered_ = 0; // records when it was started last
};

} // namespace kelo::tool
