// Calls of devices that wait for news: each is answered when an answer for its device is there, or when its
// time is over. A device has one waiting call; a newer one ends the older. Main loop only.
#pragma once

#include <libsoup/soup.h>

#include <functional>
#include <map>
#include <memory>
#include <string>

struct UpdateWaiter;

class UpdateWaiters {
 public:
  using Answer = std::function<void(SoupServerMessage *)>;

  UpdateWaiters();
  ~UpdateWaiters();
  UpdateWaiters(const UpdateWaiters &) = delete;
  UpdateWaiters &operator=(const UpdateWaiters &) = delete;

  // Holds the call back; `answer` is called once, unless the device hangs up first.
  void wait(const std::string &device, SoupServerMessage *message, unsigned seconds, Answer answer);
  // There is news for this device.
  void wake(const std::string &device);

 private:
  std::map<std::string, std::unique_ptr<UpdateWaiter>> waiters_;
  friend struct UpdateWaiter;
};
