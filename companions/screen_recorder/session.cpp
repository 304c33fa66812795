#include "session.h"

#include <utility>

#include "mp4_repair.h"
#include "recorder_log.h"

namespace {

constexpr guint kLongestSeconds = 10 * 60;  // the client's own limit is a minute
constexpr guint kGraceSeconds = 3;          // after the client has left
constexpr guint kClientDeletesSeconds = 2;

// The client deletes the empty file of a session that never recorded, unless it is ending itself.
void remove_empty_later(MediaFile file) {
  g_timeout_add_seconds_full(
      G_PRIORITY_DEFAULT, kClientDeletesSeconds,
      [](gpointer data) -> gboolean {
        static_cast<MediaFile *>(data)->remove();
        return G_SOURCE_REMOVE;
      },
      new MediaFile(std::move(file)), [](gpointer data) { delete static_cast<MediaFile *>(data); });
}

}  // namespace

Session::Session(int handle, MediaFile file, Done done)
    : handle_(handle), file_(std::move(file)), done_(std::move(done)) {}

std::unique_ptr<Session> Session::open(int handle, MediaFile file, const VideoSettings &settings, Done done) {
  std::unique_ptr<Session> session(new Session(handle, std::move(file), std::move(done)));
  Session *self = session.get();
  if (!self->file_.create()) return nullptr;
  self->recording_ = std::make_unique<Recording>([self](bool is_whole) { self->recording_ended(is_whole); });
  if (!self->recording_->prepare(settings, self->file_.fd())) return nullptr;
  self->limit(kLongestSeconds);
  return session;
}

Session::~Session() {
  recording_.reset();
  if (client_watch_) g_bus_unwatch_name(client_watch_);
  if (limit_source_) g_source_remove(limit_source_);
  if (state_ == State::kReady && file_.fd() >= 0) file_.remove();
}

void Session::limit(guint seconds) {
  if (limit_source_) g_source_remove(limit_source_);
  limit_source_ = g_timeout_add_seconds(seconds, limit_cb, this);
}

void Session::note_client(const std::string &name) {
  if (name.empty() || name == client_) return;
  if (client_watch_) g_bus_unwatch_name(client_watch_);
  client_ = name;
  if (!std::exchange(has_client_, true)) limit(kLongestSeconds);
  client_watch_ = g_bus_watch_name(G_BUS_TYPE_SESSION, name.c_str(), G_BUS_NAME_WATCHER_FLAGS_NONE, nullptr,
                                   client_left_cb, this, nullptr);
}

void Session::change(RecorderRequest request, bool (Recording::*step)(), State from, State to) {
  if (state_ == State::kEnded) return answer_ended(std::move(request));
  if (state_ != from && state_ != to) return refuse(std::move(request), "does not fit in");
  if (state_ == from && !(recording_.get()->*step)()) {
    recording_ended(false);
    return answer_ended(std::move(request));
  }
  state_ = to;
  request.answer_session(handle_);
}

void Session::start(RecorderRequest request) {
  if (state_ == State::kRecording) return refuse(std::move(request), "was started before");
  limit(kLongestSeconds);
  change(std::move(request), &Recording::start, State::kReady, State::kRecording);
}

void Session::pause(RecorderRequest request) {
  change(std::move(request), &Recording::pause, State::kRecording, State::kPaused);
}

void Session::resume(RecorderRequest request) {
  change(std::move(request), &Recording::resume, State::kPaused, State::kRecording);
}

void Session::stop(RecorderRequest request) {
  if (state_ == State::kReady) return shut_down(std::move(request));
  if (state_ == State::kEnded) return answer_ended(std::move(request));
  waiting_.push_back(std::move(request));
  if (!is_recording()) return;
  state_ = State::kFinishing;
  recording_->finish();
}

void Session::shut_down(RecorderRequest request) {
  if (state_ != State::kReady) return stop(std::move(request));
  recording_.reset();
  request.answer_end(true);
  remove_empty_later(std::move(file_));
  close();
}

// The session is gone when this returns.
void Session::close() {
  const Done done = std::move(done_);
  if (done) done(handle_);
}

void Session::refuse(RecorderRequest request, const char *what) {
  RECORDER_LOGE("%s of session %d %s", request.text("action_type").c_str(), handle_, what);
  request.answer_end(false);
}

void Session::answer_ended(RecorderRequest request) {
  request.answer_end(is_succeeded_);
  close();
}

void Session::recording_ended(bool is_whole) {
  is_succeeded_ = settle_file(is_whole);
  state_ = State::kEnded;
  recording_.reset();
  limit(kLongestSeconds);  // for a client that asks for nothing any more
  const bool is_told = !waiting_.empty();
  for (RecorderRequest &request : std::exchange(waiting_, {})) request.answer_end(is_succeeded_);
  if (is_told || !has_client_) close();
}

// Whether the file is what was recorded, all of it.
bool Session::settle_file(bool is_whole) {
  if (is_whole) {
    recording_->save_picture(file_);
    return true;
  }
  if (cut_to_whole_fragments(file_.fd()))
    RECORDER_LOGE("%s ends where the recording failed", file_.path().c_str());
  else
    file_.remove();
  return false;
}

void Session::end_by_itself() {
  if (is_recording()) {
    state_ = State::kFinishing;
    recording_->finish();
  } else if (state_ != State::kFinishing) {
    close();
  }
}

void Session::finish_now() {
  if (is_recording() || state_ == State::kFinishing) recording_ended(recording_->finish_now());
}

void Session::client_left_cb(GDBusConnection *bus, const char *, gpointer data) {
  auto *self = static_cast<Session *>(data);
  if (!bus || !self->has_client_) return;  // without its bus the service ends
  self->has_client_ = false;
  self->limit(kGraceSeconds);
}

gboolean Session::limit_cb(gpointer data) {
  auto *self = static_cast<Session *>(data);
  self->limit_source_ = 0;
  RECORDER_LOGI("session %d ends: %s", self->handle_,
                self->has_client_ ? "it has lasted long enough" : "its client has left");
  self->end_by_itself();
  return G_SOURCE_REMOVE;
}
