#include "tavro_appdata.h"

#include <app.h>

#include <initializer_list>

#include "tavro-main.h"
#include "tavro_drafts.h"
#include "tavro_memory.h"

namespace {

bool is_ending = false;
bool voc_list_lock_exists = false;

void _free_text_list(GSList *&texts) {
  for (GSList *node = texts; node; node = node->next) {
    char *text = static_cast<char *>(node->data);
    TAVRO_FREE(text);
  }
  g_slist_free(texts);
  texts = nullptr;
}

struct select_box {
  int x, y, width, height;
};

// Lists whose elements belong to the screens that fill them.
void _free_list_nodes(GSList *&list) {
  g_slist_free(list);
  list = nullptr;
}

void _free_texts(appdata *ad) {
  TAVRO_FREE(ad->ie_app_name);
  TAVRO_FREE(ad->ie_app_id);
  TAVRO_FREE(ad->ie_app_icon);
  TAVRO_FREE(ad->main_image_file);
  TAVRO_FREE(ad->attachment_name);
  TAVRO_FREE(ad->crashed_appname);
  TAVRO_FREE(ad->crashed_appId);
}

}  // namespace

void tavro_initialize_application_data(appdata *ad) {
  is_ending = false;
  *ad = {};
  ad->add_video_to_tavro = 1;
  ad->comm_url_type = TAVRO_COMMUNITY_MAX;
  ad->rType = INITIAL;
  ad->betaLType = BETA_TYPE_NA;
  ad->bType = UNKNOWN_STATUS;
}

void tavro_dealloc_memory(appdata *ad) {
  tavro_free_compose_view(ad);
  _free_texts(ad);
  _free_text_list(ad->image_list);
  tavro_select_boxes_free(ad);
  for (GSList **list : {&ad->color_table, &ad->font_table, &ad->banner_list, &ad->available_beta_list,
                        &ad->opted_beta_list}) {
    _free_list_nodes(*list);
  }
  if (ad->noti) {
    notification_free(ad->noti);
    ad->noti = nullptr;
  }
  tavro_voc_list_lock_destroy(ad);
}

void tavro_select_box_add(appdata *ad, int x, int y, int width, int height) {
  auto *box = TAVRO_ZALLOC(select_box);
  *box = {x, y, width, height};
  ad->ie_select_box_list = g_slist_append(ad->ie_select_box_list, box);
}

void tavro_select_boxes_free(appdata *ad) {
  for (GSList *node = ad->ie_select_box_list; node; node = node->next) {
    auto *box = static_cast<select_box *>(node->data);
    TAVRO_FREE(box);
  }
  _free_list_nodes(ad->ie_select_box_list);
}

void tavro_voc_list_lock_create(appdata *ad) {
  if (!voc_list_lock_exists) voc_list_lock_exists = eina_lock_new(&ad->voc_list_lock);
}

void tavro_voc_list_lock_destroy(appdata *ad) {
  if (voc_list_lock_exists) eina_lock_free(&ad->voc_list_lock);
  voc_list_lock_exists = false;
}

void tavro_request_exit(appdata *ad) {
  is_ending = true;
  if (!ad->win) tavro_dealloc_memory(ad);
  ui_app_exit();
}

bool tavro_is_ending() {
  return is_ending;
}
