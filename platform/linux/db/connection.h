#pragma once

#include <sqlite3.h>

#include "db/database_file.h"
#include "db/insert_cache.h"
#include "db/select_cache.h"
#include "keloplatform/kelodb.h"

struct DBConnect_tag {
    explicit DBConnect_tag(const char *path) : file(path) {}

    kelo::platform::DatabaseFile file;
    sqlite3 *db = nullptr; // closed by KELODBClose
    kelo::platform::InsertCache inserts = {};
    kelo::platform::SelectCache selects = {};
};
