#include "recording.h"

#include "recorder_log.h"
#include "video_picture.h"

namespace {

constexpr guint kFinishSeconds = 5;
constexpr GstClockTime kFinishNowTime = 2 * GST_SECOND;
constexpr auto kLastMessages = static_cast<GstMessageType>(GST_MESSAGE_EOS | GST_MESSAGE_ERROR);

using Bus = TavroHandle<GstBus, gst_object_unref>;
using Element = GstPipelinePtr;
using Pad = TavroHandle<GstPad, gst_object_unref>;
using Clock = TavroHandle<GstClock, gst_object_unref>;
using Message = TavroHandle<GstMessage, gst_message_unref>;

void watch_source_pad(GstElement *pipeline, const char *element_name, GstPadProbeCallback callback,
                      gpointer data) {
  const Element element(gst_bin_get_by_name(GST_BIN(pipeline), element_name));
  const Pad pad(gst_element_get_static_pad(element.get(), "src"));
  gst_pad_add_probe(pad.get(), GST_PAD_PROBE_TYPE_BUFFER, callback, data, nullptr);
}

}  // namespace

Recording::~Recording() {
  release();
}

bool Recording::prepare(const VideoSettings &settings, int fd) {
  pipeline_ = make_recording_pipeline(settings, fd);
  if (!pipeline_) return false;
  width_ = settings.width;
  height_ = settings.height;
  frame_time_ = GST_SECOND / static_cast<GstClockTime>(settings.fps);
  watch_source_pad(pipeline_.get(), "screen", taken_cb, this);
  watch_source_pad(pipeline_.get(), "frames", frame_cb, this);
  const Bus bus(gst_element_get_bus(pipeline_.get()));
  gst_bus_add_watch(bus.get(), message_cb, this);
  return set_state(GST_STATE_PAUSED);  // opens the display; a live source waits for the start
}

bool Recording::start() {
  return set_state(GST_STATE_PLAYING);
}

bool Recording::pause() {
  is_paused_ = true;
  return set_state(GST_STATE_PAUSED);
}

bool Recording::resume() {
  is_paused_ = false;
  return set_state(GST_STATE_PLAYING);
}

bool Recording::set_state(GstState state) {
  if (gst_element_set_state(pipeline_.get(), state) != GST_STATE_CHANGE_FAILURE) return true;
  const Bus bus(gst_element_get_bus(pipeline_.get()));
  const Message message(gst_bus_pop_filtered(bus.get(), GST_MESSAGE_ERROR));
  log_error(message.get());
  return false;
}

// How long it has recorded.
GstClockTime Recording::running_time() const {
  if (is_paused_) return gst_element_get_start_time(pipeline_.get());
  const Clock clock(gst_element_get_clock(pipeline_.get()));
  return clock ? gst_clock_get_time(clock.get()) - gst_element_get_base_time(pipeline_.get()) : 0;
}

// What the screen shows after the stop is nobody's business.
GstPadProbeReturn Recording::taken_cb(GstPad *, GstPadProbeInfo *, gpointer data) {
  return static_cast<Recording *>(data)->stop_time_ == GST_CLOCK_TIME_NONE ? GST_PAD_PROBE_OK
                                                                           : GST_PAD_PROBE_DROP;
}

// The frame in which the stop falls is kept when more than half of it was recorded, and the first one always:
// so the length is right to half a frame.
GstPadProbeReturn Recording::frame_cb(GstPad *, GstPadProbeInfo *info, gpointer data) {
  auto *self = static_cast<Recording *>(data);
  const GstClockTime stop_time = self->stop_time_;
  const GstClockTime shown = GST_BUFFER_PTS(GST_PAD_PROBE_INFO_BUFFER(info));
  const bool is_late =
      stop_time != GST_CLOCK_TIME_NONE && shown > 0 && shown + self->frame_time_ / 2 > stop_time;
  if (is_late) return GST_PAD_PROBE_DROP;
  if (!self->has_frames_) self->first_frame_.reset(gst_buffer_ref(GST_PAD_PROBE_INFO_BUFFER(info)));
  self->has_frames_ = true;
  return GST_PAD_PROBE_OK;
}

void Recording::ask_for_end() {
  stop_time_ = running_time();
  // The end passes through a running pipeline only.
  if (is_paused_) resume();
  gst_element_send_event(pipeline_.get(), gst_event_new_eos());
}

void Recording::finish() {
  if (late_source_) return;
  late_source_ = g_timeout_add_seconds(kFinishSeconds, late_cb, this);
  ask_for_end();
}

bool Recording::finish_now() {
  const Bus bus(gst_element_get_bus(pipeline_.get()));
  gst_bus_remove_watch(bus.get());
  if (!late_source_) ask_for_end();
  const Message message(gst_bus_timed_pop_filtered(bus.get(), kFinishNowTime, kLastMessages));
  const bool has_ended_well = is_whole(message.get());
  release();
  return has_ended_well;
}

void Recording::save_picture(const MediaFile &video) const {
  const std::vector<unsigned char> jpeg = make_video_picture(first_frame_.get(), width_, height_);
  if (!jpeg.empty()) video.save_picture(jpeg.data(), jpeg.size());
}

void Recording::release() {
  if (late_source_) g_source_remove(std::exchange(late_source_, 0));
  if (!pipeline_) return;
  const Bus bus(gst_element_get_bus(pipeline_.get()));
  gst_bus_remove_watch(bus.get());
  gst_element_set_state(pipeline_.get(), GST_STATE_NULL);
  pipeline_.reset();
}

void Recording::end(bool is_whole) {
  release();
  const Ended ended = std::move(ended_);
  ended_ = nullptr;
  if (ended) ended(is_whole);
}

// What the last message, null when none came, says of the file. A fault is logged.
bool Recording::is_whole(GstMessage *message) const {
  if (!message || GST_MESSAGE_TYPE(message) != GST_MESSAGE_EOS)
    log_error(message);
  else if (!has_frames_)
    RECORDER_LOGE("the recording was stopped before its first picture");
  else
    return true;
  return false;
}

void Recording::log_error(GstMessage *message) const {
  if (!message || GST_MESSAGE_TYPE(message) != GST_MESSAGE_ERROR) {
    RECORDER_LOGE("the recording fails without a reason given");
    return;
  }
  TavroError error;
  TavroGText details;
  gst_message_parse_error(message, tavro_out(error), tavro_out(details));
  RECORDER_LOGE("the recording fails: %s (%s)", error->message, details ? details.get() : "");
}

gboolean Recording::message_cb(GstBus *, GstMessage *message, gpointer data) {
  if (GST_MESSAGE_TYPE(message) & kLastMessages) {
    auto *self = static_cast<Recording *>(data);
    self->end(self->is_whole(message));
  }
  return G_SOURCE_CONTINUE;  // or gone already
}

gboolean Recording::late_cb(gpointer data) {
  auto *self = static_cast<Recording *>(data);
  self->late_source_ = 0;
  RECORDER_LOGE("the recording does not end in time");
  self->end(false);
  return G_SOURCE_REMOVE;
}
