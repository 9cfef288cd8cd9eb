#pragma once

namespace kelo::test {

// Makes chosen allocations of the whole process fail: malloc, calloc and realloc, and with them operator new
// and SQLite. The program replaces the allocator's functions, so this is not there in sanitizer builds, which
// do so themselves. For one thread.
class AllocationFaults {
public:
    static bool IsSupported();

    // Makes the `first`-th allocation from now fail (1 is the next one) and `times - 1` more after it, and
    // starts counting blocks. Allocations under a FaultPause are neither failed nor counted.
    static void Start(int first, int times);
    // Ends both. Returns whether an allocation failed.
    static bool Stop();
    // Blocks allocated and not freed between Start and Stop.
    static int LiveBlocks();
};

} // namespace kelo::test
