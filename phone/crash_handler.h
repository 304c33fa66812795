// The machine's crash handler: what /proc/sys/kernel/core_pattern names. Enabling ours copies the handler
// program to a place of root's own, remembers what was there, and names the copy; disabling puts back exactly
// what was there, unless somebody else has changed it since. Nothing is written that would survive a reboot's
// own setting: after one the machine is as it was before. All functions print what they change. Blocks.
#pragma once

#include <string>

namespace phone {

class CrashHandler {
 public:
  // `root` is empty, or another root file system, as a test has.
  explicit CrashHandler(std::string root);

  // 0 done, 1 failed, after a message.
  int enable();
  int disable();
  int status() const;

 private:
  enum class Kind { kNone, kFile, kOurs, kSystemd, kOther };
  Kind kind_of(const std::string &pattern) const;
  bool copy_program() const;
  bool prove() const;
  void forget() const;

  std::string root_;
  std::string pattern_path_;
  std::string home_;     // below root_
  std::string program_;  // the handler's copy, as the kernel sees it
  std::string our_pattern_;
};

}  // namespace phone
