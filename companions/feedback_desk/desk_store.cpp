#include "desk_store.h"

#include "secret.h"

namespace {

// Report ids begin at a random number, so that two desks that a phone has met do not give the same ones. They
// stay below 2^31, the largest id that a phone stores.
constexpr const char kSchema[] = R"sql(
CREATE TABLE IF NOT EXISTS device(
  id TEXT PRIMARY KEY, phone TEXT NOT NULL UNIQUE, token_hash TEXT NOT NULL UNIQUE, registered INTEGER);
CREATE TABLE IF NOT EXISTS report(
  id INTEGER PRIMARY KEY AUTOINCREMENT, idempotency_key TEXT NOT NULL UNIQUE,
  device TEXT NOT NULL REFERENCES device(id), kind TEXT NOT NULL, title TEXT NOT NULL, text TEXT NOT NULL,
  app TEXT NOT NULL, severity TEXT NOT NULL, user TEXT NOT NULL, created INTEGER, received INTEGER,
  status INTEGER NOT NULL, is_complete INTEGER NOT NULL DEFAULT 0, is_read INTEGER NOT NULL DEFAULT 0,
  model TEXT NOT NULL, missing TEXT NOT NULL DEFAULT '[]');
CREATE INDEX IF NOT EXISTS report_device ON report(device);
CREATE TABLE IF NOT EXISTS attachment(
  report INTEGER NOT NULL REFERENCES report(id), number INTEGER NOT NULL, name TEXT NOT NULL,
  kind TEXT NOT NULL, sha256 TEXT NOT NULL, size INTEGER NOT NULL, is_complete INTEGER NOT NULL,
  PRIMARY KEY(report, number));
CREATE TABLE IF NOT EXISTS answer(
  cursor INTEGER PRIMARY KEY AUTOINCREMENT, device TEXT NOT NULL REFERENCES device(id),
  report INTEGER NOT NULL REFERENCES report(id), status INTEGER NOT NULL, reply TEXT NOT NULL,
  time INTEGER NOT NULL);
CREATE INDEX IF NOT EXISTS answer_device ON answer(device, cursor);
CREATE INDEX IF NOT EXISTS answer_report ON answer(report);
CREATE TABLE IF NOT EXISTS follow_up(
  report INTEGER PRIMARY KEY REFERENCES report(id), first INTEGER NOT NULL REFERENCES report(id),
  verdict TEXT NOT NULL);
CREATE INDEX IF NOT EXISTS follow_up_first ON follow_up(first);
INSERT INTO sqlite_sequence(name, seq)
  SELECT 'report', 100000 + abs(random() % 900000000)
  WHERE NOT EXISTS(SELECT 1 FROM sqlite_sequence WHERE name = 'report');
)sql";

#define REPORT_COLUMNS                                                                                    \
  "id, device, kind, title, text, app, severity, user, created, received, status, is_complete, is_read, " \
  "model, missing, (SELECT first FROM follow_up WHERE follow_up.report = report.id), "                    \
  "(SELECT verdict FROM follow_up WHERE follow_up.report = report.id), "                                  \
  "(SELECT verdict FROM follow_up f JOIN report r ON r.id = f.report WHERE f.first = report.id AND "      \
  "r.is_complete = 1 AND r.received > (SELECT ifnull(max(time), 0) FROM answer WHERE answer.report = "    \
  "report.id) ORDER BY r.received DESC, r.id DESC LIMIT 1)"

DeskReport _read_report(const Statement &row) {
  DeskReport report;
  report.id = row.integer(0);
  report.device = row.text(1);
  report.kind = row.text(2);
  report.title = row.text(3);
  report.text = row.text(4);
  report.app = row.text(5);
  report.severity = row.text(6);
  report.user = row.text(7);
  report.created_ms = row.integer(8);
  report.received_ms = row.integer(9);
  report.status = static_cast<int>(row.integer(10));
  report.is_complete = row.integer(11) != 0;
  report.is_read = row.integer(12) != 0;
  report.model_json = row.text(13);
  report.missing_json = row.text(14);
  report.follow_up_of = row.integer(15);
  report.verdict = row.text(16);
  report.last_verdict = row.text(17);
  return report;
}

