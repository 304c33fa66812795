// What the crash service remembers over its restarts, so that a crash is told once: when it began to watch,
// and which crashes and folders it has dealt with since. What was there before the first start is no news.
// One text file, replaced as a whole at each change. Main loop only.
#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <string>

class CrashBook {
 public:
  // Reads the file, or begins a new one. False, after a log line, when there can be none.
  bool open(const std::string &path);
  bool is_new() const { return is_new_; }

  int64_t since_us() const { return since_us_; }
  bool is_done(const std::string &id) const;
  void set_done(const std::string &id);
  // Counts a beginning. False when two have not come to an end: what kills the service is not tried for ever.
  bool begin(const std::string &id);

 private:
  void set(const std::string &id, int state);
  void save() const;

  std::string path_;
  bool is_new_ = false;
  int64_t since_us_ = 0;
  std::map<std::string, int> states_;  // times begun, or kDone
  std::deque<std::string> order_;      // the same ids, oldest first
};
