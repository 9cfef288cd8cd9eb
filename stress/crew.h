#pragma once

#include <sys/types.h>

#include <map>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "worker.h"

namespace kelo::stress {

// The processes at work. Whoever ends is replaced by a new process of the same role. What they start is in
// the session of this process, which also becomes the parent of what they leave.
class Crew {
public:
    Crew(const Site &site, Board &board, uint64_t seed);

    // Replaces those that have ended, and complains about those that were not killed by this class, or that
    // are in one operation for too long.
    void Look();
    // Kills a worker, with or without the programs that it has started, or one of these programs alone.
    void KillSomebody();
    // Stops all processes of the session where they are, until Thaw.
    void Freeze();
    void Thaw();
    // The files that the processes have open.
    static std::set<std::string> OpenFiles();

    // Waits for the end of all, once the board says that it is over. Kills and complains about what does not
    // end.
    void End();
    // What this process does itself, it does as a worker.
    Worker &Own() { return own_; }
    uint64_t Kills() const { return kills_; }

private:
    struct Member {
        size_t role = 0;
        pid_t process = -1;
        bool isKilled = false;
    };
    void Start(Member &member, size_t place);
    void Reap();
    void RequireProgress(const Member &member, size_t place);

    const Site &site_;
    Board &board_;
    const uint64_t seed_;
    uint32_t nextId_ = 1;
    std::mt19937_64 random_;
    std::vector<Member> members_;
    Worker own_;
    uint64_t kills_ = 0;
};

} // namespace kelo::stress
