// Files of a report: taken as they arrive, in one piece or several, checked when they are whole.
#include <unistd.h>

#include "desk.h"
#include "secret.h"

namespace {

constexpr int64_t kMostFilesPerReport = 32;
constexpr int64_t kLargestFile = 64 * 1024 * 1024;  // bytes
constexpr size_t kLongestName = 1024;               // bytes
constexpr char kArrivalKey[] = "tavro-arrival";

// One body on its way to disk. Its `current` turns false when a newer call for the same file took over: the
// connection of the older one may be dead without either side knowing.
struct Arrival {
  UniqueFd part;
  std::shared_ptr<bool> current;
  bool has_failed = false;
};

// What the call's headers say about the bytes that it brings.
struct Piece {
  int64_t start = 0;
  int64_t end = 0;  // behind the last byte
  int64_t total = 0;
};

std::string _query_text(const Call &call, const char *name) {
  const auto found = call.query.find(name);
  return found == call.query.end() ? std::string() : found->second;
}

std::string _file_key(int64_t report, int64_t number) {
  return std::to_string(report) + "/" + std::to_string(number);
}

// Null when Content-Range and Content-Length contradict each other.
std::optional<Piece> _piece_of(const Call &call) {
  SoupMessageHeaders *headers = soup_server_message_get_request_headers(call.message);
  const int64_t length = soup_message_headers_get_content_length(headers);
  if (!call.header("Content-Range")) return Piece{0, length, length};
  goffset start = 0, last = 0, total = 0;
  if (!soup_message_headers_get_content_range(headers, &start, &last, &total)) return std::nullopt;
  if (start < 0 || last + 1 - start != length || total < last + 1) return std::nullopt;
  return Piece{start, last + 1, total};
}

bool _is_known_kind(const std::string &kind) {
  for (const char *known : {"attachment", "device_status", "system_log", "crash_dump"})
    if (kind == known) return true;
  return false;
}

// The file as the call describes it; refuses what is out of bounds.
std::optional<DeskAttachment> _announced(const Call &call, const Piece &piece) {
  const char *sha256 = call.header("X-Content-SHA256");
  DeskAttachment file;
  file.number = call.numbers[1];
  file.name = _query_text(call, "name");
  file.kind = _query_text(call, "kind");
  file.sha256 = sha256 ? sha256 : "";
  file.size = piece.total;
  if (file.number < 1 || file.number > kMostFilesPerReport)
    refuse(call, 422, "a report has files 1 to 32");
  else if (file.size > kLargestFile)
    refuse(call, 413, "a file has at most 64 MiB");
  else if (!is_sha256(file.sha256))
    refuse(call, 400, "X-Content-SHA256 must be 64 lower-case hexadecimal digits");
  else if (file.name.empty() || file.name.size() > kLongestName || !_is_known_kind(file.kind))
    refuse(call, 400, "a name and a known kind are needed");
  else
    return file;
  return std::nullopt;
}

bool _may_send(const Call &call) {
  const auto report = call.desk.store.report(call.numbers[0]);
  if (!report || report->device != call.device)
    refuse(call, 404, "no such report of this device");
  else if (report->is_complete)
    refuse(call, 409, "this report is complete");
  else
    return true;
  return false;
}

// Notes what is about to arrive. Another content under a known number begins anew, and only from its start.
bool _agree_on_file(const Call &call, const DeskAttachment &file, const Piece &piece) {
  const int64_t report = call.numbers[0];
  const auto known = call.desk.store.attachment(report, file.number);
  const bool is_same = known && known->sha256 == file.sha256 && known->size == file.size;
  if (known && known->is_complete) {
    if (!is_same) refuse(call, 409, "another file has this number");
    return false;  // the same file again: its bytes are ignored and the call succeeds
  }
  const int64_t there = is_same ? call.desk.files.received(report, file.number) : 0;
  if (piece.start != 0 && piece.start != there) {
    refuse(call, 416, "the file does not go on at this byte");
    return false;
  }
  if (is_same ||
      (call.desk.files.drop_part(report, file.number) && call.desk.store.put_attachment(report, file)))
    return true;
  refuse(call, 503, "the desk cannot write its store");
  return false;
}

void _chunk_cb(SoupServerMessage *, GBytes *chunk, gpointer data) {
  auto *arrival = static_cast<Arrival *>(data);
  if (arrival->has_failed || !*arrival->current) return;
  gsize left = 0;
  auto *bytes = static_cast<const char *>(g_bytes_get_data(chunk, &left));
  while (left > 0) {
    const ssize_t written = write(arrival->part.get(), bytes, left);
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) {
      g_warning("an attachment cannot be written: %s", g_strerror(errno));
      arrival->has_failed = true;
      return;
    }
    bytes += written;
    left -= static_cast<gsize>(written);
  }
}

