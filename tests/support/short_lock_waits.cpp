#include "support/short_lock_waits.h"

#include <sqlite3.h>

#include "support/doubles.h"

using namespace kelo::test;

ShortLockWaits::Handler ShortLockWaits::Replaced(Handler handler) {
    if (!isShort_ || FaultPause::IsActive())
        return handler;
    installed_ = handler;
    return [](void *context, int calls) { return calls < 2 ? installed_(context, calls) : (++givenUp_, 0); };
}

extern "C" int sqlite3_busy_handler(sqlite3 *db, int (*handler)(void *, int), void *context) {
    return Real<&sqlite3_busy_handler>("sqlite3_busy_handler")(db, ShortLockWaits::Replaced(handler),
                                                               context);
}
