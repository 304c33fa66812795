// Banners of the landing page. A banner's place decides which row is its own, not its id: another banner
// takes over the row of its predecessor.
#include "tavro_dbmgr_catalogue_internal.h"
#include "tavro_log.h"

namespace {

constexpr char kTable[] = TAVRO_DBMGR_TABLE_BANNER;
constexpr int kBuiltInPlace = 0;

void _insert(sqlite3 *db, const tavro_dbmgr_banner_info &banner, const char *where) {
  TAVRO_LOGD("Inserting new banner into db");
  _tavro_dbmgr_insert_new_record(db, kTable, &banner);
  if (banner.seqNo == kBuiltInPlace)
    _tavro_dbmgr_update_record(db, kTable, "BANNER_IMAGE_PATH", banner.bannerImagePath, where);
}

void _write(sqlite3 *db, const catalogue_change &change, const char *where) {
  const bool is_other_banner = std::strcmp(change.column, "BANNER_ID") == 0;
  const bool is_other_image = std::strcmp(change.column, "BANNER_IMAGE_URL") == 0;
  _tavro_dbmgr_update_record(db, kTable, change.column, change.value.c_str(), where);
  if (is_other_banner) TAVRO_LOGD("Updating already existing banner in db");
  // The image that was fetched is the old one's.
  if (is_other_banner || is_other_image)
    _tavro_dbmgr_update_record(db, kTable, "BANNER_UPDATE_FLAG", "1", where);
}

void _upsert(sqlite3 *db, const tavro_dbmgr_banner_info &banner) {
  const std::string where = catalogue_where("BANNER_SEQ_NO", banner.seqNo);
  std::vector<catalogue_change> changes;
  const catalogue_row row = catalogue_compare(
      db, catalogue_banner_layout(), &banner, where.c_str(),
      {"BANNER_ID", "BANNER_TYPE", "BANNER_ACTION", "BANNER_ACTION_DATA", "BANNER_IMAGE_URL"}, changes);
  if (row == catalogue_row::absent) _insert(db, banner, where.c_str());
  for (const catalogue_change &change : changes) _write(db, change, where.c_str());
}

}  // namespace

int tavro_dbmgr_update_banner_list(const GSList *banners) {
  if (!banners) {
    TAVRO_LOGD("banner list is NULL");
    return -1;
  }
  return catalogue_run([banners](sqlite3 *db) {
    for (const void *element : catalogue_last_to_first(banners)) {
      if (element)
        _upsert(db, *static_cast<const tavro_dbmgr_banner_info *>(element));
      else
        TAVRO_LOGD("banner_info is NULL");
    }
    return 0;
  });
}

int tavro_dbmgr_get_banner_list(GSList **banners) {
  return catalogue_read_list(kTable, nullptr, "ORDER BY BANNER_SEQ_NO", TAVRO_RECORD_LIST_TYPE_BANNERS,
                             banners);
}
