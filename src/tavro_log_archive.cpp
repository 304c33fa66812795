#include "tavro_log_archive.h"

#include <minizip/unzip.h>

#include <algorithm>

#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

using ZipFile = TavroHandle<std::remove_pointer_t<unzFile>, unzClose>;

constexpr size_t kBlock = 64 * 1024;
// More than any log that the service writes: an archive that unpacks to more is a trap.
constexpr size_t kMostUnpacked = 64 * 1024 * 1024;

// What was unpacked, of which the end is kept. False when the archive is damaged.
bool _read_end(unzFile zip, size_t limit, tavro_log_tail *tail) {
  std::string block(kBlock, '\0');
  size_t unpacked = 0;
  int count;
  while ((count = unzReadCurrentFile(zip, block.data(), static_cast<unsigned>(block.size()))) > 0) {
    tail->text.append(block, 0, static_cast<size_t>(count));
    unpacked += static_cast<size_t>(count);
    if (unpacked > kMostUnpacked) return false;
    if (tail->text.size() > limit + kBlock) tail->text.erase(0, tail->text.size() - limit);
  }
  if (tail->text.size() > limit) tail->text.erase(0, tail->text.size() - limit);
  tail->is_cut = unpacked > tail->text.size();
  // Closing compares the checksum.
  return count == 0 && unzCloseCurrentFile(zip) == UNZ_OK;
}

void _begin_with_a_line(std::string *text) {
  const size_t line_end = text->find('\n');
  if (line_end != std::string::npos) text->erase(0, line_end + 1);
}

}  // namespace

bool tavro_log_archive_read(const char *path, size_t limit, tavro_log_tail *tail) {
  *tail = {};
  const ZipFile zip(unzOpen(path));
  if (!zip || unzGoToFirstFile(zip.get()) != UNZ_OK || unzOpenCurrentFile(zip.get()) != UNZ_OK ||
      !_read_end(zip.get(), limit, tail)) {
    TAVRO_LOGE("system log %s cannot be read", path);
    return false;
  }
  if (tail->is_cut) _begin_with_a_line(&tail->text);
  std::replace(tail->text.begin(), tail->text.end(), '\0', ' ');
  const TavroGText valid(g_utf8_make_valid(tail->text.data(), static_cast<gssize>(tail->text.size())));
  tail->text = valid.get();
  return true;
}
