/* The state of the phone's display, as DEVICE_CALLBACK_DISPLAY_STATE reports it. */
#pragma once

typedef enum {
  DISPLAY_STATE_NORMAL = 0,
  DISPLAY_STATE_SCREEN_DIM,
  DISPLAY_STATE_SCREEN_OFF,
} display_state_e;
