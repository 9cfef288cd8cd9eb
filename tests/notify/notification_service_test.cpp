#include "notify/notify_fixture.h"
