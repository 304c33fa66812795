// The floating control: what is on the screen while a person shows what to capture. The client's own window
// steps aside; a border frames the screen; a small control with a hint lies at its top, where both can be
// dragged aside; while a video is recorded there is only a small window with the time left and a stop button.
// All of them are gone, and the client is back, when the capture has ended. Main loop only.
#pragma once

#include <Elementary.h>

#include "tavro-main.h"

// From a compose screen: capture a screenshot or a video for the open report. False when this machine has no
// capture manager; nothing happens while another capture is open.
bool tavro_capture_start(appdata *ad, captureType type);

// Show the control for what `cType` says and leave the screen to the application `home_app_id`.
void create_floating_ui(appdata *ad, const char *home_app_id);
void tavro_launch_app_homescreen(const char *app_id);

// Whether the compose screen's entries may start a capture.
void enable_btns(appdata *ad);
void disable_btns(appdata *ad);
bool tavro_capture_btns_enabled();

void launch_error_popup(appdata *ad);

// ---- The border (tavro_hoverui_border.cpp) ----

void add_flashing_wins(appdata *ad);
void hide_flash_wins(appdata *ad);
void delete_flash_wins(appdata *ad);

// ---- The control (tavro_hoverui_control.cpp) and its hint (tavro_hoverui_hint.cpp) ----

void add_minicontrol_window(appdata *ad);
void add_minicontrol_layout(appdata *ad);
void delete_minicontrol_window(appdata *ad);
// Above the other windows again, for a recording that goes on or is paused.
void show_minicontrol_window(appdata *ad);
void add_minicontrol_indicator_win(appdata *ad);
void delete_minicontrol_indicator_win(appdata *ad);
bool hide_minicontrol_window(appdata *ad);
// The main button: pause while `is_recording`, else go on.
void set_minicontrol_recording(appdata *ad, bool is_recording);
// Listen for the panel to be off: then tavro_capture_panel_is_off, which ends it.
void wait_for_quickpanel(appdata *ad, bool is_waiting);
// The text `id` is what the button shows and what a screen reader says.
void name_minicontrol_button(Evas_Object *button, const char *id);
// In the place of the control's cross, while there is a recording (tavro_hoverui_discard.cpp): the first
// press asks, a second one within three seconds throws the recording away, unless it was a double tap's.
void add_discard_button(appdata *ad);
void forget_discard_button();

// ---- The time that is left (tavro_hoverui_time.cpp) ----

void add_video_time_win(appdata *ad);
void set_video_time_text(appdata *ad, const char *text);
void move_video_time_win(appdata *ad);
void delete_video_time_win(appdata *ad);

// A group of one of the control's layout files ("minicontrol"); null, after a log line, when it cannot be
// had.
Evas_Object *tavro_hoverui_layout_add(Evas_Object *window, const char *file, const char *group);
// A window above the others that never takes the focus.
Evas_Object *tavro_hoverui_window_add(const char *name);
// What lies below is seen where the window's layout paints nothing, as around round corners.
void tavro_hoverui_see_through(Evas_Object *window);
// Give the window this size, which no window manager may change, and place.
void tavro_hoverui_place(Evas_Object *window, Evas_Object *layout, int x, int y, int width, int height);
// The screen in pixels.
void tavro_hoverui_screen_size(int *width, int *height);
// Let the window follow a finger that lies on the layout's part "drag".
void tavro_hoverui_make_draggable(Evas_Object *window, Evas_Object *layout);
