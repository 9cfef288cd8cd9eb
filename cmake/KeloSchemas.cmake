# The schemas as they are installed, in KELO_SCHEMA_FILES. What they create, without comments and the transaction around it, is
# in KELO_LOGS_TABLES and KELO_ARCHIVE_TABLES; that of an archive is made of logs.sql.
set(schemas ${PROJECT_SOURCE_DIR}/package/schema)
set(made ${PROJECT_BINARY_DIR}/package/schema)
function(kelo_read_tables variable file)
    file(READ ${file} schema)
    string(REGEX REPLACE "(--|PRAGMA|BEGIN|COMMIT)[^\n]*\n+" "" tables "${schema}")
    set(${variable} "${tables}" PARENT_SCOPE)
endfunction()

foreach(schema accinfo cluster kelosyslog logs)
    configure_file(${schemas}/${schema}.sql ${made}/${schema}.sql COPYONLY)
endforeach()
kelo_read_tables(KELO_LOGS_TABLES ${made}/logs.sql)
kelo_read_tables(KELO_CLUSTER_TABLES ${made}/cluster.sql)
configure_file(${schemas}/archive.sql.in ${made}/archive.sql @ONLY)
kelo_read_tables(KELO_ARCHIVE_TABLES ${made}/archive.sql)
set(KELO_SCHEMA_FILES ${made}/accinfo.sql ${made}/archive.sql ${made}/cluster.sql ${made}/kelosyslog.sql ${made}/logs.sql)
