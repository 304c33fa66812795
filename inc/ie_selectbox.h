// The crop box: an object of the canvas that lies over a picture, with eight handles on its outline and the
// rest of the picture dimmed. It is moved and resized by touch; its own geometry does not matter, only the
// picture's. Main loop only; belongs to the canvas and is deleted as any object.
//
// Smart callbacks: "moved" while a touch moves it, "changed" when such a touch ends.
#pragma once

#include <Evas.h>

#include "ie_selectbox_geometry.h"

// Null when there is no memory.
Evas_Object *ie_selectbox_add(Evas_Object *parent);

// Lay the box over an image: over all of it, until a region is set.
void ie_selectbox_attach(Evas_Object *box, Evas_Object *image);

// Fix the ratio of width to height; anything not above 0 frees it.
void ie_selectbox_set_ratio(Evas_Object *box, int numerator, int denominator);

// The chosen area in pixels of the canvas. Setting it brings it into the picture and calls nothing.
void ie_selectbox_get_region(const Evas_Object *box, int *x, int *y, int *w, int *h);
void ie_selectbox_set_region(Evas_Object *box, int x, int y, int w, int h);

// Move or resize by these pixels, as a touch at that part would; for keys.
void ie_selectbox_drag(Evas_Object *box, ie_grasp grasp, int dx, int dy);

// Whether it has handles and takes touches (it does at first), and whether it dims what lies around it.
void ie_selectbox_set_active(Evas_Object *box, bool is_active);
void ie_selectbox_set_dim(Evas_Object *box, bool is_dimming);
// How dark that is, of 255; 140 at first.
void ie_selectbox_set_dim_strength(Evas_Object *box, int strength);
// Smallest width and height, in units of the scale factor; 50 at first.
void ie_selectbox_set_minimum(Evas_Object *box, double units);
