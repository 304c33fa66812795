// The chain of GStreamer elements that turns the X display into an MP4 file. Call set_up_gstreamer() first.
#pragma once

#include <gst/gst.h>

#include "tavro_handles.h"

enum class VideoQuality { kHigh, kMiddle, kLow };

struct VideoSettings {
  int width = 0, height = 0;  // pixels of the video; the screen is fitted in
  int fps = 0;
  VideoQuality quality = VideoQuality::kHigh;
};

using GstPipelinePtr = TavroHandle<GstElement, gst_object_unref>;

// May read all plugins of the machine: blocks, for seconds the first time. Any thread.
bool set_up_gstreamer();

// In state NULL, writing to `fd`, which stays the caller's. Null after a log line that names what is missing.
// Frames are I420 with the colours of BT.601, their planes one behind the other. The screen's element is
// named "screen", the one behind which frames have their final times "frames".
GstPipelinePtr make_recording_pipeline(const VideoSettings &settings, int fd);
