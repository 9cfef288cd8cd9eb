#include "support/short_lock_waits.h"

#include <sqlite3.h>

#include <utility>

#include "support/doubles.h"

namespace kelo::test {
namespace {

bool isShort = false;
int (*installed)(void *, int) = nullptr;
int givenUp = 0;

int AskTwice(void *context, int calls) {
    if (calls < 2)
        return installed(context, calls);
    ++givenUp;
    return 0;
}

} // namespace

ShortLockWaits::ShortLockWaits() {
    isShort = true;
    givenUp = 0;
}

ShortLockWaits::~ShortLockWaits() {
    isShort = false;
}

int ShortLockWaits::TakeCount() {
    return std::exchange(givenUp, 0);
}

bool ShortLockWaits::WaitsAtCall(int number) const {
    return installed != nullptr && installed(nullptr, number) != 0;
}

} // namespace kelo::test

extern "C" int sqlite3_busy_handler(sqlite3 *db, int (*handler)(void *, int), void *context) {
    using namespace kelo::test;
    static const auto real = Real<&sqlite3_busy_handler>("sqlite3_busy_handler");
    if (!isShort || FaultPause::IsActive())
        return real(db, handler, context);
    installed = handler;
    return real(db, AskTwice, context);
}
