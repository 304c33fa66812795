// What an MP4 file says of itself, and the picture that lies beside it. Any thread; of the video the headers
// alone are read, a few hundred bytes.
#pragma once

#include <string>

// Length in seconds; 0 when the file does not tell: no MP4 file, damaged, or a recording that was cut short.
double tavro_video_seconds(const char *path);

// Whether a player shows something of it: it is whole, or was cut short behind a part that is.
bool tavro_video_is_playable(const char *path);

// Name of the picture of a video, in the same folder: a hidden JPEG file that the screen recorder makes of
// the first frame of what it has recorded. Who removes the video removes it too.
inline std::string tavro_video_picture_name(const std::string &video_name) {
  return "." + video_name + ".jpg";
}

// The path of that picture; it may not be there.
std::string tavro_video_picture_path(const std::string &video_path);

// "0:07", "12:30", "1:02:03"; empty for 0.
std::string tavro_video_length_text(double seconds);
