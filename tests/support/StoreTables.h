#pragma once

/// The store's tables as `reportctl setup` makes them (SchemaTest checks that they are the same). For tests,
/// benchmarks and fuzz targets that need a store without set-up.
inline constexpr auto STORE_TABLES =
    "create table OperLog (id INTEGER primary key, eventID TEXT, value TEXT, createTime TEXT, pType INTEGER,"
    " extData1 TEXT, extData2 TEXT, extData3 TEXT, extData4 TEXT);"
    "create table BaseInfo (key TEXT, value TEXT);";
