#include "recording_pipeline.h"

#include <string>

#include "recorder_log.h"
#include "screen_frame.h"

namespace {

constexpr guint kFragmentMilliseconds = 1000;  // what a killed recorder loses at most, and a frame

struct Element {
  const char *factory;
  const char *name;
  const char *package;  // where Debian has it
};

// In the order of the chain.
constexpr Element kElements[] = {
    {"ximagesrc", "screen", "gstreamer1.0-plugins-good"},
    {"capsfilter", "taken", "libgstreamer1.0-0"},
    {"videorate", "rate", "gstreamer1.0-plugins-base"},
    {"videoscale", "scale", "gstreamer1.0-plugins-base"},
    {"videoconvert", "convert", "gstreamer1.0-plugins-base"},
    {"capsfilter", "frames", "libgstreamer1.0-0"},
    {"x264enc", "encoder", "gstreamer1.0-plugins-ugly"},
    {"capsfilter", "format", "libgstreamer1.0-0"},
    {"mp4mux", "file", "gstreamer1.0-plugins-good"},
    {"fdsink", "sink", "libgstreamer1.0-0"},
};

bool add_elements(GstElement *pipeline) {
  GstElement *last = nullptr;
  for (const Element &wanted : kElements) {
    GstElement *element = gst_element_factory_make(wanted.factory, wanted.name);
    if (!element) {
      RECORDER_LOGE("the screen cannot be recorded: the GStreamer element %s is missing, Debian has it in %s",
                    wanted.factory, wanted.package);
      return false;
    }
    gst_bin_add(GST_BIN(pipeline), element);
    if (last && !gst_element_link(last, element)) {
      RECORDER_LOGE("the screen cannot be recorded: no way to %s", wanted.factory);
      return false;
    }
    last = element;
  }
  return true;
}

void set_property(GstElement *pipeline, const char *name, const char *property, const std::string &value) {
  const GstPipelinePtr element(gst_bin_get_by_name(GST_BIN(pipeline), name));
  gst_util_set_object_arg(G_OBJECT(element.get()), property, value.c_str());
}

// Constant quality, not a rate: most of a screen stands still most of the time. Less is better.
const char *quantizer_of(VideoQuality quality) {
  switch (quality) {
    case VideoQuality::kHigh:
      return "20";
    case VideoQuality::kMiddle:
      return "26";
    case VideoQuality::kLow:
      return "32";
  }
  return "26";
}

void leave_out_frame(GstElement *pipeline) {
  const auto area = area_within_frame();
  if (!area) return;
  set_property(pipeline, "screen", "startx", std::to_string(area->left));
  set_property(pipeline, "screen", "starty", std::to_string(area->top));
  set_property(pipeline, "screen", "endx", std::to_string(area->right));
  set_property(pipeline, "screen", "endy", std::to_string(area->bottom));
}

}  // namespace

bool set_up_gstreamer() {
  TavroError error;
  if (gst_init_check(nullptr, nullptr, tavro_out(error))) return true;
  RECORDER_LOGE("GStreamer cannot be used: %s", error ? error->message : "no reason given");
  return false;
}

GstPipelinePtr make_recording_pipeline(const VideoSettings &settings, int fd) {
  GstPipelinePtr made(GST_ELEMENT(gst_object_ref_sink(gst_pipeline_new("recording"))));
  GstElement *pipeline = made.get();
  if (!add_elements(pipeline)) return nullptr;
  const std::string fps = std::to_string(settings.fps);
  const std::string properties[][3] = {
      {"screen", "use-damage", "false"},
      {"screen", "show-pointer", "true"},
      {"taken", "caps", "video/x-raw,framerate=" + fps + "/1"},
      {"scale", "add-borders", "true"},
      {"frames", "caps",
       "video/x-raw,format=I420,colorimetry=bt601,pixel-aspect-ratio=1/1,width=" +
           std::to_string(settings.width) + ",height=" + std::to_string(settings.height) +
           ",framerate=" + fps + "/1"},
      {"encoder", "tune", "zerolatency"},
      {"encoder", "speed-preset", "veryfast"},
      {"encoder", "threads", "1"},
      {"encoder", "pass", "qual"},
      {"encoder", "quantizer", quantizer_of(settings.quality)},
      {"encoder", "key-int-max", fps},
      {"format", "caps", "video/x-h264,profile=constrained-baseline"},  // every decoder knows that one
      {"file", "fragment-duration", std::to_string(kFragmentMilliseconds)},
      {"file", "fragment-mode", "first-moov-then-finalise"},
      {"sink", "fd", std::to_string(fd)},
      {"sink", "async", "false"},
  };
  for (const auto &[name, property, value] : properties)
    set_property(pipeline, name.c_str(), property.c_str(), value);
  leave_out_frame(pipeline);
  return made;
}
