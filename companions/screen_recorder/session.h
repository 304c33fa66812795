// One session of the recorder, which its handle names: ready, recording, paused, finishing, ended. A session
// that ended by itself (it failed, or recorded for too long) stays until its client asks for something and
// thus learns the result; one whose client leaves the bus is finished and goes. A recording that failed keeps
// its file up to the last whole second, or loses it when there is none. Main loop only.
#pragma once

#include <memory>
#include <vector>

#include "media_file.h"
#include "recorder_request.h"
#include "recording.h"

class Session {
 public:
  // Asked to delete the session, from the main loop or out of a call of the session's last function.
  using Done = std::function<void(int handle)>;

  // Makes the file and prepares the recording; null after a log line, and then there is no file.
  static std::unique_ptr<Session> open(int handle, MediaFile file, const VideoSettings &settings, Done done);
  ~Session();

  int handle() const { return handle_; }
  bool is_ready() const { return state_ == State::kReady; }
  bool is_recording() const { return state_ == State::kRecording || state_ == State::kPaused; }

  // Each answers the request. The session may be gone when they return.
  void start(RecorderRequest request);
  void pause(RecorderRequest request);
  void resume(RecorderRequest request);
  void stop(RecorderRequest request);
  void shut_down(RecorderRequest request);
  // Whoever asked last is the client.
  void note_client(const std::string &name);
  // The service ends.
  void finish_now();

 private:
  enum class State { kReady, kRecording, kPaused, kFinishing, kEnded };

  Session(int handle, MediaFile file, Done done);
  void change(RecorderRequest request, bool (Recording::*step)(), State from, State to);
  void answer_ended(RecorderRequest request);
  void refuse(RecorderRequest request, const char *what);
  void end_by_itself();
  void close();
  void recording_ended(bool is_whole);
  bool settle_file(bool is_whole);
  void limit(guint seconds);
  static void client_left_cb(GDBusConnection *bus, const char *name, gpointer data);
  static gboolean limit_cb(gpointer data);

  const int handle_;
  MediaFile file_;
  Done done_;
  std::unique_ptr<Recording> recording_;
  State state_ = State::kReady;
  bool is_succeeded_ = false;  // once it has ended
  bool has_client_ = true;
  std::vector<RecorderRequest> waiting_;  // for the end
  std::string client_;
  guint client_watch_ = 0, limit_source_ = 0;
};