DeskAttachment _read_attachment(const Statement &row) {
  DeskAttachment attachment;
  attachment.number = row.integer(0);
  attachment.name = row.text(1);
  attachment.kind = row.text(2);
  attachment.sha256 = row.text(3);
  attachment.size = row.integer(4);
  attachment.is_complete = row.integer(5) != 0;
  return attachment;
}

std::vector<DeskAnswer> _read_answers(Statement rows) {
  std::vector<DeskAnswer> answers;
  while (rows.next_row())
    answers.push_back({rows.integer(0), rows.integer(1), rows.text(2), static_cast<int>(rows.integer(3)),
                       rows.text(4), rows.integer(5)});
  return answers;
}

}  // namespace

int64_t now_ms() {
  return g_get_real_time() / 1000;
}

bool DeskStore::open(const std::string &folder) {
  return database_.open(folder + "/desk.db", kSchema);
}

std::optional<std::string> DeskStore::register_device(const std::string &phone,
                                                      const std::string &token_hash) {
  const bool stored = database_.run(
      "INSERT INTO device(id, phone, token_hash, registered) VALUES(?, ?, ?, ?) "
      "ON CONFLICT(phone) DO UPDATE SET token_hash = excluded.token_hash",
      random_token(), phone, token_hash, now_ms());
  return stored ? device_of_token(token_hash) : std::nullopt;
}

std::optional<std::string> DeskStore::device_of_token(const std::string &token_hash) {
  Statement row = database_.prepare("SELECT id FROM device WHERE token_hash = ?", token_hash);
  if (!row.next_row()) return std::nullopt;
  return row.text(0);
}

std::optional<int64_t> DeskStore::add_report(const std::string &key, const DeskReport &report) {
  Transaction transaction(database_);
  const bool stored = database_.run(
      "INSERT INTO report(idempotency_key, device, kind, title, text, app, severity, user, created, status, "
      "model) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?) ON CONFLICT(idempotency_key) DO NOTHING",
      key, report.device, report.kind, report.title, report.text, report.app, report.severity, report.user,
      report.created_ms, DESK_STATUS_SUBMITTED, report.model_json);
  const auto id = stored ? report_of_key(key, report.device) : std::nullopt;
  const bool is_whole = id && (report.follow_up_of == 0 ||
                               database_.run("INSERT INTO follow_up(report, first, verdict) VALUES(?, ?, ?) "
                                             "ON CONFLICT(report) DO NOTHING",
                                             *id, report.follow_up_of, report.verdict));
  return is_whole && transaction.commit() ? id : std::nullopt;
}

std::optional<int64_t> DeskStore::report_of_key(const std::string &key, const std::string &device) {
  return database_.number("SELECT id FROM report WHERE idempotency_key = ? AND device = ?", key, device);
}

std::optional<DeskReport> DeskStore::report(int64_t id) {
  Statement row = database_.prepare("SELECT " REPORT_COLUMNS " FROM report WHERE id = ?", id);
  if (!row.next_row()) return std::nullopt;
  return _read_report(row);
}

int64_t DeskStore::report_count(const std::string &device) {
  return database_.number("SELECT count(*) FROM report WHERE device = ?", device).value_or(0);
}

bool DeskStore::complete_report(int64_t id, const std::string &missing_json) {
  Transaction transaction(database_);
  return database_.run(
             "UPDATE report SET is_read = 0 WHERE id = (SELECT first FROM follow_up JOIN report r ON "
             "r.id = follow_up.report WHERE r.id = ? AND r.is_complete = 0 AND verdict = ?)",
             id, DESK_VERDICT_STILL_HAPPENS) &&
         database_.run(
             "UPDATE report SET is_complete = 1, missing = ?, received = ? WHERE id = ? AND is_complete = 0",
             missing_json, now_ms(), id) &&
         transaction.commit();
}

