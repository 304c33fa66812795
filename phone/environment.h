// The environment of the phone's programs: the user's own, without what belongs to the desktop session, and
// with what makes it a phone.
#pragma once

#include <map>
#include <string>

#include "folder.h"

namespace phone {

class Environment {
 public:
  // This process's environment.
  static Environment current();

  void set(const std::string &key, const std::string &value) { values_[key] = value; }
  void unset(const std::string &key) { values_.erase(key); }
  std::string get(const std::string &key) const;
  bool has(const std::string &key) const { return values_.count(key) > 0; }

  // Null-terminated list for an exec function.
  TavroStrv to_strv() const;

 private:
  std::map<std::string, std::string> values_;
};

// The environment of every program of the phone. `keeps_host_session` is false for a phone that must not
// reach the desktop of the user who started it.
Environment phone_environment(const Folder &folder, const std::string &socket_folder,
                              bool keeps_host_session);

}  // namespace phone
