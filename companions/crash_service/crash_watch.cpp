#include "crash_watch.h"

#include <app_common.h>

#include "crash_log.h"
#include "tavro_cores.h"
#include "tavro_crash_service.h"

namespace {

constexpr int64_t kHoldUs = 3 * G_USEC_PER_SEC;  // a record comes a second behind its core
constexpr guint kHeldLookMilliseconds = 500;
constexpr size_t kMostHeld = 100;

std::string book_path() {
  const TavroHandle<char, free> folder(app_get_data_path());
  return folder ? std::string(folder.get()) + "seen" : "";
}

}  // namespace

CrashWatch::CrashWatch()
    : collector_(book_),
      drops_(
          book_, [this] { return collector_.is_working(); },
          [](const CrashFolder &folder) {
            CRASH_LOGI("a crash folder was put in: %s", folder.name.c_str());
            keep_newest_crash_folders();
            tell_client(folder);
          }),
      journal_([this](const Crash &crash) { note_record(crash); }) {}

bool CrashWatch::start() {
  const std::string book = book_path();
  if (book.empty() || !book_.open(book) || !prepare_crash_folders()) return false;
  keep_newest_crash_folders();
  drops_.start();
  journal_.start(book_.since_us());
  for (const std::string &path : core_folder_paths()) {
    const bool may_have_record = path != TAVRO_CORE_FOLDER;
    folders_.push_back(std::make_unique<CoreFolder>(
        path, [this, may_have_record](const Crash &crash) { note_core(crash, may_have_record); }));
    folders_.back()->start(book_.since_us());
  }
  return true;
}

void CrashWatch::stop() {
  journal_.stop();
  folders_.clear();
  if (held_source_) g_source_remove(std::exchange(held_source_, 0));
  held_.clear();
  collector_.stop();
}

void CrashWatch::note_core(const Crash &crash, bool may_have_record) {
  if (!is_ours(crash)) return;
  if (may_have_record && crash.phone.empty() && held_.size() < kMostHeld)
    hold(crash);
  else
    collector_.add(crash);
}

void CrashWatch::note_record(const Crash &crash) {
  held_.erase(crash.id());
  if (is_ours(crash)) collector_.add(crash);
}

bool CrashWatch::is_ours(const Crash &crash) const {
  if (crash.time_us < book_.since_us() - G_USEC_PER_SEC || book_.is_done(crash.id())) return false;
  if (getuid() != 0 && crash.uid != static_cast<int64_t>(getuid())) return false;
  const char *phone = g_getenv("TAVRO_PHONE_DIR");
  if (!crash.phone.empty() && (!phone || crash.phone != phone)) return false;
  if (crash.program != TAVRO_CRASH_SERVICE) return true;
  CRASH_LOGE("the crash service itself has crashed; that is not collected");
  return false;
}

void CrashWatch::hold(const Crash &crash) {
  held_[crash.id()] = {crash, g_get_monotonic_time() + kHoldUs};
  if (!held_source_) held_source_ = g_timeout_add(kHeldLookMilliseconds, held_cb, this);
}

gboolean CrashWatch::held_cb(gpointer data) {
  auto *self = static_cast<CrashWatch *>(data);
  for (auto held = self->held_.begin(); held != self->held_.end();) {
    if (held->second.until_us > g_get_monotonic_time()) {
      ++held;
      continue;
    }
    self->collector_.add(held->second.crash);
    held = self->held_.erase(held);
  }
  if (!self->held_.empty()) return G_SOURCE_CONTINUE;
  self->held_source_ = 0;
  return G_SOURCE_REMOVE;
}
