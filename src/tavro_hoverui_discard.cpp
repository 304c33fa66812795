// Throwing a running recording away: asked for twice.
#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_hoverui.h"
#include "tavro_widgets.h"

namespace {

constexpr double kSureSeconds = 3.0;
constexpr double kDoubleTapSeconds = 0.5;
Ecore_Timer *_sure = nullptr;  // a second press throws it away
double _asked_at = 0;          // with _sure, on the loop's clock

Eina_Bool _not_sure_cb(void *data) {
  _sure = nullptr;
  name_minicontrol_button(static_cast<Evas_Object *>(data), "IDS_OB_BUTTON_DISCARD");
  return ECORE_CALLBACK_CANCEL;
}

void _discard_clicked_cb(void *data, Evas_Object *button, void *event_info) {
  if (_sure) {
    if (ecore_loop_time_get() - _asked_at < kDoubleTapSeconds) return;
    forget_discard_button();
    return cancel_btn_clicked_cb(data, button, event_info);
  }
  name_minicontrol_button(button, "IDS_OB_BUTTON_DISCARD_SURE");
  _asked_at = ecore_loop_time_get();
  _sure = ecore_timer_add(kSureSeconds, _not_sure_cb, button);
}

}  // namespace

// A cross would close the panel, for all that anybody knows.
void add_discard_button(appdata *ad) {
  Evas_Object *layout = ad->minicontrol_layout;
  Evas_Object *cancel = elm_object_part_content_unset(layout, "cancel_btn_swallow");
  if (cancel) evas_object_del(cancel);
  Evas_Object *discard = tavro_button_add(layout, "tavro_flat_danger", tavro_text("IDS_OB_BUTTON_DISCARD"),
                                          nullptr, nullptr, _discard_clicked_cb, ad);
  elm_object_part_content_set(layout, "cancel_btn_swallow", discard);
}

void forget_discard_button() {
  if (_sure) ecore_timer_del(_sure);
  _sure = nullptr;
}
