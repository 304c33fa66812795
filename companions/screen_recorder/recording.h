// One recording of the screen into an open file. Prepared, it holds everything ready, so that it starts at
// once; it runs, pauses and runs again, with times that leave the pauses out; it is finished once, by
// finish() or by itself when it fails. Main loop only; nothing but finish_now() waits.
//
// The file is a fragmented MP4 that gains a fragment each second and is played up to its last fragment when
// the process is killed; finishing makes it a plain MP4 with one index.
#pragma once

#include <atomic>
#include <functional>

#include "media_file.h"
#include "recording_pipeline.h"

class Recording {
 public:
  // Told once; the recording may be deleted in it. False: it failed, or was over before there was a frame
  // (logged), and the file ends where it ends.
  using Ended = std::function<void(bool is_whole)>;

  explicit Recording(Ended ended) : ended_(std::move(ended)) {}
  Recording(const Recording &) = delete;
  Recording &operator=(const Recording &) = delete;
  ~Recording();

  // False after a log line. `fd` must stay open as long as this lives.
  bool prepare(const VideoSettings &settings, int fd);
  bool start();
  bool pause();
  bool resume();
  void finish();
  // Finishes within two seconds or leaves it; tells nobody. True when the file is whole.
  bool finish_now();
  // Once it is over: its first frame as the picture of `video`. Logs when that fails.
  void save_picture(const MediaFile &video) const;

 private:
  struct UnrefBuffer {
    void operator()(GstBuffer *buffer) const { gst_buffer_unref(buffer); }
  };

  static gboolean message_cb(GstBus *bus, GstMessage *message, gpointer data);
  static gboolean late_cb(gpointer data);
  static GstPadProbeReturn taken_cb(GstPad *pad, GstPadProbeInfo *info, gpointer data);
  static GstPadProbeReturn frame_cb(GstPad *pad, GstPadProbeInfo *info, gpointer data);
  bool set_state(GstState state);
  GstClockTime running_time() const;
  void ask_for_end();
  void release();
  void end(bool is_whole);
  bool is_whole(GstMessage *message) const;
  void log_error(GstMessage *message) const;

  Ended ended_;
  GstPipelinePtr pipeline_;
  bool is_paused_ = false;
  guint late_source_ = 0;
  int width_ = 0, height_ = 0;   // pixels
  GstClockTime frame_time_ = 0;  // nanoseconds that one frame is shown
  // From here on nothing is recorded any more; read by the pipeline's threads.
  std::atomic<GstClockTime> stop_time_{GST_CLOCK_TIME_NONE};
  std::atomic<bool> has_frames_{false};
  // Set with the first frame, by the pipeline's threads; to be read when these are gone.
  std::unique_ptr<GstBuffer, UnrefBuffer> first_frame_;
};
