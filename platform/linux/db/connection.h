#pragma once

#include <sqlite3.h>

#include "db/database_file.h"
#include "keloplatform/kelodb.h"

struct DBConnect_tag {
    kelo::platform::DatabaseFile file;
    sqlite3 *db = nullptr; // closed by KELODBClose
};
