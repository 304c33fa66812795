// The files behind tavro_thumbnail_maker.h. Any thread; blocks for as long as the disk takes.
#pragma once

#include <string>

#include "tavro_thumbnail_maker.h"

// Whether an entry is there and ends as a JPEG does.
bool tavro_thumbnail_cache_is_whole(const std::string &entry);

// Write an entry; what cannot be written is made anew next time.
void tavro_thumbnail_cache_store(const std::string &entry, const tavro_thumbnail_pixels &pixels, int side);