// Gives a file that has all its bytes its number; false with a refusal when it cannot be had.
bool _settle(const Call &call, DeskAttachment &file) {
  const int64_t report = call.numbers[0];
  auto &desk = call.desk;
  if (file.is_complete || desk.files.received(report, file.number) < file.size) return true;
  auto finish = DeskFiles::Finish::kDone;
  if (!desk.files.is_whole(report, file.number))
    finish = desk.files.finish(report, file.number, file.size, file.sha256);
  if (finish == DeskFiles::Finish::kWrongChecksum) {
    refuse(call, 422, "the checksum is wrong, send the file again");
    return false;
  }
  file.is_complete = true;
  if (finish == DeskFiles::Finish::kDone && desk.store.put_attachment(report, file)) return true;
  refuse(call, 503, "the desk cannot keep the file");
  return false;
}

void _answer_state(const Call &call, const DeskAttachment &file) {
  const int64_t received = call.desk.files.received(call.numbers[0], file.number);
  answer_json(
      call, file.is_complete ? 200 : 202,
      {{"received", received}, {"size", file.size}, {"sha256", file.sha256}, {"complete", file.is_complete}});
}

}  // namespace

void handle_attachment_state(Call &call) {
  const auto report = call.desk.store.report(call.numbers[0]);
  auto file = report && report->device == call.device
                  ? call.desk.store.attachment(report->id, call.numbers[1])
                  : std::nullopt;
  if (!file) return refuse(call, 404, "nothing of this file has arrived");
  if (_settle(call, *file)) _answer_state(call, *file);
}

void begin_attachment(Call &call) {
  if (!_may_send(call)) return;
  const auto piece = _piece_of(call);
  if (!piece) return refuse(call, 400, "Content-Range and Content-Length do not agree");
  const auto file = _announced(call, *piece);
  if (!file || !_agree_on_file(call, *file, *piece)) return;

  auto *arrival = new Arrival;
  g_object_set_data_full(G_OBJECT(call.message), kArrivalKey, arrival,
                         [](gpointer data) { delete static_cast<Arrival *>(data); });
  auto &current = call.desk.arriving[_file_key(call.numbers[0], file->number)];
  if (current) *current = false;
  current = arrival->current = std::make_shared<bool>(true);
  arrival->part = call.desk.files.open_part(call.numbers[0], file->number, piece->start);
  if (!arrival->part) return refuse(call, 507, "the desk has no room for the file");
  g_signal_connect(call.message, "got-chunk", G_CALLBACK(_chunk_cb), arrival);
}

void handle_attachment(Call &call) {
  auto *arrival = static_cast<Arrival *>(g_object_get_data(G_OBJECT(call.message), kArrivalKey));
  if (!arrival) return handle_attachment_state(call);
  if (!*arrival->current) return refuse(call, 409, "another call sends this file");
  call.desk.arriving.erase(_file_key(call.numbers[0], call.numbers[1]));
  if (arrival->has_failed || fdatasync(arrival->part.get()) != 0)
    return refuse(call, 507, "the desk has no room for the file");
  auto file = call.desk.store.attachment(call.numbers[0], call.numbers[1]);
  if (!file) return refuse(call, 503, "the desk cannot read its store");
  if (_settle(call, *file)) _answer_state(call, *file);
}
