// Small pictures of picture and video files, made off the main loop and kept in a folder of the client's own,
// so that a second look costs no decoding.
//
// Called and calling back on the main loop. On disk: one JPEG per file and size under
// TAVRO_THUMBNAIL_FOLDER, named after path, size and time of change; the oldest go when there are too many.
#pragma once

#define TAVRO_THUMBNAIL_FOLDER "/opt/usr/apps/corvane.tavro-lite/data/thumbnails"

#include <Elementary.h>

// A picture of `units` by `units` (cropped to fill), empty until the thumbnail is there; of a video, its
// length, on its picture when it has one; a plain tile where the file cannot be read as a picture. The widget
// belongs to its parent; deleting it gives up the work for it.
Evas_Object *tavro_thumbnail_add(Evas_Object *parent, const char *path, int units);
