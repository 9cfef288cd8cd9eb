#include "faults/allocation_faults.h"

#include <cerrno>
#include <cstdlib>

#include "support/fault_pause.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define KELO_OWN_ALLOCATOR 0
#elif defined(__has_feature)
#define KELO_OWN_ALLOCATOR !(__has_feature(address_sanitizer) || __has_feature(thread_sanitizer))
#else
#define KELO_OWN_ALLOCATOR 1
#endif

namespace kelo::test {
namespace {

struct State {
    int failFirst = 0;
    int failTimes = 0; // 0 while nothing is to fail
    int count = 0;
    bool hasFailed = false;
    int liveBlocks = 0;
};
constinit thread_local State state;

} // namespace

bool AllocationFaults::IsSupported() {
    return KELO_OWN_ALLOCATOR;
}

void AllocationFaults::Start(int first, int times) {
    state = {first, times, 0, false, state.liveBlocks};
}

bool AllocationFaults::Stop() {
    state.failTimes = 0;
    return state.hasFailed;
}

int AllocationFaults::LiveBlocks() {
    return state.liveBlocks;
}

} // namespace kelo::test

#if KELO_OWN_ALLOCATOR
using namespace kelo::test;

namespace {

// Counts an allocation; whether it must fail.
bool MustFail() {
    if (state.failTimes == 0 || FaultPause::IsActive())
        return false;
    const int past = ++state.count - state.failFirst;
    if (past < 0 || past >= state.failTimes)
        return false;
    state.hasFailed = true;
    errno = ENOMEM;
    return true;
}

void *Counted(void *block) {
    state.liveBlocks += block != nullptr && !FaultPause::IsActive();
    return block;
}

} // namespace

extern "C" {

void *__libc_malloc(size_t size);
void *__libc_calloc(size_t count, size_t size);
void *__libc_realloc(void *block, size_t size);
void *__libc_memalign(size_t alignment, size_t size);
void __libc_free(void *block);

void *malloc(size_t size) {
    return MustFail() ? nullptr : Counted(__libc_malloc(size));
}

void *calloc(size_t count, size_t size) {
    return MustFail() ? nullptr : Counted(__libc_calloc(count, size));
}

void *realloc(void *block, size_t size) {
    if (MustFail())
        return nullptr;
    return block != nullptr ? __libc_realloc(block, size) : Counted(__libc_malloc(size));
}

// What operator new takes for types with an alignment of their own.
void *aligned_alloc(size_t alignment, size_t size) {
    return MustFail() ? nullptr : Counted(__libc_memalign(alignment, size));
}

void free(void *block) {
    state.liveBlocks -= block != nullptr && !FaultPause::IsActive();
    __libc_free(block);
}

} // extern "C"
#endif