std::vector<DeskReport> DeskStore::follow_ups(int64_t first) {
  Statement rows = database_.prepare("SELECT " REPORT_COLUMNS
                                     " FROM report WHERE is_complete = 1 AND id IN "
                                     "(SELECT report FROM follow_up WHERE first = ?) ORDER BY received, id",
                                     first);
  std::vector<DeskReport> reports;
  while (rows.next_row()) reports.push_back(_read_report(rows));
  return reports;
}

bool DeskStore::mark_read(int64_t id) {
  return database_.run("UPDATE report SET is_read = 1 WHERE id = ? AND is_read = 0", id);
}

std::vector<DeskReport> DeskStore::reports(int64_t before, int status, int limit) {
  Statement rows = database_.prepare("SELECT " REPORT_COLUMNS
                                     " FROM report WHERE is_complete = 1 AND (?1 = 0 OR id < ?1) "
                                     "AND (?2 = 0 OR status = ?2) ORDER BY id DESC LIMIT ?3",
                                     before, status, limit);
  std::vector<DeskReport> reports;
  while (rows.next_row()) reports.push_back(_read_report(rows));
  return reports;
}

bool DeskStore::put_attachment(int64_t report, const DeskAttachment &attachment) {
  return database_.run(
      "INSERT INTO attachment(report, number, name, kind, sha256, size, is_complete) "
      "VALUES(?, ?, ?, ?, ?, ?, ?) ON CONFLICT(report, number) DO UPDATE SET name = excluded.name, "
      "kind = excluded.kind, sha256 = excluded.sha256, size = excluded.size, "
      "is_complete = excluded.is_complete",
      report, attachment.number, attachment.name, attachment.kind, attachment.sha256, attachment.size,
      attachment.is_complete ? 1 : 0);
}

std::optional<DeskAttachment> DeskStore::attachment(int64_t report, int64_t number) {
  Statement row = database_.prepare(
      "SELECT number, name, kind, sha256, size, is_complete FROM attachment WHERE report = ? AND number = ?",
      report, number);
  if (!row.next_row()) return std::nullopt;
  return _read_attachment(row);
}

std::vector<DeskAttachment> DeskStore::attachments(int64_t report) {
  Statement rows = database_.prepare(
      "SELECT number, name, kind, sha256, size, is_complete FROM attachment WHERE report = ? ORDER BY number",
      report);
  std::vector<DeskAttachment> attachments;
  while (rows.next_row()) attachments.push_back(_read_attachment(rows));
  return attachments;
}

bool DeskStore::add_answer(int64_t report, int status, const std::string &reply) {
  Transaction transaction(database_);
  return database_.run(
             "INSERT INTO answer(device, report, status, reply, time) "
             "SELECT device, id, ?, ?, ? FROM report WHERE id = ?",
             status, reply, now_ms(), report) &&
         database_.run("UPDATE report SET status = ?, is_read = 1 WHERE id = ?", status, report) &&
         transaction.commit();
}

std::vector<DeskAnswer> DeskStore::answers(int64_t report) {
  return _read_answers(database_.prepare(
      "SELECT cursor, report, '', status, reply, time FROM answer WHERE report = ? ORDER BY cursor", report));
}

std::vector<DeskAnswer> DeskStore::answers_for_device(const std::string &device, int64_t after, int limit) {
  return _read_answers(database_.prepare(
      "SELECT a.cursor, a.report, r.idempotency_key, a.status, a.reply, a.time FROM answer a "
      "JOIN report r ON r.id = a.report WHERE a.device = ? AND a.cursor > ? ORDER BY a.cursor LIMIT ?",
      device, after, limit));
}
