// One screenshot: the whole screen as a JPEG file.
#pragma once

#include <functional>

#include "media_file.h"

// `orientation`: the degrees by which the phone is turned; the picture is turned back so that it is upright.
// `then` is told on the main loop whether the file is there, mostly before this returns; failures are logged.
void take_screenshot(MediaFile file, int orientation, std::function<void(bool is_saved)> then);
