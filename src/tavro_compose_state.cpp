// State of a compose screen without its widgets' looks.
#include <Elementary.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_log.h"
#include "tavro_memory.h"

compose_view_win *tavro_compose_view(appdata *ad) {
  if (ad->idea_view) return ad->idea_view;
  return ad->problem_view;
}

bool tavro_compose_has_content(const compose_view_win *view) {
  return !elm_entry_is_empty(view->entry) || !elm_entry_is_empty(view->title_entry) || view->attachments;
}

tavro_compose_gap tavro_compose_check(const compose_view_win *view, gint64 limit) {
  if (!view->app_name) return TAVRO_COMPOSE_NO_TARGET;
  if (!tavro_compose_has_content(view)) return TAVRO_COMPOSE_NO_CONTENT;
  return view->buffer > limit ? TAVRO_COMPOSE_TOO_LARGE : TAVRO_COMPOSE_COMPLETE;
}

gint64 tavro_attachment_size(const char *path) {
  struct stat info {};
  if (stat(path, &info) != 0 || !S_ISREG(info.st_mode) || access(path, R_OK) != 0) return -1;
  return info.st_size;
}

bool tavro_compose_attach(compose_view_win *view, const char *path) {
  for (const GSList *link = view->attachments; link; link = link->next)
    if (std::strcmp(static_cast<const char *>(link->data), path) == 0) return true;
  const gint64 size = tavro_attachment_size(path);
  if (size < 0) {
    TAVRO_LOGD("cannot attach %s", path);
    return false;
  }
  view->attachments = g_slist_append(view->attachments, TAVRO_STRDUP(path));
  view->buffer += size;
  return true;
}

void tavro_compose_detach(compose_view_win *view, const char *path) {
  for (GSList *link = view->attachments; link; link = link->next) {
    char *attached = static_cast<char *>(link->data);
    if (std::strcmp(attached, path) != 0) continue;
    view->attachments = g_slist_delete_link(view->attachments, link);
    TAVRO_FREE(attached);
    break;
  }
  // Files change while they are attached: add up what is there now.
  view->buffer = 0;
  for (const GSList *link = view->attachments; link; link = link->next) {
    const gint64 size = tavro_attachment_size(static_cast<const char *>(link->data));
    if (size > 0) view->buffer += size;
  }
}
