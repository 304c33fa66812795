// The store, read and changed by a test through a connection of its own, past the store's code.
#pragma once

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <string>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"

// First value of a statement.
inline std::string value(const std::string &sql, const char *null = "NULL", const char *no_row = "NULL") {
  TavroDb db;
  TavroStmt statement;
  sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
  EXPECT_EQ(sqlite3_prepare_v2(db.get(), sql.c_str(), -1, tavro_out(statement), nullptr), SQLITE_OK)
      << sql << ": " << sqlite3_errmsg(db.get());
  if (sqlite3_step(statement.get()) != SQLITE_ROW) return no_row;
  const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), 0));
  return text ? text : null;
}

inline void run(const std::string &sql, const char *file = TAVRO_DBMGR_FILE) {
  TavroDb db;
  sqlite3_open(file, tavro_out(db));
  EXPECT_EQ(sqlite3_exec(db.get(), sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK) << sql;
}
