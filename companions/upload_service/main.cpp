// corvane.tavro-svc: sends the phone's reports to the feedback desk and brings its answers back.
#include <service_app.h>
#include <sys/stat.h>

#include "svc_log.h"
#include "svc_requests.h"
#include "svc_updates.h"

namespace {

struct Service {
  SvcState state;
  // Made at create, when there is a main loop and the state is open.
  std::unique_ptr<DeskLink> desk;
  std::unique_ptr<SvcMessages> messages;
  std::unique_ptr<SvcUploader> uploader;
  std::unique_ptr<SvcUpdates> updates;
};

// What libraries say of faults goes to the platform log; their debug messages go nowhere.
void _log_cb(const char *, GLogLevelFlags level, const char *message, gpointer) {
  if (level & (G_LOG_LEVEL_ERROR | G_LOG_LEVEL_CRITICAL | G_LOG_LEVEL_WARNING)) SVC_LOGE("%s", message);
}

bool _open_state(SvcState &state) {
  char *folder = app_get_data_path();
  const bool is_open = folder && state.open(folder);
  free(folder);
  return is_open;
}

bool _create_cb(void *data) {
  auto *service = static_cast<Service *>(data);
  if (tavro_dbmgr_open_semaphore() != 0 || !_open_state(service->state)) return false;
  service->desk = std::make_unique<DeskLink>(service->state);
  service->messages = std::make_unique<SvcMessages>(service->state);
  service->uploader = std::make_unique<SvcUploader>(service->state, *service->desk, *service->messages);
  service->updates =
      std::make_unique<SvcUpdates>(service->state, *service->desk, *service->uploader, *service->messages);
  service->messages->deliver();
  service->uploader->wake();
  service->updates->poll();
  return true;
}

void _terminate_cb(void *) {
  SVC_LOGI("the service ends");
}

void _app_control_cb(app_control_h request, void *data) {
  svc_handle_request(request, *static_cast<Service *>(data)->uploader);
}

}  // namespace

int main(int argc, char **argv) {
  umask(077);
  g_log_set_default_handler(_log_cb, nullptr);
  Service service;
  service_app_lifecycle_callback_s callbacks = {_create_cb, _terminate_cb, _app_control_cb};
  return service_app_main(argc, argv, &callbacks, &service);
}
