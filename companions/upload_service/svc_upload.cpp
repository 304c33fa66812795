#include "svc_upload.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>

#include "json_fields.h"
#include "svc_log.h"

namespace {

constexpr int64_t kPieceBytes = 1024 * 1024;
constexpr int64_t kLargestFile = 64 * 1024 * 1024;  // bytes; what the desk takes
constexpr int kMostFiles = 32;
constexpr int kMostFaults = 2;

// Opens a file for sending. Null with the reason when it is none that can be sent.
std::shared_ptr<UniqueFd> _open(const SvcFile &file, int64_t &size, const char *&why) {
  auto fd = std::make_shared<UniqueFd>(open(file.path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat found {};
  why = nullptr;
  if (!*fd || fstat(fd->get(), &found) != 0)
    why = g_strerror(errno);
  else if (!S_ISREG(found.st_mode))
    why = "it is not a file";
  else if (found.st_size > kLargestFile)
    why = "it is larger than 64 MiB";
  else if (file.number > kMostFiles)
    why = "a report has at most 32 files";
  size = found.st_size;
  return why ? nullptr : fd;
}

}  // namespace

void SvcUpload::start(DeskLink &desk, SvcReport report, Ended ended) {
  std::make_shared<SvcUpload>(desk, std::move(report), std::move(ended))->announce();
}

void SvcUpload::announce() {
  DeskCall call = desk_post("/reports", report_.body);
  call.headers.emplace_back("Idempotency-Key", report_.key);
  desk_.call(std::move(call),
             [self = shared_from_this()](const DeskReply &reply) { self->on_announced(reply); });
}

void SvcUpload::on_announced(const DeskReply &reply) {
  const int64_t id = number_field(reply.body, "id");
  const bool has_id = id > 0 && id <= G_MAXINT;
  if (!reply.is_ok() || !has_id) return end(reply, "announcing");
  server_id_ = static_cast<int>(id);
  if (flag_field(reply.body, "complete")) return ended_({SvcUploadEnd::Kind::kSent, server_id_, true});
  next_file();
}

void SvcUpload::next_file() {
  current_ = Current();
  if (position_ == report_.files.size()) return complete();
  open_file();
}

void SvcUpload::open_file() {
  const SvcFile &file = report_.files[position_];
  int64_t size = 0;
  const char *why = nullptr;
  auto fd = _open(file, size, why);
  if (why) return skip_file(why);
  svc_make_content(std::move(fd), size, file.kind == "attachment",
                   [self = shared_from_this()](const SvcContent &content) { self->on_content(content); });
}

void SvcUpload::on_content(const SvcContent &content) {
  if (content.why) return skip_file(content.why);
  current_.content = content;
  ask_state();
}

DeskCall SvcUpload::call_for_file(const char *method) const {
  const SvcFile &file = report_.files[position_];
  GCharPtr name(g_uri_escape_string(svc_base_name(file.path).c_str(), nullptr, FALSE));
  DeskCall call;
  call.method = method;
  call.path = "/reports/" + std::to_string(server_id_) + "/attachments/" + std::to_string(file.number) +
              "?name=" + name.get() + "&kind=" + file.kind;
  call.headers.emplace_back("X-Content-SHA256", current_.content.sha256);
  return call;
}

void SvcUpload::ask_state() {
  desk_.call(call_for_file("GET"), [self = shared_from_this()](const DeskReply &reply) {
    const bool is_known = reply.is_ok() && text_field(reply.body, "sha256") == self->current_.content.sha256;
    if (is_known && flag_field(reply.body, "complete")) return self->on_piece(reply);
    // 404: nothing there yet; 422: what was there was wrong and is gone.
    if (!reply.is_ok() && reply.status != 404 && reply.status != 422) return self->end(reply, "asking");
    const int64_t there = is_known ? number_field(reply.body, "received") : 0;
    self->send_piece(there > 0 && there < self->current_.content.size ? there : 0);
  });
}

void SvcUpload::send_piece(int64_t offset) {
  current_.offset = offset;
  const auto size = static_cast<size_t>(std::min(kPieceBytes, current_.content.size - offset));
  DeskCall call = call_for_file("PUT");
  call.content_type = "application/octet-stream";
  call.body.resize(size);
  if (size > 0) {
    const ssize_t got = pread(current_.content.fd->get(), call.body.data(), size, offset);
    if (got != static_cast<ssize_t>(size)) return skip_file("it became shorter while it was sent");
    const auto last = offset + static_cast<int64_t>(size) - 1;
    call.headers.emplace_back("Content-Range", "bytes " + std::to_string(offset) + "-" +
                                                   std::to_string(last) + "/" +
                                                   std::to_string(current_.content.size));
  }
  desk_.call(std::move(call), [self = shared_from_this()](const DeskReply &reply) { self->on_piece(reply); });
}

void SvcUpload::on_piece(const DeskReply &reply) {
  const int64_t received = number_field(reply.body, "received", -1);
  if (reply.status == 413) return skip_file("the desk takes no file of this size");
  if (reply.status == 416 || reply.status == 422) {
    if (++current_.faults > kMostFaults) return skip_file("it changes while it is sent");
    return open_file();  // its content may be another one by now
  }
  // Anything but progress ends this attempt, or a confused desk would get the same piece for ever.
  const bool has_progress = received > current_.offset && received < current_.content.size;
  if (reply.is_ok() && !flag_field(reply.body, "complete") && has_progress) return send_piece(received);
  const bool has_older_content = reply.status == 409;
  if (!has_older_content && !(reply.is_ok() && flag_field(reply.body, "complete")))
    return end(reply, "sending");
  arrived_.push_back(report_.files[position_].number);
  ++position_;
  next_file();
}

void SvcUpload::skip_file(const char *why) {
  const SvcFile &file = report_.files[position_];
  SVC_LOGE("report %d goes without %s: %s", report_.voc_id, file.path.c_str(), why);
  missing_.push_back(svc_base_name(file.path));
  ++position_;
  next_file();
}

void SvcUpload::complete() {
  const nlohmann::json body = {{"attachments", arrived_}, {"missing", missing_}};
  desk_.call(desk_post("/reports/" + std::to_string(server_id_) + "/complete", body),
             [self = shared_from_this()](const DeskReply &reply) {
               if (!reply.is_ok() || number_field(reply.body, "id") != self->server_id_)
                 return self->end(reply, "completing");
               self->ended_({SvcUploadEnd::Kind::kSent, self->server_id_, true});
             });
}

void SvcUpload::end(const DeskReply &reply, const char *step) {
  SVC_LOGE("report %d: %s failed: %d %s", report_.voc_id, step, reply.status,
           text_field(reply.body, "error").c_str());
  // Only the announcement judges the report itself; a later refusal means that the desk has lost sight of it.
  const bool is_refused = server_id_ == 0 && reply.is_refusal();
  ended_({is_refused ? SvcUploadEnd::Kind::kRefused : SvcUploadEnd::Kind::kFailed, 0, reply.status != 0});
}
