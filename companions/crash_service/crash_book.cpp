#include "crash_book.h"

#include <glib.h>

#include <algorithm>

#include "crash_log.h"
#include "tavro_handles.h"

namespace {

constexpr size_t kMostIds = 2000;
constexpr int kMostBeginnings = 2;
constexpr int kDone = 9;  // stored: never change it

}  // namespace

// The first line is the time, each other one "<state> <id>".
bool CrashBook::open(const std::string &path) {
  path_ = path;
  TavroGText text;
  is_new_ = !g_file_get_contents(path.c_str(), tavro_out(text), nullptr, nullptr);
  const TavroStrv lines(g_strsplit(is_new_ ? "" : text.get(), "\n", -1));
  if (*lines.get()) since_us_ = g_ascii_strtoll(*lines.get(), nullptr, 10);
  for (char **line = lines.get(); *line && *++line;) {
    char *id = nullptr;
    const auto state = static_cast<int>(g_ascii_strtoll(*line, &id, 10));
    if (id > *line && *id == ' ' && id[1]) set(id + 1, state);
  }
  // A clock that was put back must not hide what crashes from now on.
  since_us_ = std::min(since_us_, g_get_real_time());
  if (since_us_ > 0) return true;
  is_new_ = true;
  since_us_ = g_get_real_time();
  save();
  return g_file_test(path.c_str(), G_FILE_TEST_IS_REGULAR);
}

bool CrashBook::is_done(const std::string &id) const {
  const auto found = states_.find(id);
  return found != states_.end() && found->second == kDone;
}

void CrashBook::set_done(const std::string &id) {
  set(id, kDone);
  save();
}

bool CrashBook::begin(const std::string &id) {
  const auto found = states_.find(id);
  const int begun = found == states_.end() ? 0 : found->second;
  if (begun >= kMostBeginnings) return false;
  set(id, begun + 1);
  save();
  return true;
}

void CrashBook::set(const std::string &id, int state) {
  if (states_.insert_or_assign(id, state).second) order_.push_back(id);
  if (order_.size() <= kMostIds) return;
  // What is forgotten must not come up again: from now on only what came behind it counts. A folder's id has
  // no time.
  const size_t time = order_.front().find('.');
  if (time != std::string::npos) {
    const int64_t second_behind =
        g_ascii_strtoll(order_.front().c_str() + time + 1, nullptr, 10) + 2 * G_USEC_PER_SEC;
    since_us_ = std::max(since_us_, std::min(second_behind, g_get_real_time()));
  }
  states_.erase(order_.front());
  order_.pop_front();
}

void CrashBook::save() const {
  std::string text = std::to_string(since_us_) + "\n";
  for (const std::string &id : order_) text += std::to_string(states_.at(id)) + " " + id + "\n";
  TavroError error;
  if (!g_file_set_contents_full(path_.c_str(), text.data(), static_cast<gssize>(text.size()),
                                G_FILE_SET_CONTENTS_CONSISTENT, 0600, tavro_out(error)))
    CRASH_LOGE("what was seen is not remembered: %s", error->message);
}
