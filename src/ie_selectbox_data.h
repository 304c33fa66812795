// The state of one crop box, shared by its drawing (ie_selectbox.cpp) and its touches
// (ie_selectbox_touch.cpp).
#pragma once

#include <Evas.h>

#include "ie_selectbox_geometry.h"

struct Smart_Data {
  Evas_Object *obj;
  bool bShow;
  struct {
    int x, y, w, h;
  } cRect;
  ie::CRect sRect;  // the box when the touch began
  ie::CRect tRect;  // where the box may be
  ie_grasp m_grasp;
  Evas_Object *target;  // the picture; null once it is gone
  bool bResized;        // by the touch that holds it
  bool bMultiTouch;
  Evas_Object *m_event;  // clear; takes the touches
  Evas_Object *crop_dot[8];
  Evas_Object *crop_line[4];
  Evas_Object *crop_dim_rect[4];
  int nNumer, nDenom;
  bool bset_ratio;
  bool bKeep_current_ratio_set;  // by the shift key, while a touch holds a corner

  bool bActive, bDim;
  double minimum_units;
};

Smart_Data *ie_selectbox_data(const Evas_Object *box);
// Half the side of a handle's square, in pixels.
int ie_selectbox_handle_half();
ie::CRect ie_selectbox_rect(const Smart_Data *data);
void ie_selectbox_place(Smart_Data *data, const ie::CRect &rect);
// The rules of now: the picture may have moved, the window turned.
ie_box_rules ie_selectbox_rules(Smart_Data *data);
// Take the touches of m_event.
void ie_selectbox_listen(Smart_Data *data);
