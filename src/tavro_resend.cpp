#include "tavro_resend.h"

#include <unistd.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_notifications.h"
#include "tavro_screens.h"
#include "tavro_service_bridge.h"

namespace {

constexpr int kIsRead = 1;

tavro_resend_screen registered_screen = {};

bool _is_blank(const char *text) {
  return !text || !*text;
}

// A report of attachments alone says nothing once none of them can be read.
bool _nothing_is_left(const svc_voc_data *voc) {
  if (!_is_blank(voc->description) || !_is_blank(voc->title_description) || !voc->attachments) return false;
  unsigned int missing_count = 0;
  for (const GSList *node = voc->attachments; node; node = node->next) {
    const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(node->data);
    if (attachment->file_path && access(attachment->file_path, R_OK) == 0) continue;
    TAVRO_LOGD("access not OK");
    ++missing_count;
  }
  TAVRO_LOGD("not accesible count:%d", static_cast<int>(missing_count));
  return missing_count == g_slist_length(voc->attachments);
}

// The record may be older than the store: the service may have sent the report meanwhile.
int _status_now(int voc_id) {
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(voc_id));
  return voc ? tavro_current_status(voc->submitted) : -1;
}

void _send_again(appdata *ad, const svc_voc_data *voc) {
  const int status = _status_now(voc->id);
  const bool is_draft = status == TAVRO_STATUS_DRAFT_SAVED;
  if (!is_draft && status != TAVRO_STATUS_SENDING_FAILED &&
      status != TAVRO_STATUS_SENDING_FAILED_NO_NETWORK) {
    TAVRO_LOGD("report %d has the status %d now and is not sent again", voc->id, status);
    tavro_update_history_page(nullptr, ad);
    return;
  }
  tavro_create_notification(tavro_text("IDS_OB_TPOP_SENDING_FEEDBACK_ING_ABB"), voc->description, ad);
  // A draft keeps its state while it is being sent; the service leaves it so when sending fails.
  tavro_dbmgr_update_sending_state(voc->id, is_draft ? TAVRO_STATUS_DRAFT_SAVED : TAVRO_STATUS_SENDING);
  if (tavro_dbmgr_update_read_push_notifications(voc->id, kIsRead) != 0) {
    TAVRO_LOGD("Failed to update the VOC as read");
  }
  _tavro_launch_upload_mgr_svc(TAVRO_SEND_FAILED_VOC, voc->id);
}

void _leave_details(appdata *ad) {
  if (registered_screen.close) registered_screen.close(ad);
  tavro_voc_list_lock_destroy(ad);
  tavro_pop_naviframe_middle_items(ad);
}

}  // namespace

void tavro_resend_register_screen(const tavro_resend_screen &screen) {
  registered_screen = screen;
}

void tavro_send_cb(void *data, Evas_Object *obj, void *) {
  TAVRO_LOGD("send called");
  auto *ad = static_cast<appdata *>(evas_object_data_get(obj, "app_data"));
  if (!ad) return;
  if (ad->history_edit_popup) {
    evas_object_del(ad->history_edit_popup);
    ad->history_edit_popup = nullptr;
  }
  const auto *voc = static_cast<const svc_voc_data *>(data);
  if (voc) {
    if (_nothing_is_left(voc)) {
      TAVRO_LOGD("no file accessible");
      if (registered_screen.show_no_file_accessible) registered_screen.show_no_file_accessible(ad);
      return;
    }
    _send_again(ad, voc);
  }
  _leave_details(ad);
}
