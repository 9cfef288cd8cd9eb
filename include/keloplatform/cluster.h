#pragma once

// Clusters as databases: a file whose first line is "[cluster]" describes servers that KELODBConnect reaches
// in its place (docs/cluster.md). An addition of this platform, which an appliance's own may lack.
//
//     if (KELODBIsCluster(path))
//         KELODBClusterPartialSet(1);
//     ... search ...
//     if (KELODBClusterMissingGet()[0] != '\0')
//         Warn(KELODBClusterMissingGet());
//
// Threads: the functions may be called from any thread; what they set and answer is the calling thread's own.
// A connection is used by one thread at a time.

#include <cstddef>

#include "keloplatform/export.h"

struct DBConnect_tag;

// The id of a record of a cluster has its second of receipt above so many bits.
inline constexpr int KELODB_CLUSTER_BITS_BELOW_SECOND = 30;

extern "C" {

// 1 if the file at `path` describes a cluster; 0 if it does not, or cannot be read.
KELOPLATFORM_API int KELODBIsCluster(const char *path);

// Whether the calling thread takes answers that lack the rows of servers that are away, instead of an error.
// The description needs a line "partial-user=" for it. Forgets what was missing.
KELOPLATFORM_API void KELODBClusterPartialSet(int isWanted);

// What was missing in an answer since then: one line that names the servers, "" for nothing. Belongs to the
// thread, and changes with its next answer.
KELOPLATFORM_API const char *KELODBClusterMissingGet();

// The URL of the server with this number, counted from 0 in the order of the description; null if there is no
// such server, or the connection is none to a cluster. Belongs to the connection.
KELOPLATFORM_API const char *KELODBClusterServerGet(DBConnect_tag *connection, unsigned int server);

// Takes a part of an answer; another result than 0 ends it.
typedef int (*KELODBCLUSTERTAKER)(const char *bytes, size_t size, void *context);

// Sends `statement`, `size` bytes in the language of the servers, to one server, once and as it is, and hands
// the bytes of its answer to `take` (null: nobody wants them). -1, with the error of the connection, when it
// fails: then what was taken is no answer. A statement whose answer is lost may have been carried out.
KELOPLATFORM_API int KELODBClusterRun(DBConnect_tag *connection, unsigned int server, const char *statement,
                                      size_t size, KELODBCLUSTERTAKER take, void *context);

} // extern "C"
