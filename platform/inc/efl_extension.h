/* Hardware keys of the phone for widgets: the back key (Escape, XF86Back, the mouse's back button) and the
 * menu key. A press goes to one object only: the topmost visible one that asked for it. Main loop only. */
#pragma once

#include <Elementary.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  EEXT_CALLBACK_BACK,
  EEXT_CALLBACK_MORE,
  EEXT_CALLBACK_LAST,
} Eext_Callback_Type;

typedef void (*Eext_Event_Cb)(void *data, Evas_Object *obj, void *event_info);

/* Dropped by itself when the object is deleted. */
void eext_object_event_callback_add(Evas_Object *obj, Eext_Callback_Type type, Eext_Event_Cb func,
                                    void *data);
/* The data given at the addition, null when there was none. */
void *eext_object_event_callback_del(Evas_Object *obj, Eext_Callback_Type type, Eext_Event_Cb func);

/* Ready-made answers to the back key: pop a naviframe's top item, close a popup, close a context menu. */
void eext_naviframe_back_cb(void *data, Evas_Object *obj, void *event_info);
void eext_popup_back_cb(void *data, Evas_Object *obj, void *event_info);
void eext_ctxpopup_back_cb(void *data, Evas_Object *obj, void *event_info);

#ifdef __cplusplus
}
#endif
