#include "svc_state.h"

#include <glib/gstdio.h>

#include "secret.h"
#include "svc_log.h"

namespace {

constexpr char kSchema[] = R"sql(
CREATE TABLE IF NOT EXISTS value(name TEXT PRIMARY KEY, value TEXT NOT NULL);
CREATE TABLE IF NOT EXISTS intent(id INTEGER PRIMARY KEY CHECK(id = 1), cursor INTEGER, statuses INTEGER);
CREATE TABLE IF NOT EXISTS requested(voc INTEGER PRIMARY KEY);
CREATE TABLE IF NOT EXISTS announced(voc INTEGER PRIMARY KEY);
CREATE TABLE IF NOT EXISTS message(
  id INTEGER PRIMARY KEY AUTOINCREMENT, kind INTEGER NOT NULL, voc INTEGER NOT NULL, reply TEXT NOT NULL);
)sql";

}  // namespace

bool SvcState::open(const std::string &folder) {
  if (g_mkdir_with_parents(folder.c_str(), 0700) != 0) {
    SVC_LOGE("%s cannot be made: %s", folder.c_str(), g_strerror(errno));
    return false;
  }
  return database_.open(folder + "service.db", kSchema);
}

std::string SvcState::value(const char *name) {
  Statement row = database_.prepare("SELECT value FROM value WHERE name = ?", name);
  return row.next_row() ? row.text(0) : std::string();
}

bool SvcState::set_value(const char *name, const std::string &value) {
  return database_.run(
      "INSERT INTO value(name, value) VALUES(?, ?) ON CONFLICT(name) DO UPDATE SET value = excluded.value",
      name, value);
}

std::string SvcState::phone() {
  std::string known = value("phone");
  if (!known.empty()) return known;
  known = random_token();
  return set_value("phone", known) ? known : std::string();
}

std::string SvcState::token() {
  return value("token");
}

bool SvcState::set_device(const std::string &device, const std::string &token) {
  Transaction transaction(database_);
  const bool is_same_desk = value("device") == device;
  return (is_same_desk || set_value("cursor", "0")) && set_value("device", device) &&
         set_value("token", token) && transaction.commit();
}

bool SvcState::forget_token() {
  return database_.run("DELETE FROM value WHERE name = 'token'");
}

int64_t SvcState::cursor() {
  return g_ascii_strtoll(value("cursor").c_str(), nullptr, 10);
}

std::optional<SvcIntent> SvcState::intent() {
  Statement row = database_.prepare("SELECT cursor, statuses FROM intent");
  if (!row.next_row()) return std::nullopt;
  return SvcIntent{row.integer(0), static_cast<int>(row.integer(1))};
}

bool SvcState::set_intent(const SvcIntent &intent) {
  return database_.run("INSERT OR REPLACE INTO intent(id, cursor, statuses) VALUES(1, ?, ?)", intent.cursor,
                       intent.statuses_before);
}

bool SvcState::finish_event(int64_t cursor, const std::optional<SvcMessage> &message) {
  Transaction transaction(database_);
  return set_value("cursor", std::to_string(cursor)) && (!message || add_message(*message)) &&
         database_.run("DELETE FROM intent") && transaction.commit();
}

std::vector<int> SvcState::requested() {
  Statement rows = database_.prepare("SELECT voc FROM requested ORDER BY voc");
  std::vector<int> ids;
  while (rows.next_row()) ids.push_back(static_cast<int>(rows.integer(0)));
  return ids;
}

bool SvcState::add_requested(int voc_id, SvcRequestKind kind) {
  Transaction transaction(database_);
  return database_.run("INSERT OR IGNORE INTO requested(voc) VALUES(?)", voc_id) &&
         (kind != SvcRequestKind::kAgain || database_.run("DELETE FROM announced WHERE voc = ?", voc_id)) &&
         transaction.commit();
}

bool SvcState::remove_requested(int voc_id) {
  Transaction transaction(database_);
  return database_.run("DELETE FROM requested WHERE voc = ?", voc_id) &&
         database_.run("DELETE FROM announced WHERE voc = ?", voc_id) && transaction.commit();
}

bool SvcState::is_announced(int voc_id) {
  return database_.number("SELECT 1 FROM announced WHERE voc = ?", voc_id).has_value();
}

bool SvcState::announce_failure(int voc_id) {
  Transaction transaction(database_);
  return database_.run("INSERT OR IGNORE INTO announced(voc) VALUES(?)", voc_id) &&
         add_message({0, SVC_MESSAGE_FAILED, voc_id, ""}) && transaction.commit();
}

bool SvcState::add_message(const SvcMessage &message) {
  return database_.run("INSERT INTO message(kind, voc, reply) VALUES(?, ?, ?)",
                       static_cast<int>(message.kind), message.voc_id, message.reply);
}

std::optional<SvcMessage> SvcState::first_message() {
  Statement row = database_.prepare("SELECT id, kind, voc, reply FROM message ORDER BY id LIMIT 1");
  if (!row.next_row()) return std::nullopt;
  return SvcMessage{row.integer(0), static_cast<SvcMessageKind>(row.integer(1)),
                    static_cast<int>(row.integer(2)), row.text(3)};
}

bool SvcState::remove_message(int64_t id) {
  return database_.run("DELETE FROM message WHERE id = ?", id);
}
