#pragma once

#include <sqlite3.h>

#include <memory>

#include "cluster/cluster.h"
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
    // Set if the file describes a cluster, which runs the statements; `db` is an empty database that has the
    // errors.
    std::unique_ptr<kelo::platform::Cluster> cluster = nullptr;
};
