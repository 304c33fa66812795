#include "notification_record.h"

#include "database.h"

namespace platform {
namespace {

std::vector<Shown> shown_by(const char *sql, const Database::Bind &bind) {
  std::vector<Shown> found;
  preference_database().run(sql, bind, [&found](sqlite3_stmt *statement) {
    found.push_back({column_text(statement, 0), static_cast<guint32>(sqlite3_column_int64(statement, 1))});
    return true;
  });
  return found;
}

}  // namespace

void remember_shown(const NotificationStep &step, const Shown &shown) {
  const NotificationContent &content = step.content;
  const auto bind_some = [](sqlite3_stmt *statement, int index, const std::string &text) {
    if (!text.empty()) bind_text(statement, index, text.c_str());
  };
  preference_database().run(
      "INSERT OR REPLACE INTO posted_notification(app_id, tag, server, id, type, receiver, request)"
      " VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7)",
      [&](sqlite3_stmt *statement) {
        bind_text(statement, 1, step.app_id.c_str());
        bind_text(statement, 2, content.tag.c_str());
        bind_text(statement, 3, shown.server.c_str());
        sqlite3_bind_int64(statement, 4, shown.id);
        sqlite3_bind_int(statement, 5, content.type);
        bind_some(statement, 6, content.receiver);
        bind_some(statement, 7, content.request);
      });
}

void forget_shown(const Shown &shown) {
  preference_database().run("DELETE FROM posted_notification WHERE server = ?1 AND id = ?2",
                            [&shown](sqlite3_stmt *statement) {
                              bind_text(statement, 1, shown.server.c_str());
                              sqlite3_bind_int64(statement, 2, shown.id);
                            });
}

std::vector<Shown> shown_under_tag(const NotificationStep &step) {
  return shown_by("SELECT server, id FROM posted_notification WHERE app_id = ?1 AND tag = ?2",
                  [&step](sqlite3_stmt *statement) {
                    bind_text(statement, 1, step.app_id.c_str());
                    bind_text(statement, 2, step.content.tag.c_str());
                  });
}

std::vector<Shown> shown_of_type(const NotificationStep &step) {
  return shown_by("SELECT server, id FROM posted_notification WHERE app_id = ?1 AND type = ?2",
                  [&step](sqlite3_stmt *statement) {
                    bind_text(statement, 1, step.app_id.c_str());
                    sqlite3_bind_int(statement, 2, step.content.type);
                  });
}

}  // namespace platform
