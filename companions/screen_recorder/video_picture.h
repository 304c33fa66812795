// The small picture that stands for a video.
#pragma once

#include <gst/gst.h>

#include <vector>

// A JPEG file of a frame as the recording pipeline makes them. Empty after a log line.
std::vector<unsigned char> make_video_picture(GstBuffer *frame, int width, int height);
