#include "tavro_recovery.h"

#include <memory>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_save_journal.h"
#include "tavro_service_bridge.h"

namespace {

bool is_prepared = false;

}  // namespace

int tavro_finish_interrupted_save() {
  const int id = tavro_journal_recover();
  if (id < 1) return id;
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(id));
  TAVRO_LOGD("completed the interrupted save of report %d", id);
  if (voc && tavro_current_status(voc->submitted) == TAVRO_STATUS_SENDING) {
    _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_UI, id);
  }
  return id;
}

void tavro_prepare_store() {
  if (is_prepared) return;
  is_prepared = true;
  if (tavro_dbmgr_ensure_schema() == TAVRO_STORE_UNUSABLE) return;
  tavro_finish_interrupted_save();
  tavro_deleted_files_remove();  // of a deletion or an edit that was cut off
}

void tavro_tell_store_was_replaced(appdata *ad) {
  if (!ad->win || !tavro_dbmgr_is_replacement_untold()) return;
  tavro_dbmgr_set_replacement_told();
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_REPORTS_NOT_READABLE"),
                   tavro_text("IDS_OB_POP_REPORTS_NOT_READABLE_SET_ASIDE"),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}
