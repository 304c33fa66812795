// How the files of pictures come into being and are made known. Any thread; waits for the disk.
#pragma once

#include <functional>

// Make a new file: `write` fills it, by the descriptor or by the name that it has meanwhile, and says whether
// that worked. It appears under `path`, readable by its owner alone, once its content is safe on the disk.
// False with a log line, and nothing left behind, when that fails or there is something under `path` already.
bool tavro_image_write_new(const char *path, const std::function<bool(int fd, const char *name)> &write);

// Tell the media database that the file is there, or is not any more. An error of that database; 0 for none.
int tavro_tell_media_database(const char *path);
