#pragma once

namespace kelo::test {

// Makes chosen allocations of the whole process fail: malloc, calloc, realloc and aligned_alloc, and with
// them operator new and SQLite. The program replaces the allocator's functions, so this is not there in
// sanitizer builds, which do so themselves. For one thread.
class AllocationFaults {
public:
    static bool IsSupported();

    // Makes the `first`-th allocation from now fail (1 is the next one) and `times - 1` more after it, but
    // none under a FaultPause.
    static void Start(int first, int times);
    // Makes nothing fail any more. Returns whether an allocation failed since Start.
    static bool Stop();

    // Blocks that were allocated and not freed, but those under a FaultPause. Only differences of it mean
    // something. Always 0 where this is not supported.
    static int LiveBlocks();
};

} // namespace kelo::test
