#include "faults/allocation_faults.h"

#include <cerrno>
#include <cstddef>

#include "support/doubles.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define KELO_OWN_ALLOCATOR 0
#elif defined(__has_feature)
#define KELO_OWN_ALLOCATOR !(__has_feature(address_sanitizer) || __has_feature(thread_sanitizer))
#else
#define KELO_OWN_ALLOCATOR 1
#endif

using kelo::test::FaultPause;

namespace {

constinit thread_local kelo::test::NthCall failing;
constinit thread_local int liveBlocks = 0;

} // namespace

namespace kelo::test {

bool AllocationFaults::IsSupported() {
    return KELO_OWN_ALLOCATOR;
}
void AllocationFaults::Start(int first, int times) {
    failing = {first, times};
}
bool AllocationFaults::Stop() {
    failing.times = 0;
    return failing.hasFailed;
}
int AllocationFaults::LiveBlocks() {
    return liveBlocks;
}

} // namespace kelo::test

#if KELO_OWN_ALLOCATOR

extern "C" {

void *__libc_malloc(size_t size);
void *__libc_calloc(size_t count, size_t size);
void *__libc_realloc(void *block, size_t size);
void *__libc_memalign(size_t alignment, size_t size);
void __libc_free(void *block);

static bool MustFail() {
    const bool fails = !FaultPause::IsActive() && failing.MustFail();
    if (fails)
        errno = ENOMEM;
    return fails;
}

static void *Counted(void *block) {
    liveBlocks += block != nullptr && !FaultPause::IsActive();
    return block;
}

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
    liveBlocks -= block != nullptr && !FaultPause::IsActive();
    __libc_free(block);
}

} // extern "C"
#endif
