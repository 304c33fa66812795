#include "client_support.h"

#include <app_preference.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <thread>

#include "bus_connection.h"
#include "store_access.h"
#include "tavro-common.h"
#include "tavro_appcontrol_util.h"
#include "tavro_appdata.h"
#include "tavro_crash_popup.h"
#include "tavro_crash_report.h"
#include "tavro_dbmgr.h"
#include "tavro_memory.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_save_journal.h"
#include "tavro_screens.h"
#include "tavro_service_bridge.h"
#include "tavro_share.h"
#include "tavro_undo_bar.h"

std::vector<std::string> ui_calls;

namespace {

constexpr auto kLongWait = std::chrono::seconds(5);

// Buffer windows need no display; the version is read from a desktop entry named like the program.
class World : public ::testing::Environment {
 public:
  void SetUp() override {
    const std::string data_home = std::string(getenv("TMPDIR")) + "/data";
    setenv("XDG_DATA_HOME", data_home.c_str(), 1);
    setenv("ELM_ENGINE", "buffer", 1);
    std::filesystem::create_directories(data_home + "/applications");
    std::ofstream(data_home + "/applications/client_test.desktop")
        << "[Desktop Entry]\nType=Application\nName=Test\nExec=/bin/true\nX-Tavro-Version=1.0.0\n";
    // The machine's browser notes where it was sent.
    std::ofstream(data_home + "/applications/browser.desktop")
        << "[Desktop Entry]\nType=Application\nName=Browser\nExec=sh -c 'printf %%s \"$0\" >" << data_home
        << "/visited.new && mv " << data_home << "/visited.new " << data_home << "/visited' %u\n";
    std::ofstream(data_home + "/applications/mimeapps.list")
        << "[Default Applications]\nx-scheme-handler/https=browser.desktop\n";
    Listener::get();
    elm_init(0, nullptr);
    tavro_dbmgr_init_semaphore();
    ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  }
  void TearDown() override { elm_shutdown(); }
};
const auto *const world = ::testing::AddGlobalTestEnvironment(new World);

std::string launch_line(GDBusMessage *message) {
  const char *operation, *uri, *mime, *key, *value;
  GVariantIter *pairs;
  g_variant_get(g_dbus_message_get_body(message), "(&s&s&sa(ss))", &operation, &uri, &mime, &pairs);
  std::string line = std::string(g_dbus_message_get_path(message)) + " " + operation + " " + uri;
  while (g_variant_iter_next(pairs, "(&s&s)", &key, &value)) line += std::string(" ") + key + "=" + value;
  g_variant_iter_free(pairs);
  return line;
}

std::string notify_line(GVariant *body) {
  const char *title, *text;
  g_variant_get_child(body, 3, "&s", &title);
  g_variant_get_child(body, 4, "&s", &text);
  return std::string("Notify ") + title + "|" + text;
}

}  // namespace

Listener &Listener::get() {
  static Listener listener;
  return listener;
}

Listener::Listener() {
  bus_.reset(connect_to_bus());
  g_dbus_connection_add_filter(bus_.get(), filter, this, nullptr);
  for (const char *name : {"corvane.tavro-svc", "org.tizen.tizenstore", "org.tizen.system.crash",
                           "org.freedesktop.Notifications"})
    set_name_owned(bus_.get(), name, true);
}

void Listener::set_crash_service(bool is_present) {
  set_name_owned(bus_.get(), "org.tizen.system.crash", is_present);
}

GDBusMessage *Listener::filter(GDBusConnection *bus, GDBusMessage *message, gboolean is_incoming,
                               gpointer self) {
  if (!is_incoming || g_dbus_message_get_message_type(message) != G_DBUS_MESSAGE_TYPE_METHOD_CALL)
    return message;
  static_cast<Listener *>(self)->note(message);
  if (!(g_dbus_message_get_flags(message) & G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED)) {
    const TavroObject<GDBusMessage> reply(g_dbus_message_new_method_reply(message));
    const std::string member = g_dbus_message_get_member(message);
    static guint32 next_id = 0;
    if (member == "Notify") g_dbus_message_set_body(reply.get(), g_variant_new("(u)", ++next_id));
    g_dbus_connection_send_message(bus, reply.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr, nullptr);
  }
  g_object_unref(message);
  return nullptr;
}

