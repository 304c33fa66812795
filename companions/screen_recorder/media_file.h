// A file that the recorder is asked to make: below the phone's media folder, reached without following a
// link, the user's alone (folders 0700, files 0600), and never in the place of another file. Failures are
// logged here. Any thread, one at a time for each object.
#pragma once

#include <optional>
#include <string>

#include "tavro_handles.h"

class MediaFile {
 public:
  // Opens the folder of `path`, making what is missing of it. None when the path leads outside, is no plain
  // name with this extension, or the file is there already.
  static std::optional<MediaFile> find(const std::string &path, const char *extension);

  const std::string &path() const { return path_; }

  // Make the empty file, which stays, and remove what pictures of videos lie in its folder without their
  // video; remove() takes it away again. False when somebody was faster.
  bool create();
  // Write the whole file under another name first, so that it appears complete or not at all.
  bool save(const void *bytes, size_t size) const;

  // The picture of this file, a video, which lies beside it.
  bool save_picture(const void *bytes, size_t size) const;

  // Of a created file.
  int fd() const { return fd_.get(); }
  // Only while the name still means the file that was created.
  void remove() const;

 private:
  MediaFile(std::string path, TavroFd folder);
  bool save_as(const std::string &name, const void *bytes, size_t size) const;

  std::string path_, name_;
  TavroFd folder_, fd_;
};
