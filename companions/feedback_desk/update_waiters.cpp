#include "update_waiters.h"

#include "handles.h"

struct UpdateWaiter {
  UpdateWaiter(UpdateWaiters &waiters, std::string id, SoupServerMessage *call, UpdateWaiters::Answer then)
      : all(waiters), device(std::move(id)), message(share(call)), answer(std::move(then)) {}
  UpdateWaiter(const UpdateWaiter &) = delete;
  UpdateWaiter &operator=(const UpdateWaiter &) = delete;

  UpdateWaiters &all;
  std::string device;
  GObjectPtr<SoupServerMessage> message;
  UpdateWaiters::Answer answer;
  guint timer = 0;
  gulong gone_handler = 0;

  ~UpdateWaiter() {
    if (timer) g_source_remove(timer);
    if (gone_handler) g_signal_handler_disconnect(message.get(), gone_handler);
  }
};

namespace {

gboolean _time_is_over_cb(gpointer data) {
  auto *waiter = static_cast<UpdateWaiter *>(data);
  waiter->timer = 0;  // ended by the return value
  waiter->all.wake(std::string(waiter->device));
  return G_SOURCE_REMOVE;
}

}  // namespace

UpdateWaiters::UpdateWaiters() = default;
UpdateWaiters::~UpdateWaiters() = default;

void UpdateWaiters::wait(const std::string &device, SoupServerMessage *message, unsigned seconds,
                         Answer answer) {
  wake(device);
  auto waiter = std::make_unique<UpdateWaiter>(*this, device, message, std::move(answer));
  waiter->timer = g_timeout_add_seconds(seconds, _time_is_over_cb, waiter.get());
  auto gone = +[](SoupServerMessage *, gpointer data) {
    auto *self = static_cast<UpdateWaiter *>(data);
    self->all.waiters_.erase(std::string(self->device));
  };
  waiter->gone_handler = g_signal_connect(message, "disconnected", G_CALLBACK(gone), waiter.get());
  soup_server_message_pause(message);
  waiters_[device] = std::move(waiter);
}

void UpdateWaiters::wake(const std::string &device) {
  const auto found = waiters_.find(device);
  if (found == waiters_.end()) return;
  const auto waiter = std::move(found->second);
  waiters_.erase(found);
  waiter->answer(waiter->message.get());
  soup_server_message_unpause(waiter->message.get());
}