void Listener::note(GDBusMessage *message) {
  const std::string member = g_dbus_message_get_member(message);
  GVariant *body = g_dbus_message_get_body(message);
  std::string line = member;
  if (member == "Launch") {
    line = launch_line(message);
  } else if (member == "Notify") {
    line = notify_line(body);
  } else if (body) {
    const TavroGText text(g_variant_print(body, FALSE));
    line += std::string(" ") + g_dbus_message_get_path(message) + " " + text.get();
  }
  const std::lock_guard<std::mutex> lock(mutex_);
  lines_.push_back(line);
}

bool Listener::holds(const std::string &text) {
  const std::lock_guard<std::mutex> lock(mutex_);
  return std::any_of(lines_.begin(), lines_.end(),
                     [&](const auto &line) { return line.find(text) != line.npos; });
}

std::vector<std::string> Listener::take(std::vector<std::string> ignored) {
  // Two marks travel behind what the client sent before: a notification and a launch request.
  static int count = 0;
  const std::string mark = "mark" + std::to_string(++count) + ".";
  appdata nobody = {};
  tavro_create_notification(("notification " + mark).c_str(), nullptr, &nobody);
  _tavro_launch_upload_mgr_svc(("request " + mark).c_str(), 0);
  const auto deadline = std::chrono::steady_clock::now() + kLongWait;
  while (!(holds("notification " + mark) && holds("request " + mark))) {
    if (std::chrono::steady_clock::now() > deadline) throw std::runtime_error("the marks did not arrive");
    g_main_context_iteration(nullptr, FALSE);
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  ignored.insert(ignored.end(), {mark, "GetCapabilities", "GetServerInformation", "CloseNotification"});
  const std::lock_guard<std::mutex> lock(mutex_);
  std::vector<std::string> taken;
  for (const std::string &line : std::exchange(lines_, {})) {
    const bool is_ignored = std::any_of(ignored.begin(), ignored.end(),
                                        [&](const auto &part) { return line.find(part) != line.npos; });
    if (!is_ignored) taken.push_back(line);
  }
  return taken;
}

std::vector<std::string> Listener::take_answers() {
  return take({"APP_UPDATE", "GET_BETA_URLS", "GET_MAX_LIMIT"});
}

TavroRequest make_request(const char *operation, Extras extras) {
  int error = 0;
  TavroRequest request = tavro_request_create(&error);
  if (operation) app_control_set_operation(request.get(), operation);
  for (const auto &[key, value] : extras) app_control_add_extra_data(request.get(), key, value.c_str());
  return request;
}

int store_report(const char *text, int status, const char *syslog_path) {
  tavro_dbmgr_bug_report_info *report = TAVRO_ZALLOC(tavro_dbmgr_bug_report_info);
  report->description = TAVRO_STRDUP(text);
  report->app_name = TAVRO_STRDUP("Hardware");
  report->user_name = TAVRO_STRDUP("anna");
  report->syslog_file = TAVRO_STRDUP(syslog_path);
  report->submitted = status;
  const int id = tavro_dbmgr_update_bug_report(report);
  tavro_dbmgr_free_bug_report_data(report);
  return id;
}

void ClientTest::SetUp() {
  tavro_initialize_application_data(&ad);
  std::vector<std::string> keys;
  preference_foreach_item(
      [](const char *key, void *data) {
        static_cast<std::vector<std::string> *>(data)->push_back(key);
        return true;
      },
      &keys);
  for (const std::string &key : keys) preference_remove(key.c_str());
  tavro_dbmgr_destroy_vocs();
  _tavro_dbmgr_clear_db("TABLE_VOC_EXTENDED");
  tavro_journal_clear();
  Listener::get().take();
  ui_calls.clear();
}

void ClientTest::TearDown() {
  if (ad.win) evas_object_del(ad.win);
  tavro_dealloc_memory(&ad);
}

void ClientTest::launch(const char *operation, Extras extras) {
  app_control(make_request(operation, extras).get(), &ad);
}

void ClientTest::offer_version(const char *change) {
  preference_set_string(TAVRO_PREF_APP_RESULT_CODE, "2");
  preference_set_string(TAVRO_PREF_APP_VERSION_CHANGE, change);
  preference_set_string(TAVRO_PREF_APP_VERSION, "9.9");
}

std::string ClientTest::query(const std::string &sql) {
  return value("SELECT " + sql, "NULL", "no row");
}

std::string ClientTest::column(int voc_id, const char *name) {
  const std::string from = " FROM TABLE_VOC LEFT JOIN TABLE_VOC_EXTENDED USING (VOC_ID) WHERE VOC_ID = ";
  return query(name + from + std::to_string(voc_id));
}

// ---- The screens and the shell: they note that they were called, the window is a real one. ----

int tavro_bind_locale() {
  return 0;
}

const char *tavro_text(const char *id) {
  return id;
}

bool tavro_create_base_window(appdata *ad) {
  ui_calls.push_back("window");
  if (ad->win) return true;
  ad->win = elm_win_add(nullptr, "client", ELM_WIN_BASIC);
  ad->layout = ad->nf = elm_naviframe_add(ad->win);
  return true;
}

Evas_Object *tavro_popup_show(appdata *ad, Evas_Object **slot, const char *title, const char *,
                              std::initializer_list<tavro_popup_button>) {
  ui_calls.push_back(std::string("popup ") + title);
  if (!ad->win) tavro_create_base_window(ad);
  *slot = elm_box_add(ad->win);
  return *slot;
}

int tavro_create_dir(const char *path) {
  return g_mkdir_with_parents(path, 0700);
}

void push_page(appdata *ad, const char *name) {
  ui_calls.push_back(name);
  elm_naviframe_item_push(ad->nf, name, nullptr, nullptr, elm_box_add(ad->nf), nullptr);
}

#define RECORD(function, line) \
  void function {              \
    ui_calls.push_back(line);  \
  }

void tavro_create_landing_page(appdata *ad) {
  push_page(ad, "landing");
}
RECORD(tavro_refresh_account_page_items(appdata *), "refresh accounts")
void tavro_create_account_page(appdata *ad) {
  push_page(ad, "account");
}
RECORD(tavro_account_page_say(appdata *, const char *text), std::string("account says ") + text)
void tavro_delete_all_popup(appdata *) {}
RECORD(tavro_pop_naviframe_middle_items(appdata *), "pop")
RECORD(tavro_update_landing_page_history_badge(appdata *ad), "badge " + std::to_string(ad->push_noti_count))
RECORD(tavro_create_history_page(appdata *), "history")
RECORD(tavro_update_history_page(app_control_h, appdata *), "update history")
RECORD(tavro_create_history_details_page(appdata *, int id), "details " + std::to_string(id))
RECORD(tavro_update_history_details_page(appdata *, int id), "update details " + std::to_string(id))
void tavro_attach_shared_files(app_control_h, appdata *) {}
RECORD(tavro_handle_crash_event(app_control_h, appdata *), "crash")
void tavro_crash_report_at_end() {}
void tavro_compose_keeper_offer(appdata *) {}
RECORD(tavro_undo_bar_show(appdata *, const char *text, void (*)(appdata *)), std::string("undo bar ") + text)
void tavro_undo_bar_hide() {}
bool tavro_leave_compose_page(appdata *) {
  ui_calls.push_back("leave compose");
  return true;
}
RECORD(tavro_create_crash_page(appdata *, const tavro_crash_report &), "crash report")
Evas_Object *tavro_popup_shown(const appdata *) {
  return nullptr;
}
Evas_Object *tavro_crash_popup_ask(appdata *ad, const tavro_crash_question &question, tavro_crash_action,
                                   tavro_crash_action) {
  return tavro_popup_show(ad, &ad->crash_popup, question.app_name.c_str(), nullptr, {});
}
Evas_Object *tavro_crash_popup_progress(appdata *, const std::string &) {
  return nullptr;
}
Evas_Object *tavro_crash_popup_never(appdata *, const std::string &, tavro_crash_action) {
  return nullptr;
}
void tavro_crash_popup_count(appdata *, int) {}
void tavro_crash_ground_show(appdata *) {}
void tavro_crash_ground_hide() {}
