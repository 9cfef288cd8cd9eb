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
    bool isFailing = false;
    int count = 0;
    int failFirst = 0;
    int failTimes = 0;
    bool hasFailed = false;
    bool isCounting = false;
    int liveBlocks = 0;
};
constinit thread_local State state;

} // namespace

bool AllocationFaults::IsSupported() {
    return KELO_OWN_ALLOCATOR;
}

void AllocationFaults::Start(int first, int times) {
    state.isFailing = true;
    state.count = 0;
    state.failFirst = first;
    state.failTimes = times;
    state.hasFailed = false;
}

bool AllocationFaults::Stop() {
    state.isFailing = false;
    return state.hasFailed;
}

void AllocationFaults::StartCounting() {
    state.isCounting = true;
    state.liveBlocks = 0;
}

int AllocationFaults::StopCounting() {
    state.isCounting = false;
    return state.liveBlocks;
}

#if KELO_OWN_ALLOCATOR
namespace {

// Counts an allocation and tells whether it has to fail.
bool MustFail() {
    if (!state.isFailing || FaultPause::IsActive())
        return false;
    ++state.count;
    if (state.count < state.failFirst || state.count - state.failFirst >= state.failTimes)
        return false;
    state.hasFailed = true;
    errno = ENOMEM;
    return true;
}

void CountBlock(const void *block, int change) {
    if (block != nullptr && state.isCounting && !FaultPause::IsActive())
        state.liveBlocks += change;
}

} // namespace
#endif

} // namespace kelo::test

#if KELO_OWN_ALLOCATOR
using namespace kelo::test;

extern "C" {

void *__libc_malloc(size_t size);
void *__libc_calloc(size_t count, size_t size);
void *__libc_realloc(void *block, size_t size);
void *__libc_memalign(size_t alignment, size_t size);
void __libc_free(void *block);

void *malloc(size_t size) {
    if (MustFail())
        return nullptr;
    void *block = __libc_malloc(size);
    CountBlock(block, 1);
    return block;
}

void *calloc(size_t count, size_t size) {
    if (MustFail())
        return nullptr;
    void *block = __libc_calloc(count, size);
    CountBlock(block, 1);
    return block;
}

void *realloc(void *block, size_t size) {
    if (MustFail())
        return nullptr;
    void *moved = __libc_realloc(block, size);
    if (block == nullptr)
        CountBlock(moved, 1);
    return moved;
}

// What operator new takes for types with an alignment of their own.
void *aligned_alloc(size_t alignment, size_t size) {
    if (MustFail())
        return nullptr;
    void *block = __libc_memalign(alignment, size);
    CountBlock(block, 1);
    return block;
}

void free(void *block) {
    CountBlock(block, -1);
    __libc_free(block);
}

} // extern "C"
#endif
