// The open details page, shared by the sources that build it and by nobody else. Main loop only.
#pragma once

#include <Elementary.h>

#include <string>
#include <vector>

#include "tavro_details_text.h"
#include "tavro_follow_up.h"

struct appdata;

// How much of a long history is built at first, and with each "show more": a page of thousands of widgets
// would stand still.
constexpr size_t kStatesAtFirst = 3;
constexpr size_t kMostStates = 100;
constexpr size_t kMessagesAtFirst = 50;

// The one details page that can be open; `page` null: none.
struct details_page {
  appdata *ad;
  Evas_Object *page, *scroller, *box;
  Evas_Object *delete_button;  // null while the report cannot be deleted
  Elm_Object_Item *nf_it;
  TavroVoc voc;
  TavroVoc first;  // the report that this one is a follow-up to, may be null
  std::vector<tavro_follow_up> follow_ups;
  std::vector<tavro_message> messages;  // as shown, the widgets carry their places
  size_t shown_states, shown_messages;
  bool shows_answer_later;  // once the page has a size, scroll to what support said last
};

// The width that is left for texts, in pixels.
int tavro_details_text_width(const Evas_Object *scroller);
// A box for what belongs to a bubble below its text.
Evas_Object *tavro_details_column_add(Evas_Object *parent);
// A layout in the page's box whose height follows from the width that its texts get.
Evas_Object *tavro_details_add_flowing(details_page *page, const char *group);

// Fill the empty box: status, timeline, conversation.
void tavro_details_build(details_page *page);

// What can be done with the report as it is now: buttons at the foot and in the title bar.
void tavro_details_build_actions(details_page *page);

// What goes into the bubble of the report: tiles of its pictures and videos, rows of its other files that are
// still there. Null when there are none.
Evas_Object *tavro_details_files_add(details_page *page, Evas_Object *bubble);

// A stored report that is not about to go and no other user's; null otherwise.
TavroVoc tavro_details_stored(int voc_id);
// The shown report as it is stored now; null: it has gone. Where that is not what is shown, the page shows so
// at the next turn of the main loop: the button that was touched is still there.
TavroVoc tavro_details_stored_now();
void tavro_details_say_gone(appdata *ad);
void tavro_details_close(appdata *ad);

// Show what is stored at the next turn of the main loop, at the place that the page is scrolled to.
void tavro_details_refresh_later();
// Scroll to what was said last as soon as the page above has gone.
void tavro_details_show_end();
// Show another report instead, at the next turn of the main loop.
void tavro_details_open_later(int voc_id);
// A button with an icon, as bubbles have it. `place` comes to the callback as its data.
Evas_Object *tavro_details_link_add(Evas_Object *parent, const char *icon, const std::string &text,
                                    Evas_Smart_Cb clicked, size_t place);

// The page on which the person writes a follow-up to the report, and sends it. `first` may go after the call.
void tavro_create_follow_up_page(appdata *ad, const svc_voc_data *first, const char *verdict);
