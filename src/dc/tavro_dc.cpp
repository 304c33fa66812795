#include "tavro_dc.h"

#include <condition_variable>
#include <cstring>
#include <mutex>
#include <set>

#include "tavro_dc_private.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

// Who may be sent a message. The lock is held while one is posted, and taken by the worker before it looks at
// what it got: so nobody is still busy with a queue that the worker releases.
struct live_collectors {
  std::mutex mutex;                      // guards all of this
  std::set<tavro_dc_context *> members;  // until their context is freed
  int workers = 0;                       // until they leave their thread's function
  std::condition_variable worker_left;
};

live_collectors &_live() {
  // Never destroyed: a worker may outlive the process's static objects.
  static live_collectors &live = *new live_collectors;
  return live;
}

thread_local tavro_dc_context *gOwnCollector = nullptr;

bool _is_named(const msg_data *message, const char *name) {
  return std::strcmp(message->msg_type, name) == 0;
}

bool _is_last(const msg_data *message) {
  return _is_named(message, kTavroDcCancel) || _is_named(message, kTavroDcDeinit);
}

// Under the lock.
void _push(tavro_dc_context *context, const char *name) {
  msg_data *message = TAVRO_ZALLOC(msg_data);
  g_strlcpy(message->msg_type, name, sizeof(message->msg_type));
  message->len = static_cast<int>(std::strlen(message->msg_type));
  if (_is_named(message, kTavroDcCancel)) context->is_cancelled = true;
  context->has_ended = _is_last(message);
  g_async_queue_push(context->pmsg_queue, message);
}

bool _post(tavro_dc_context *handle, const char *name) {
  live_collectors &live = _live();
  const std::lock_guard<std::mutex> lock(live.mutex);
  // The handle is not looked into before it is known to be one.
  if (live.members.count(handle) == 0 || handle->has_ended) return false;
  _push(handle, name);
  return true;
}

msg_data *_next_message(tavro_dc_context *context) {
  auto *message = static_cast<msg_data *>(g_async_queue_pop(context->pmsg_queue));
  const std::lock_guard<std::mutex> until_poster_is_done(_live().mutex);
  return message;
}

void _call(tavro_dc_cb callback, tavro_dc_context *context) {
  if (callback) callback(context, &context->report_info, context->userdata);
}

void _free_context(tavro_dc_context *context) {
  gOwnCollector = nullptr;
  {
    const std::lock_guard<std::mutex> lock(_live().mutex);
    _live().members.erase(context);
  }
  delete context;
}

void _end(tavro_dc_context *context, tavro_dc_cb callback) {
  g_async_queue_unref(context->pmsg_queue);
  context->pmsg_queue = nullptr;
  _call(callback, context);
  _free_context(context);
}

void _tavro_dc_handle_event(tavro_dc_context *context, msg_data *message) {
  const tavro_dc_callbacks listener = context->report_info.listener;
  if (_is_named(message, kTavroDcStart)) {
    if (!tavro_dc_is_cancelled()) _tavro_dc_start(context);
  } else if (_is_named(message, kTavroDcDeinit)) {
    _end(context, listener.dc_deinit_cb);
  } else if (_is_named(message, kTavroDcCancel)) {
    _end(context, listener.dc_cancel_cb);
  }
  TAVRO_FREE(message);
}

void *_tavro_dc_main_loop(void *data) {
  auto *context = static_cast<tavro_dc_context *>(data);
  TAVRO_LOGD("thread id: %lu", static_cast<unsigned long>(pthread_self()));
  gOwnCollector = context;
  msg_data *message = _next_message(context);
  for (; !message || !_is_last(message); message = _next_message(context)) {
    if (message) _tavro_dc_handle_event(context, message);
  }
  _tavro_dc_handle_event(context, message);
  TAVRO_LOGD("Exit main loop");
  const std::lock_guard<std::mutex> lock(_live().mutex);
  --_live().workers;
  _live().worker_left.notify_all();
  return nullptr;
}

// Nobody waits for the thread itself: what it holds is gone when it leaves its function.
bool _start_worker(tavro_dc_context *context) {
  const std::lock_guard<std::mutex> lock(_live().mutex);
  if (pthread_create(&context->thread_id, nullptr, _tavro_dc_main_loop, context) != 0) return false;
  pthread_detach(context->thread_id);
  _live().members.insert(context);
  ++_live().workers;
  return true;
}

}  // namespace

bool tavro_dc_is_cancelled() {
  return gOwnCollector && gOwnCollector->is_cancelled;
}

int tavro_dc_init(tavro_dc_context **handle_out, const tavro_dc_report_info *report_info, void *userdata) {
  if (!handle_out || !report_info) {
    TAVRO_LOGE("tavro_dc_init invalid handle");
    return -1;
  }
  auto *context = new tavro_dc_context;
  context->pmsg_queue = g_async_queue_new();
  context->report_info = *report_info;
  context->userdata = userdata;
  tavro_dc_report_info shown = *report_info;
  if (!_start_worker(context)) {
    TAVRO_LOGE("thread created fail");
    g_async_queue_unref(context->pmsg_queue);
    delete std::exchange(context, nullptr);
  }
  *handle_out = context;
  TAVRO_LOGD("handle: %p", static_cast<void *>(context));
  // From here on another thread may end the collector.
  if (shown.listener.dc_init_cb)
    shown.listener.dc_init_cb(context, context ? &context->report_info : &shown, userdata);
  return 0;
}

int tavro_dc_start(tavro_dc_context *handle, const tavro_dc_report_info *) {
  if (_post(handle, kTavroDcStart)) return 0;
  TAVRO_LOGE(" tavro_dc_start : handle is null ");
  return -1;
}

int tavro_dc_cancel(tavro_dc_context *handle) {
  if (_post(handle, kTavroDcCancel)) return 0;
  TAVRO_LOGE("tavro_dc_cancel invalid handle ");
  return -1;
}

int tavro_dc_deinit(tavro_dc_context *handle) {
  if (_post(handle, kTavroDcDeinit)) return 0;
  TAVRO_LOGE("tavro_dc_deinit invalid handle");
  return -1;
}

void tavro_dc_end_all() {
  live_collectors &live = _live();
  std::unique_lock<std::mutex> lock(live.mutex);
  for (tavro_dc_context *context : live.members) {
    // One that ends already may still have a collection before its deinit.
    context->is_cancelled = true;
    if (!context->has_ended) _push(context, kTavroDcCancel);
  }
  live.worker_left.wait(lock, [&live] { return live.workers == 0; });
}
