// Search in the user's reports.
#include "tavro_dbmgr_internal.h"

GSList *tavro_dbmgr_search_vocs(const char *, const tavro_voc_filter &) {
  return nullptr;
}
