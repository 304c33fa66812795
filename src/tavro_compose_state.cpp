// State of a compose screen without its widgets' looks.
#include <Elementary.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string_view>

#include "tavro-main.h"
#include "tavro_byte_reader.h"
#include "tavro_compose.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_image_strip.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_picture_info.h"

namespace {

struct file_mark {
  size_t offset;
  std::string_view bytes;
};

// How the kinds begin that support can open.
constexpr file_mark kKnownMarks[] = {{0, "\xFF\xD8\xFF"}, {0, "\x89PNG\r\n\x1A\n"}, {4, "ftyp"}};

// Opened without waiting, should the path have become something else than a file. The upload service cannot
// take out the metadata of pictures in boxes.
bool _is_known_kind(const char *path) {
  constexpr ssize_t kShortestFile = 12;
  std::vector<unsigned char> head(kTellingBytes);
  const TavroFd file(open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  const ssize_t count = file ? read(file.get(), head.data(), head.size()) : -1;
  if (count < kShortestFile) return false;
  head.resize(static_cast<size_t>(count));
  const tavro_byte_reader bytes(head);
  return !tavro_is_boxed_picture(head) &&
         std::any_of(std::begin(kKnownMarks), std::end(kKnownMarks),
                     [&bytes](const file_mark &mark) { return bytes.has(mark.offset, mark.bytes); });
}

// A relative path means nothing later on, and what lies beside the store is the client's own.
bool _is_off_limits(const char *path) {
  const TavroGText real(realpath(path, nullptr));
  return *path != '/' || (real && g_str_has_prefix(real.get(), TAVRO_DBMGR_FOLDER "/"));
}

GSList *_find(const compose_view_win *view, const char *path) {
  return g_slist_find_custom(view->attachments, path, [](gconstpointer attached, gconstpointer wanted) {
    return std::strcmp(static_cast<const char *>(attached), static_cast<const char *>(wanted));
  });
}

// Something to read: blanks alone are none.
bool _has_words(const Evas_Object *entry) {
  if (elm_entry_is_empty(entry)) return false;
  const TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(entry))));
  for (const char *at = text.get(); at && *at; at = g_utf8_next_char(at)) {
    const gunichar letter = g_utf8_get_char(at);
    if (g_unichar_isgraph(letter) && !g_unichar_iszerowidth(letter)) return true;
  }
  return false;
}

gint64 _size_or_none(const char *path) {
  return path ? std::max<gint64>(tavro_attachment_size(path), 0) : 0;
}

const compose_view_win *_open_view(const appdata *ad) {
  return ad->idea_view ? static_cast<const compose_view_win *>(ad->idea_view) : ad->problem_view;
}

}  // namespace

compose_view_win *tavro_compose_view(appdata *ad) {
  return const_cast<compose_view_win *>(_open_view(ad));
}

std::vector<std::string> tavro_compose_attached(const appdata *ad) {
  std::vector<std::string> paths;
  const compose_view_win *view = _open_view(ad);
  for (const GSList *link = view ? view->attachments : nullptr; link; link = link->next)
    paths.emplace_back(static_cast<const char *>(link->data));
  return paths;
}

bool tavro_compose_has_content(const appdata *ad) {
  const compose_view_win *view = _open_view(ad);
  if (!view) return false;
  return _has_words(view->entry) || _has_words(view->title_entry) || view->attachments ||
         (ad->problem_view && ad->problem_view->dump_filepath);
}

tavro_compose_gap tavro_compose_check(const appdata *ad, gint64 limit) {
  const compose_view_win *view = _open_view(ad);
  if (!view->app_name) return TAVRO_COMPOSE_NO_TARGET;
  if (!tavro_compose_has_content(ad)) return TAVRO_COMPOSE_NO_CONTENT;
  return view->buffer > limit ? TAVRO_COMPOSE_TOO_LARGE : TAVRO_COMPOSE_COMPLETE;
}

gint64 tavro_attachment_size(const char *path) {
  struct stat info {};
  if (stat(path, &info) != 0 || !S_ISREG(info.st_mode) || access(path, R_OK) != 0) return -1;
  return info.st_size;
}

bool tavro_compose_wants_conversion(const char *path) {
  tavro_picture_info info{};
  return tavro_picture_info_read(path, &info) && info.format == TAVRO_PICTURE_WEBP;
}

tavro_attachment_fault tavro_attachment_check(const compose_view_win *view, const char *path) {
  const gint64 size = tavro_attachment_size(path);
  if (size < 0 || _is_off_limits(path)) return TAVRO_ATTACHMENT_UNREADABLE;
  if (size == 0) return TAVRO_ATTACHMENT_EMPTY;
  if (size > tavro_attachment_size_limit()) return TAVRO_ATTACHMENT_TOO_LARGE;
  if (!_is_known_kind(path) && !tavro_compose_wants_conversion(path)) return TAVRO_ATTACHMENT_OTHER_KIND;
  return g_slist_length(view->attachments) < kMostAttachments ? TAVRO_ATTACHMENT_GOOD
                                                              : TAVRO_ATTACHMENT_TOO_MANY;
}

bool tavro_compose_attach(compose_view_win *view, const char *path) {
  if (_find(view, path)) return true;
  const tavro_attachment_fault fault = tavro_attachment_check(view, path);
  if (fault != TAVRO_ATTACHMENT_GOOD) {
    TAVRO_LOGD("cannot attach %s: %d", path, fault);
    return false;
  }
  view->attachments = g_slist_append(view->attachments, TAVRO_STRDUP(path));
  tavro_compose_count(view);
  return true;
}

void tavro_compose_detach(compose_view_win *view, const char *path) {
  if (GSList *link = _find(view, path)) {
    char *attached = static_cast<char *>(link->data);
    view->attachments = g_slist_delete_link(view->attachments, link);
    TAVRO_FREE(attached);
  }
  tavro_compose_count(view);
}

void tavro_compose_move(compose_view_win *view, const char *path, int steps) {
  GSList *link = _find(view, path);
  if (!link) return;
  const int last = static_cast<int>(g_slist_length(view->attachments)) - 1;
  const int place = std::clamp(g_slist_position(view->attachments, link) + steps, 0, last);
  gpointer attached = link->data;
  view->attachments = g_slist_delete_link(view->attachments, link);
  view->attachments = g_slist_insert(view->attachments, attached, place);
}

void tavro_compose_count(compose_view_win *view) {
  view->buffer = 0;
  for (const GSList *link = view->attachments; link; link = link->next)
    view->buffer += _size_or_none(static_cast<const char *>(link->data));
}

std::vector<std::string> tavro_compose_lost_attachments(const compose_view_win *view) {
  std::vector<std::string> lost;
  for (const GSList *link = view->attachments; link; link = link->next) {
    const char *path = static_cast<const char *>(link->data);
    if (tavro_attachment_size(path) <= 0) lost.emplace_back(path);
  }
  return lost;
}

std::string tavro_file_name(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash ? slash + 1 : path;
}

gint64 tavro_compose_total(const appdata *ad) {
  const compose_view_win *view = _open_view(ad);
  const problem_view_win *problem = ad->problem_view;
  return view->buffer +
         (problem ? _size_or_none(problem->syslog_filepath) + _size_or_none(problem->dump_filepath) : 0);
}
