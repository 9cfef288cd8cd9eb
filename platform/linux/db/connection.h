#pragma once

#include <sqlite3.h>

#include "keloplatform/kelodb.h"

struct DBConnect_tag {
    sqlite3 *db = nullptr;
};
