// The screen recorder's side of the capture protocol: takes launch requests, each with an "action_type", and
// answers each once. Several programs may ask; one of them records at a time. Main loop only.
#pragma once

#include <map>

#include "session.h"

class Recorder {
 public:
  void take(app_control_h request);
  // Nothing is open and nothing was asked since the last call.
  bool is_idle();
  // The service ends: recordings are finished, at most two seconds each; who waits is answered.
  void end();

 private:
  struct Action;
  static const Action kActions[];

  void run(RecorderRequest request);
  void take_screenshot(RecorderRequest request);
  void open_session(RecorderRequest request);
  void start(RecorderRequest request);
  void pause(RecorderRequest request);
  void resume(RecorderRequest request);
  void stop(RecorderRequest request);
  void shut_down(RecorderRequest request);

  Session *add_session(const RecorderRequest &request);
  void in_session(RecorderRequest request, void (Session::*act)(RecorderRequest));
  bool is_recording() const;
  void prepare_video(RecorderRequest request);
  static void prepared_cb(GObject *source, GAsyncResult *result, gpointer data);

  std::map<int, std::unique_ptr<Session>> sessions_;
  int last_handle_ = g_random_int_range(1, 1000000000);  // no handle of an earlier run fits
  int open_screenshots_ = 0;
  bool was_asked_ = false;
  enum class Video { kUnknown, kPreparing, kThere, kMissing } video_ = Video::kUnknown;
  std::vector<RecorderRequest> early_;  // until it is known whether there is video
};
