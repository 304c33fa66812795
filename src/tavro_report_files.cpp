#include "tavro_report_files.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "tavro_dbmgr.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

void _delete_file(const TavroText &path, int voc_id) {
  if (!path || !*path) return;
  struct stat info = {};
  if (lstat(path.get(), &info) != 0 || !S_ISREG(info.st_mode)) {
    TAVRO_LOGD("file of report %d is not there", voc_id);
    return;
  }
  if (unlink(path.get()) != 0) TAVRO_LOGE("file of report %d: %s", voc_id, std::strerror(errno));
}

}  // namespace

void tavro_delete_dump_file(int voc_id) {
  _delete_file(TavroText(tavro_dbmgr_get_dump_file_by_id(voc_id)), voc_id);
}

void tavro_delete_syslog_file(int voc_id) {
  _delete_file(TavroText(tavro_dbmgr_get_voc_syslog_file_by_id(voc_id)), voc_id);
}
