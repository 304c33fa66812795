// What was typed for follow-ups and not sent: one note file with a group for each report.
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "tavro_details_text.h"
#include "tavro_follow_up.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"

namespace {

constexpr char kPath[] = TAVRO_DBMGR_FOLDER "/.tavro.follow_up";
constexpr char kDamagedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.follow_up.damaged";
constexpr unsigned long long kMillisecondsPerSecond = 1000;

// Groups are the server ids. Read by later versions of the client: append-only.
constexpr char kText[] = "text";
constexpr char kTyped[] = "typed";  // seconds since the epoch

// As in the file, or newer where the disk refused it.
GKeyFile *_texts() {
  static TavroKeyFile texts;
  if (!texts) texts = tavro_note_load(kPath, kDamagedPath);
  if (!texts) texts.reset(g_key_file_new());
  return texts.get();
}

// Texts go with their reports; a look-up that fails is no deleted report.
void _forget_those_of_deleted_reports(GKeyFile *texts) {
  const TavroStrv groups(g_key_file_get_groups(texts, nullptr));
  for (char **group = groups.get(); *group; ++group)
    if (tavro_dbmgr_get_server_voc_count(std::atoi(*group)) == 0)
      g_key_file_remove_group(texts, *group, nullptr);
}

void _write(GKeyFile *texts) {
  gsize size = 0, count = 0;
  const TavroStrv groups(g_key_file_get_groups(texts, &count));
  const TavroGText data(g_key_file_to_data(texts, &size, nullptr));
  const bool is_done =
      count == 0 ? unlink(kPath) == 0 || errno == ENOENT : tavro_note_write(kPath, data.get(), size) == 0;
  if (!is_done) TAVRO_LOGE("what was typed cannot be kept: %s", std::strerror(errno));
}

// A client that ended right after it stored the follow-up had no time to forget its text.
bool _was_sent(const svc_voc_data *first, const char *text, unsigned long long typed_ms) {
  for (const tavro_follow_up &follow_up : tavro_follow_ups_of(first)) {
    const svc_voc_data *voc = follow_up.voc.get();
    if (voc->date_of_creation && tavro_details_time(voc->date_of_creation) >= typed_ms &&
        g_strcmp0(voc->description, text) == 0)
      return true;
  }
  return false;
}

}  // namespace

std::string tavro_follow_up_kept(const svc_voc_data *first) {
  const std::string group = std::to_string(first->server_voc_id);
  const TavroText text(tavro_note_text(_texts(), group.c_str(), kText));
  if (!text) return {};
  const guint64 typed = g_key_file_get_uint64(_texts(), group.c_str(), kTyped, nullptr);
  if (!_was_sent(first, text.get(), typed * kMillisecondsPerSecond)) return tavro_details_text(text.get());
  tavro_follow_up_keep(first->server_voc_id, "");
  return {};
}

void tavro_follow_up_keep(int server_id, const std::string &text) {
  GKeyFile *texts = _texts();
  const std::string group = std::to_string(server_id);
  if (!text.empty()) {
    tavro_note_set_text(texts, group.c_str(), kText, text.c_str());
    g_key_file_set_uint64(texts, group.c_str(), kTyped, static_cast<guint64>(std::time(nullptr)));
  } else if (!g_key_file_remove_group(texts, group.c_str(), nullptr)) {
    return;
  }
  _forget_those_of_deleted_reports(texts);
  _write(texts);
}
