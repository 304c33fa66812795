// A small application for the platform's tests. Started under its application id it is a service (or, as
// "test.window", a window application) that writes what happens to it, one line each, to
// /opt/usr/<id>.record and answers every request with its extra data. Operations: "end" asks for the end,
// "die" ends at once without an answer, "iconify" hides the window.
// Started with arguments it does one job and ends: "--log COUNT", "--count KEY" (until killed), "--post
// TITLE".

#include <app.h>
#include <app_preference.h>
#include <dlog.h>
#include <fcntl.h>
#include <notification.h>
#include <service_app.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#ifdef TAVRO_SAMPLE_HAS_WINDOW
#include <Elementary.h>
#endif

namespace {

#ifdef TAVRO_SAMPLE_HAS_WINDOW
Evas_Object *window = nullptr;

void change_window(const std::string &operation) {
  if (!window) {
    window = elm_win_util_standard_add("sample", "Sample");
    evas_object_resize(window, 200, 200);
    evas_object_show(window);
  }
  if (operation == "iconify") elm_win_iconified_set(window, EINA_TRUE);
}

void end_application() {
  ui_app_exit();
}
#else
void change_window(const std::string &) {}
void end_application() {
  service_app_exit();
}
#endif

void record(const std::string &event) {
  char *id = nullptr;
  app_get_id(&id);
  const int file =
      open(("/opt/usr/" + std::string(id) + ".record").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
  const std::string line = event + "\n";
  if (write(file, line.data(), line.size()) < 0) perror("record");
  close(file);
  free(id);
}

void copy_array(app_control_h request, const char *key, app_control_h reply) {
  char **values = nullptr;
  int length = 0;
  if (app_control_get_extra_data_array(request, key, &values, &length) != APP_CONTROL_ERROR_NONE) return;
  app_control_add_extra_data_array(reply, key, const_cast<const char **>(values), length);
  for (int i = 0; i < length; ++i) free(values[i]);
  free(values);
}

bool copy_extra_data(app_control_h request, const char *key, void *reply) {
  bool is_array = false;
  app_control_is_extra_data_array(request, key, &is_array);
  if (is_array) return copy_array(request, key, static_cast<app_control_h>(reply)), true;
  char *value = nullptr;
  app_control_get_extra_data(request, key, &value);
  app_control_add_extra_data(static_cast<app_control_h>(reply), key, value);
  free(value);
  return true;
}

void answer(app_control_h request) {
  app_control_h reply = nullptr;
  app_control_create(&reply);
  app_control_foreach_extra_data(request, copy_extra_data, reply);
  app_control_reply_to_launch_request(reply, request, APP_CONTROL_RESULT_SUCCEEDED);
  app_control_destroy(reply);
}

std::string operation_of(app_control_h request) {
  char *text = nullptr;
  app_control_get_operation(request, &text);
  const std::string operation = text ? text : "";
  free(text);
  return operation;
}

std::string number_of(app_control_h request) {
  char *text = nullptr;
  if (app_control_get_extra_data(request, "number", &text) != APP_CONTROL_ERROR_NONE) return "";
  const std::string number = text;
  free(text);
  return " " + number;
}

bool created(void *) {
  record("create");
  if (getenv("SAMPLE_SLOW_START")) usleep(300'000);
  return !getenv("SAMPLE_REFUSES");
}

void terminated(void *) {
  record("terminate");
}
[[maybe_unused]] void paused(void *) {
  record("pause");
}
[[maybe_unused]] void resumed(void *) {
  record("resume");
}

void launched(app_control_h request, void *) {
  const std::string operation = operation_of(request);
  if (operation == "die") _exit(1);
  record("launch " + operation + number_of(request));
  change_window(operation);
  answer(request);
  if (operation == "end") end_application();
}

int log_many(int count) {
  for (int i = 0; i < count; ++i)
    dlog_print(DLOG_INFO, "SAMPLE", "begin %d %s end", i, std::string(300, 'x').c_str());
  return 0;
}

[[noreturn]] void count_until_killed(const char *key) {
  for (int i = 1;; ++i) {
    preference_set_int(key, i);
    printf("%d\n", i);
    fflush(stdout);
  }
}

bool post_and_end(void *title) {
  notification_h noti = notification_create(NOTIFICATION_TYPE_ONGOING);
  notification_set_text(noti, NOTIFICATION_TEXT_TYPE_TITLE, static_cast<char *>(title), nullptr,
                        NOTIFICATION_VARIABLE_TYPE_NONE);
  app_control_h request = nullptr;
  app_control_create(&request);
  app_control_set_app_id(request, "test.sample-service");
  app_control_set_operation(request, "touched");
  app_control_add_extra_data(request, "number", static_cast<char *>(title));
  notification_set_launch_option(noti, NOTIFICATION_LAUNCH_OPTION_APP_CONTROL, request);
  app_control_destroy(request);
  notification_post(noti);
  notification_free(noti);
  service_app_exit();
  return true;
}

void ignore(app_control_h, void *) {}

}  // namespace

int main(int argc, char **argv) {
  const std::string job = argc == 3 ? argv[1] : "";
  if (job == "--log") return log_many(atoi(argv[2]));
  if (job == "--count") count_until_killed(argv[2]);
  if (job == "--post") {
    service_app_lifecycle_callback_s callback = {post_and_end, nullptr, ignore};
    return service_app_main(argc, argv, &callback, argv[2]);
  }
#ifdef TAVRO_SAMPLE_HAS_WINDOW
  ui_app_lifecycle_callback_s callback = {created, terminated, paused, resumed, launched};
  return ui_app_main(argc, argv, &callback, nullptr);
#else
  service_app_lifecycle_callback_s callback = {created, terminated, launched};
  return service_app_main(argc, argv, &callback, nullptr);
#endif
}
