// The client's screens with real widgets, painted into memory, on a real store and bus, for tests.
#pragma once

#ifndef EFL_BETA_API_SUPPORT
#define EFL_BETA_API_SUPPORT  // reading what a screen reader is told
#endif
#include <Elementary.h>
#include <elm_atspi.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_screens.h"

// By the text that it shows, or the name that a screen reader is told.
inline Evas_Object *find_button(Evas_Object *below, const char *name) {
  if (elm_object_widget_check(below) && strstr(elm_object_widget_type_get(below), "Button") &&
      (g_strcmp0(elm_object_text_get(below), name) == 0 ||
       g_strcmp0(efl_access_object_i18n_name_get(below), name) == 0))
    return below;
  const TavroHandle<Eina_List, eina_list_free> members(evas_object_smart_members_get(below));
  Evas_Object *found = nullptr;
  for (Eina_List *link = members.get(); link && !found; link = eina_list_next(link))
    found = find_button(static_cast<Evas_Object *>(eina_list_data_get(link)), name);
  return found;
}

// The topmost of this name in a window.
inline Evas_Object *find_top_button(Evas_Object *window, const char *name) {
  Evas_Object *found = nullptr;
  for (Evas_Object *top = evas_object_top_get(evas_object_evas_get(window)); top && !found;
       top = evas_object_below_get(top))
    found = find_button(top, name);
  return found;
}

class Screens : public testing::Test {
 protected:
  // Once for all suites of a program: the toolkit forgets the client's look when it is shut down.
  static void SetUpTestSuite() {
    if (is_toolkit_up_) return;
    is_toolkit_up_ = true;
    setenv("ELM_ENGINE", "buffer", 1);
    char name[] = "screens", *arguments[] = {name, nullptr};
    elm_init(1, arguments);
    tavro_bind_locale();
    tavro_dbmgr_init_semaphore();
    tavro_dbmgr_ensure_schema();
  }

  void start() {
    tavro_initialize_application_data(&ad_);
    ASSERT_TRUE(tavro_create_base_window(&ad_));
    tavro_create_landing_page(&ad_);
  }
  // As a kill ends the process: nothing is stored, nothing is removed.
  void end() {
    evas_object_del(ad_.win);
    ecore_main_loop_iterate();
    tavro_dealloc_memory(&ad_);
  }

  template <typename Condition>
  static bool wait_for(Condition condition, double seconds = 5.0) {
    const double last = ecore_time_get() + seconds;
    while (!condition() && ecore_time_get() < last) {
      ecore_main_loop_iterate();
      g_main_context_iteration(nullptr, FALSE);
      usleep(2000);
    }
    return condition();
  }
  // Until the page that was pushed or popped last has come to rest and what was put off is done.
  static void settle() {
    wait_for([] { return false; }, 0.6);
  }

  static void tap(Evas_Object *button) { evas_object_smart_callback_call(button, "clicked", nullptr); }
  // Tap a popup's button, by string id; false when it has none of this text.
  static bool answer(Evas_Object *popup, const char *text) {
    Evas_Object *found = popup ? find_button(popup, tavro_text(text)) : nullptr;
    if (found) tap(found);
    return found;
  }
  // What a popup says.
  static std::string body(Evas_Object *popup) {
    const char *told = popup ? efl_access_object_description_get(popup) : nullptr;
    return told ? told : "";
  }

  appdata ad_{};

 private:
  static inline bool is_toolkit_up_ = false;
};
