#include "tavro_compose_convert.h"

#include <Elementary.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_image.h"

namespace {

// The worker's are `path`, `copy` and `fault`; the others are the main loop's.
struct conversion {
  appdata *ad;
  Evas_Object *page;  // of the compose screen; null once it is gone
  std::string path, copy;
  tavro_image_fault fault;
};

std::vector<const conversion *> _running;

bool _is_running(const Evas_Object *page, const std::string &path) {
  return std::any_of(_running.begin(), _running.end(),
                     [&](const conversion *job) { return job->page == page && job->path == path; });
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  static_cast<conversion *>(data)->page = nullptr;
}

void _convert(void *data, Ecore_Thread *) {
  auto *job = static_cast<conversion *>(data);
  job->copy = tavro_image_attachable_copy(job->path.c_str(), &job->fault);
}

bool _is_wanted(appdata *ad, const conversion &job) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || view->layout != job.page) return false;
  const std::vector<std::string> attached = tavro_compose_attached(ad);
  return std::find(attached.begin(), attached.end(), job.path) != attached.end();
}

void _attach(appdata *ad, const conversion &job) {
  if (job.fault == TAVRO_IMAGE_GOOD && tavro_compose_replace(ad, job.path, job.copy)) return;
  tavro_compose_detach(tavro_compose_view(ad), job.path.c_str());
  tavro_compose_strip_refresh(ad);
  if (job.fault == TAVRO_IMAGE_GOOD) return;  // the popup has told why the copy was refused
  const std::string reason = tavro_text(tavro_image_fault_text(job.fault));
  tavro_compose_attach_files(ad, nullptr, tavro_file_name(job.path.c_str()) + ": " + reason);
}

void _converted_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<conversion> job(static_cast<conversion *>(data));
  appdata *ad = job->ad;
  if (job->page) {
    evas_object_event_callback_del_full(job->page, EVAS_CALLBACK_DEL, _page_deleted_cb, job.get());
    if (_is_wanted(ad, *job)) _attach(ad, *job);
  }
  _running.erase(std::find(_running.begin(), _running.end(), job.get()));
  if (!job->copy.empty()) tavro_compose_strip_dropped(job->copy);  // unless it is attached
  if (job->page) tavro_compose_send_files_changed(ad);
}

void _start(appdata *ad, Evas_Object *page, const std::string &path) {
  auto *job = new conversion{ad, page, path, "", TAVRO_IMAGE_GOOD};
  _running.push_back(job);
  evas_object_event_callback_add(page, EVAS_CALLBACK_DEL, _page_deleted_cb, job);
  ecore_thread_run(_convert, _converted_cb, _converted_cb, job);
}

}  // namespace

bool tavro_compose_convert(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || !view->layout) return false;
  bool is_any = false;
  for (const std::string &path : tavro_compose_attached(ad)) {
    if (_is_running(view->layout, path)) {
      is_any = true;
    } else if (tavro_compose_wants_conversion(path.c_str())) {
      is_any = true;
      _start(ad, view->layout, path);
    }
  }
  return is_any;
}
