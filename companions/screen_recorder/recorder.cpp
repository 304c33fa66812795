#include "recorder.h"

#include "recorder_log.h"
#include "screen_picture.h"
#include "screenshot.h"

namespace {

constexpr int kLeastSide = 16, kMostSide = 4096;  // pixels
constexpr int kMostFps = 30;
constexpr int kShownBytes = 60;  // of a text that somebody else chose

// The video's format has colours for every second pixel.
int even_side(const RecorderRequest &request, const char *key) {
  return request.number(key, kLeastSide, kMostSide, 0) & ~1;
}

VideoQuality quality_of(const RecorderRequest &request) {
  const std::string name = request.text("video_quality");
  return name == "HIGH" ? VideoQuality::kHigh : name == "LOW" ? VideoQuality::kLow : VideoQuality::kMiddle;
}

std::optional<VideoSettings> settings_of(const RecorderRequest &request) {
  VideoSettings settings;
  settings.width = even_side(request, "video_width");
  settings.height = even_side(request, "video_height");
  settings.fps = request.number("video_fps", 1, G_MAXINT, 0);
  settings.fps = settings.fps > kMostFps ? kMostFps : settings.fps;
  settings.quality = quality_of(request);
  if (settings.width && settings.height && settings.fps) return settings;
  RECORDER_LOGE("no video of %.20s x %.20s pixels at %.20s frames a second",
                request.text("video_width").c_str(), request.text("video_height").c_str(),
                request.text("video_fps").c_str());
  return std::nullopt;
}

}  // namespace

struct Recorder::Action {
  const char *name;
  bool needs_video;
  void (Recorder::*act)(RecorderRequest request);
};

const Recorder::Action Recorder::kActions[] = {
    {"Screenshot", false, &Recorder::take_screenshot}, {"Video_Init", true, &Recorder::open_session},
    {"Video_Start", true, &Recorder::start},           {"Video_Pause", true, &Recorder::pause},
    {"Video_Resume", true, &Recorder::resume},         {"Video_Stop", true, &Recorder::stop},
    {"Video_Shutdown", true, &Recorder::shut_down},
};

void Recorder::take(app_control_h request) {
  was_asked_ = true;
  run(RecorderRequest(request));
}

void Recorder::run(RecorderRequest request) {
  const std::string name = request.text("action_type");
  for (const Action &action : kActions) {
    if (name != action.name) continue;
    if (action.needs_video && video_ != Video::kThere) return prepare_video(std::move(request));
    return (this->*action.act)(std::move(request));
  }
  RECORDER_LOGE("a request for the unknown action \"%.*s\"", kShownBytes, name.c_str());
  request.answer_end(false);
}

// GStreamer looks at every plugin of the machine first, which may take seconds; meanwhile requests wait.
void Recorder::prepare_video(RecorderRequest request) {
  if (video_ == Video::kMissing) return request.answer_end(false);
  early_.push_back(std::move(request));
  if (video_ == Video::kPreparing) return;
  video_ = Video::kPreparing;
  const TavroObject<GTask> task(g_task_new(nullptr, nullptr, prepared_cb, this));
  g_task_run_in_thread(task.get(), [](GTask *running, gpointer, gpointer, GCancellable *) {
    g_task_return_boolean(running, set_up_gstreamer());
  });
}

void Recorder::prepared_cb(GObject *, GAsyncResult *result, gpointer data) {
  auto *self = static_cast<Recorder *>(data);
  self->video_ = g_task_propagate_boolean(G_TASK(result), nullptr) ? Video::kThere : Video::kMissing;
  for (RecorderRequest &request : std::exchange(self->early_, {})) self->run(std::move(request));
}

void Recorder::take_screenshot(RecorderRequest request) {
  auto file = MediaFile::find(request.text("outfilename"), ".jpg");
  if (!file) return request.answer_end(false);
  const int orientation = request.number("orientation", 0, 359, 0);
  const auto waiting = std::make_shared<RecorderRequest>(std::move(request));
  ++open_screenshots_;
  ::take_screenshot(std::move(*file), orientation, [this, waiting](bool is_saved) {
    --open_screenshots_;
    waiting->answer_end(is_saved);
  });
}

bool Recorder::is_recording() const {
  for (const auto &[handle, session] : sessions_)
    if (session->is_recording()) return true;
  return false;
}

// Null after a log line.
Session *Recorder::add_session(const RecorderRequest &request) {
  if (is_recording()) {
    RECORDER_LOGE("%s while another session records", request.text("action_type").c_str());
    return nullptr;
  }
  if (!has_x_screen()) {
    RECORDER_LOGE("the screen cannot be recorded: no X display holds the whole of it");
    return nullptr;
  }
  const auto settings = settings_of(request);
  auto file = settings ? MediaFile::find(request.text("outfilename"), ".mp4") : std::nullopt;
  if (!file) return nullptr;
  // One that never started gives way.
  for (auto each = sessions_.begin(); each != sessions_.end();)
    each = each->second->is_ready() ? sessions_.erase(each) : std::next(each);
  const int handle = ++last_handle_;
  auto session =
      Session::open(handle, std::move(*file), *settings, [this](int ended) { sessions_.erase(ended); });
  if (!session) return nullptr;
  session->note_client(request.caller());
  return (sessions_[handle] = std::move(session)).get();
}

void Recorder::open_session(RecorderRequest request) {
  const Session *session = add_session(request);
  if (!session) return request.answer_end(false);
  request.answer_session(session->handle());
}

// A client that opened no session before gives all that is needed here.
void Recorder::start(RecorderRequest request) {
  if (request.text("outfilename").empty()) return in_session(std::move(request), &Session::start);
  Session *session = add_session(request);
  if (!session) return request.answer_end(false);
  session->start(std::move(request));
}

void Recorder::in_session(RecorderRequest request, void (Session::*act)(RecorderRequest)) {
  const auto found = sessions_.find(request.number("handle", 1, G_MAXINT, 0));
  if (found == sessions_.end()) {
    RECORDER_LOGE("%s: no session has the handle \"%.*s\"", request.text("action_type").c_str(), kShownBytes,
                  request.text("handle").c_str());
    return request.answer_end(false);
  }
  found->second->note_client(request.caller());
  (found->second.get()->*act)(std::move(request));
}

void Recorder::pause(RecorderRequest request) {
  in_session(std::move(request), &Session::pause);
}

void Recorder::resume(RecorderRequest request) {
  in_session(std::move(request), &Session::resume);
}

void Recorder::stop(RecorderRequest request) {
  in_session(std::move(request), &Session::stop);
}

void Recorder::shut_down(RecorderRequest request) {
  in_session(std::move(request), &Session::shut_down);
}

bool Recorder::is_idle() {
  return !std::exchange(was_asked_, false) && sessions_.empty() && early_.empty() && open_screenshots_ == 0;
}

void Recorder::end() {
  early_.clear();
  while (!sessions_.empty()) {
    const std::unique_ptr<Session> session = std::move(sessions_.begin()->second);
    sessions_.erase(sessions_.begin());
    session->finish_now();
  }
}
