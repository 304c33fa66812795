// Signed-in staff: browser sessions by cookie, each with a secret of its own for forms. Kept in memory: staff
// sign in again after the desk was restarted. Main loop only.
#pragma once

#include <map>
#include <string>

#include "desk_store.h"
#include "secret.h"

struct StaffSession {
  std::string form_secret;  // carried by every form, so that another site cannot send one
  int64_t end_ms;
};

class StaffSessions {
 public:
  // A new session; returns the cookie's value.
  std::string begin() {
    forget_ended();
    std::string cookie = random_token();
    sessions_[sha256_of(cookie)] = {random_token(), now_ms() + kLifetimeMs};
    return cookie;
  }
  // Null when there is none; valid until the next call of a member.
  StaffSession *find(const std::string &cookie) {
    forget_ended();
    const auto found = sessions_.find(sha256_of(cookie));
    return found == sessions_.end() ? nullptr : &found->second;
  }
  void end(const StaffSession &session) {
    for (auto it = sessions_.begin(); it != sessions_.end(); ++it)
      if (&it->second == &session) {
        sessions_.erase(it);
        return;
      }
  }

 private:
  static constexpr int64_t kLifetimeMs = 12 * 60 * 60 * 1000;

  void forget_ended() {
    for (auto it = sessions_.begin(); it != sessions_.end();)
      it = it->second.end_ms < now_ms() ? sessions_.erase(it) : std::next(it);
  }

  std::map<std::string, StaffSession> sessions_;  // by the hash of the cookie: the lookup tells nothing of it
};
