#include <account.h>
#include <app_manager.h>
#include <badge.h>
#include <device/battery.h>
#include <device/callback.h>
#include <gmock/gmock.h>
#include <notification.h>
#include <package_manager.h>
#include <storage.h>
#include <telephony.h>

#include <mutex>

#include "bus_connection.h"
#include "desktop_link.h"
#include "platform_support.h"

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

// A service of the machine, played by this process on the phone's bus over a connection of its own: it
// answers with what the test laid down and writes down what it was asked.
class FakeService {
 public:
  FakeService(const char *name, std::vector<std::pair<std::string, const char *>> answers)
      : answers_(std::move(answers)) {
    bus_ = connect_to_bus();
    // The filter runs on the connection's own thread, so that calls that wait can be answered.
    g_dbus_connection_add_filter(bus_, filter_cb, this, nullptr);
    set_name_owned(bus_, name, true);
  }
  ~FakeService() {
    g_dbus_connection_close_sync(bus_, nullptr, nullptr);
    g_object_unref(bus_);
  }

  void emit(const char *path, const char *interface, const char *signal, const char *arguments) {
    g_dbus_connection_emit_signal(bus_, nullptr, path, interface, signal, g_variant_new_parsed(arguments),
                                  nullptr);
  }

  std::vector<std::string> calls(const std::string &method) {
    const std::lock_guard<std::mutex> lock(mutex_);
    std::vector<std::string> found;
    for (const auto &[name, arguments] : calls_) {
      if (name == method) found.push_back(arguments);
    }
    return found;
  }

 private:
  static GDBusMessage *filter_cb(GDBusConnection *bus, GDBusMessage *message, gboolean is_incoming,
                                 gpointer data) {
    auto *self = static_cast<FakeService *>(data);
    if (!is_incoming || g_dbus_message_get_message_type(message) != G_DBUS_MESSAGE_TYPE_METHOD_CALL)
      return message;
    const std::lock_guard<std::mutex> lock(self->mutex_);
    const std::string method = g_dbus_message_get_member(message);
    GVariant *body = g_dbus_message_get_body(message);
    gchar *arguments = body ? g_variant_print(body, FALSE) : g_strdup("");
    self->calls_.emplace_back(method, arguments);
    g_free(arguments);
    GDBusMessage *reply = g_dbus_message_new_method_reply(message);
    for (const auto &[name, answer] : self->answers_) {
      if (name == method) g_dbus_message_set_body(reply, g_variant_new_parsed(answer));
    }
    g_dbus_connection_send_message(bus, reply, G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr, nullptr);
    g_object_unref(reply);
    g_object_unref(message);
    return nullptr;
  }

  GDBusConnection *bus_;
  const std::vector<std::pair<std::string, const char *>> answers_;
  std::mutex mutex_;  // guards calls_
  std::vector<std::pair<std::string, std::string>> calls_;
};

notification_h make_notification(notification_type_e type, const char *title, const char *content) {
  notification_h noti = notification_create(type);
  notification_set_text(noti, NOTIFICATION_TEXT_TYPE_TITLE, title, nullptr, NOTIFICATION_VARIABLE_TYPE_NONE);
  notification_set_text(noti, NOTIFICATION_TEXT_TYPE_CONTENT, content, nullptr,
                        NOTIFICATION_VARIABLE_TYPE_NONE);
  return noti;
}

// Runs first of the notification tests: what is learnt of the service is kept for the process.
TEST(Notification, WithoutAServiceIsLoggedAndForgotten) {
  notification_h noti = make_notification(NOTIFICATION_TYPE_NOTI, "nobody", "listens");
  EXPECT_EQ(notification_post(noti), 0);
  EXPECT_TRUE(wait_for([] {
    return file_contents("/opt/usr/share/log/platform.log").find("notification service failed") !=
           std::string::npos;
  }));
  notification_free(noti);
}

const std::vector<std::pair<std::string, const char *>> kNotificationAnswers = {
    {"GetCapabilities", "(['body', 'body-markup', 'actions'],)"},
    {"GetServerInformation", "('fake', 'test', '1', '1.2')"},
    {"Notify", "(@u 7,)"},
};
constexpr const char *kNotifications = "org.freedesktop.Notifications";
constexpr const char *kNotificationsPath = "/org/freedesktop/Notifications";

// What the tag stands for; an empty answer when nothing is shown under it.
notification_h shown_under(const char *tag) {
  notification_h noti = nullptr;
  wait_for([&] { return (noti = notification_load_by_tag(tag)) != nullptr; });
  return noti;
}

TEST(Notification, IsReplacedUnderItsIdAlsoByAnotherHandleUntilItIsClosed) {
  FakeService service(kNotifications, kNotificationAnswers);
  notification_h noti = make_notification(NOTIFICATION_TYPE_NOTI, "News", "<b>1 & 2</b>");
  notification_set_tag(noti, "news");
  notification_post(noti);
  notification_free(noti);
  noti = shown_under("news");
  ASSERT_TRUE(noti);
  notification_set_progress(noti, 0.5);
  notification_update(noti);
  ASSERT_TRUE(wait_for([&] { return service.calls("Notify").size() == 2; }));
  EXPECT_THAT(service.calls("Notify")[0], HasSubstr("&lt;b&gt;1 &amp; 2&lt;/b&gt;"));
  EXPECT_THAT(service.calls("Notify")[1], HasSubstr(", 7, "));
  EXPECT_THAT(service.calls("Notify")[1], HasSubstr("'value': <50>"));
  notification_delete(noti);
  ASSERT_TRUE(wait_for([&] { return service.calls("CloseNotification").size() == 1; }));
  EXPECT_THAT(service.calls("CloseNotification")[0], "(7,)");
  EXPECT_EQ(notification_load_by_tag("news"), nullptr);
  notification_post(noti);
  ASSERT_TRUE(wait_for([&] { return service.calls("Notify").size() == 3; }));
  EXPECT_THAT(service.calls("Notify")[2], Not(HasSubstr(", 7, ")));
  notification_free(noti);
}

TEST(Notification, OfAnotherRunOfTheServiceIsNotReplacedButShownAnew) {
  notification_h noti = shown_under("news");
  ASSERT_TRUE(noti);
  FakeService service(kNotifications, kNotificationAnswers);
  notification_update(noti);
  ASSERT_TRUE(wait_for([&] { return service.calls("Notify").size() == 1; }));
  EXPECT_THAT(service.calls("Notify")[0], Not(HasSubstr(", 7, ")));
  notification_free(noti);
}

TEST(Notification, ThatIsDeletedBecomesTheOnePostedNext) {
  FakeService service(kNotifications, kNotificationAnswers);
  notification_h sending = make_notification(NOTIFICATION_TYPE_ONGOING, "sending", "");
  notification_set_tag(sending, "sending");
  notification_post(sending);
  notification_free(sending);
  ASSERT_TRUE(sending = shown_under("sending"));
  notification_free(sending);
  notification_delete_all(NOTIFICATION_TYPE_ONGOING);
  notification_h sent = make_notification(NOTIFICATION_TYPE_NOTI, "sent", "");
  notification_post(sent);
  notification_free(sent);
  ASSERT_TRUE(wait_for([&] { return service.calls("Notify").size() == 2; }));
  EXPECT_THAT(service.calls("Notify")[1], HasSubstr(", 7, "));
  EXPECT_TRUE(wait_for([] { return notification_load_by_tag("sending") == nullptr; }));
  EXPECT_THAT(service.calls("CloseNotification"), ElementsAre());
}

// The link serves from here on, as it does in a phone.
TEST(Notification, StartsWhatItNamesOnceWhenTouchedAfterItsPosterHasEnded) {
  FakeService service(kNotifications, kNotificationAnswers);
  make_startable(kService);
  ASSERT_TRUE(platform::start_desktop_link());
  const auto post = [](const char *title) {
    EXPECT_EQ(wait_for_end(start({program_of(kService), "--post", title})), 0);
  };
  const auto touch = [&](const char *arguments) {
    service.emit(kNotificationsPath, kNotifications, "ActionInvoked", arguments);
  };
  post("last 'wörds\\");
  ASSERT_EQ(service.calls("Notify").size(), 1u);
  touch("(@u 8, 'default')");
  touch("(@u 7, 'other')");
  touch("(@u 7, 'default')");
  EXPECT_TRUE(wait_for([] { return count_in_record(kService, "launch touched last 'wörds\\") == 1; }));
  service.emit(kNotificationsPath, kNotifications, "NotificationClosed", "(@u 7, @u 2)");
  touch("(@u 7, 'default')");
  send(kService, "end");
  ASSERT_TRUE(wait_for([] { return count_in_record(kService, "terminate") == 1; }));
  post("more words");
  touch("(@u 7, 'default')");
  EXPECT_TRUE(wait_for([] { return count_in_record(kService, "launch touched more words") == 1; }));
  EXPECT_EQ(count_in_record(kService, "launch touched last 'wörds\\"), 1);
  send(kService, "end");
  EXPECT_TRUE(wait_for([] { return count_in_record(kService, "terminate") == 2; }));
  unlink(("/opt/usr/" + kService + ".record").c_str());
}

TEST(Badge, KeepsItsCountForOtherProcessesAndOutOfThePreferences) {
  unsigned int count = 0;
  EXPECT_EQ(badge_set_count("a.b", 1), BADGE_ERROR_NOT_EXIST);
  EXPECT_EQ(badge_add("a.b"), 0);
  EXPECT_EQ(badge_add("a.b"), BADGE_ERROR_ALREADY_EXIST);
  EXPECT_EQ(badge_set_count("a.b", 3), 0);
  EXPECT_EQ(badge_get_count("a.b", &count), 0);
  EXPECT_EQ(count, 3u);
  EXPECT_EQ(badge_remove("a.b"), 0);
  EXPECT_EQ(badge_get_count("a.b", &count), BADGE_ERROR_NOT_EXIST);
}

TEST(Battery, IsReadFromThePowerServiceOnlyWhenItIsPresent) {
  int percent = -1;
  bool is_charging = false;
  device_battery_level_e level = DEVICE_BATTERY_LEVEL_FULL;
  EXPECT_EQ(device_battery_get_percent(&percent), DEVICE_ERROR_NOT_SUPPORTED);
  {
    FakeService absent("org.freedesktop.UPower",
                       {{"GetAll", "({'IsPresent': <false>, 'Percentage': <0.0>, 'State': <@u 0>},)"}});
    EXPECT_EQ(device_battery_get_percent(&percent), DEVICE_ERROR_NOT_SUPPORTED);
    EXPECT_EQ(percent, -1);
  }
  FakeService present("org.freedesktop.UPower",
                      {{"GetAll", "({'IsPresent': <true>, 'Percentage': <15.9>, 'State': <@u 1>},)"}});
  EXPECT_EQ(device_battery_get_percent(&percent), 0);
  EXPECT_EQ(percent, 15);
  EXPECT_EQ(device_battery_is_charging(&is_charging), 0);
  EXPECT_TRUE(is_charging);
  EXPECT_EQ(device_battery_get_level_status(&level), 0);
  EXPECT_EQ(level, DEVICE_BATTERY_LEVEL_LOW);
}

std::vector<int> capacities;

TEST(Battery, ChangeOfCapacityIsReportedOncePerPercent) {
  FakeService service("org.freedesktop.UPower", {});
  const device_changed_cb callback = [](device_callback_e, void *value, void *) {
    capacities.push_back(static_cast<int>(reinterpret_cast<intptr_t>(value)));
  };
  ASSERT_EQ(device_add_callback(DEVICE_CALLBACK_BATTERY_CAPACITY, callback, nullptr), 0);
  EXPECT_EQ(device_add_callback(DEVICE_CALLBACK_BATTERY_CAPACITY, callback, nullptr),
            DEVICE_ERROR_ALREADY_IN_PROGRESS);
  const auto report = [&service](const char *percentage) {
    const std::string change =
        std::string("('org.freedesktop.UPower.Device', {'Percentage': <") + percentage + ">}, @as [])";
    service.emit("/org/freedesktop/UPower/devices/DisplayDevice", "org.freedesktop.DBus.Properties",
                 "PropertiesChanged", change.c_str());
  };
  // What is said before the subscription is in force reaches nobody.
  EXPECT_TRUE(wait_for([&] { return report("16.4"), !capacities.empty(); }, 5));
  report("16.2");
  report("15.0");
  EXPECT_TRUE(wait_for([] { return capacities.size() >= 2; }, 5));
  EXPECT_THAT(capacities, ElementsAre(16, 15));
  EXPECT_EQ(device_remove_callback(DEVICE_CALLBACK_BATTERY_CAPACITY, callback), 0);
}

TEST(Telephony, TellsEveryModemInOrderAndItsNetwork) {
  telephony_handle_list_s list;
  EXPECT_EQ(telephony_init(&list), TELEPHONY_ERROR_NOT_SUPPORTED);
  EXPECT_EQ(list.count, 0u);
  FakeService service("org.freedesktop.ModemManager1",
                      {{"GetManagedObjects",
                        "({objectpath '/m/10': {'org.freedesktop.ModemManager1.Modem':"
                        "   {'State': <@i 3>, 'SignalQuality': <(@u 0, false)>}},"
                        "  objectpath '/m/2': {'org.freedesktop.ModemManager1.Modem':"
                        "   {'State': <@i 8>, 'SignalQuality': <(@u 51, true)>},"
                        "   'org.freedesktop.ModemManager1.Modem.Modem3gpp':"
                        "   {'OperatorName': <'Net & Co'>, 'RegistrationState': <@u 5>}}},)"},
                       {"GetLocation", "({@u 1: <'262,01,8BE3,2BAF41,0000'>},)"}});
  ASSERT_EQ(telephony_init(&list), 0);
  ASSERT_EQ(list.count, 2u);
  telephony_network_rssi_e rssi;
  telephony_network_service_state_e state;
  char *name = nullptr;
  int cell = 0, area = 0;
  bool is_roaming = false;
  telephony_network_get_rssi(list.handle[0], &rssi);
  EXPECT_EQ(rssi, TELEPHONY_NETWORK_RSSI_4);
  telephony_network_get_network_name(list.handle[0], &name);
  EXPECT_STREQ(name, "Net & Co");
  free(name);
  telephony_network_get_cell_id(list.handle[0], &cell);
  EXPECT_EQ(cell, 0x2BAF41);
  telephony_network_get_lac(list.handle[0], &area);
  EXPECT_EQ(area, 0x8BE3);
  telephony_network_get_roaming_status(list.handle[0], &is_roaming);
  EXPECT_TRUE(is_roaming);
  telephony_network_get_service_state(list.handle[0], &state);
  EXPECT_EQ(state, TELEPHONY_NETWORK_SERVICE_STATE_IN_SERVICE);
  telephony_network_get_service_state(list.handle[1], &state);
  EXPECT_EQ(state, TELEPHONY_NETWORK_SERVICE_STATE_RADIO_OFF);
  EXPECT_EQ(telephony_network_get_network_name(list.handle[1], &name), TELEPHONY_ERROR_OPERATION_FAILED);
  telephony_deinit(&list);
}

TEST(Storage, TellsWhatTheUserCanWriteAndMakesTheMediaFolder) {
  unsigned long long total = 0, available = 0;
  ASSERT_EQ(storage_get_total_space(0, &total), 0);
  ASSERT_EQ(storage_get_available_space(0, &available), 0);
  EXPECT_GT(total, 0u);
  EXPECT_LE(available, total);
  EXPECT_EQ(storage_get_total_space(1, &total), STORAGE_ERROR_NOT_SUPPORTED);
  char *folder = nullptr;
  ASSERT_EQ(storage_get_directory(0, STORAGE_DIRECTORY_CAMERA, &folder), 0);
  EXPECT_STREQ(folder, "/opt/usr/media/DCIM");
  EXPECT_EQ(access(folder, W_OK), 0);
  free(folder);
}

TEST(Applications, AreTheDesktopEntriesThatAreShownWithReadableIconAndVersion) {
  const std::string data = "/opt/usr/xdg";
  g_setenv("XDG_DATA_HOME", data.c_str(), TRUE);
  g_mkdir_with_parents((data + "/applications").c_str(), 0700);
  g_mkdir_with_parents((data + "/icons/hicolor/64x64/apps").c_str(), 0700);
  const std::string entry = "[Desktop Entry]\nType=Application\nExec=true\nIcon=sample-icon\nName=";
  std::ofstream(data + "/applications/shown.app.desktop") << entry << "Über O'Neil\nX-Tavro-Version=2.3\n";
  std::ofstream(data + "/applications/hidden.app.desktop") << entry << "Hidden\nNoDisplay=true\n";
  std::ofstream(data + "/icons/hicolor/64x64/apps/sample-icon.png") << "png";

  std::vector<std::string> found;
  app_manager_foreach_app_info(
      [](app_info_h info, void *into) {
        char *id = nullptr, *label = nullptr, *icon = nullptr;
        app_info_get_app_id(info, &id);
        app_info_get_label(info, &label);
        app_info_get_icon(info, &icon);
        const std::string line = std::string(id) + "|" + label + "|" + (icon ? icon : "");
        for (char *text : {id, label, icon}) free(text);
        if (line.find(".app|") != std::string::npos)
          static_cast<std::vector<std::string> *>(into)->push_back(line);
        return true;
      },
      &found);
  EXPECT_THAT(found,
              ElementsAre("shown.app|Über O'Neil|" + data + "/icons/hicolor/64x64/apps/sample-icon.png"));

  package_info_h package = nullptr;
  char *version = nullptr;
  ASSERT_EQ(package_manager_get_package_info("shown.app", &package), 0);
  EXPECT_EQ(package_info_get_version(package, &version), 0);
  EXPECT_STREQ(version, "2.3");
  free(version);
  package_info_destroy(package);
  EXPECT_EQ(package_manager_get_package_info("../shown.app", &package),
            PACKAGE_MANAGER_ERROR_NO_SUCH_PACKAGE);
}

TEST(Accounts, BeginWithTheMachinesUserWhoStaysRemovedOnceRemoved) {
  std::vector<int> ids;
  const account_cb collect = [](account_h account, void *into) {
    int id = 0;
    char *name = nullptr;
    account_get_account_id(account, &id);
    account_get_user_name(account, &name);
    EXPECT_STRNE(name, "");
    free(name);
    static_cast<std::vector<int> *>(into)->push_back(id);
    return true;
  };
  EXPECT_EQ(account_foreach_account_from_db(collect, &ids), ACCOUNT_ERROR_DB_NOT_OPENED);
  ASSERT_EQ(account_connect_readonly(), 0);
  ASSERT_EQ(account_foreach_account_from_db(collect, &ids), 0);
  ASSERT_EQ(ids.size(), 1u);
  account_h second = nullptr;
  int id = 0;
  account_create(&second);
  account_set_user_name(second, "O'Neil");
  account_set_package_name(second, "corvane.corvaneaccount");
  EXPECT_EQ(account_insert_to_db(second, &id), 0);
  EXPECT_EQ(account_insert_to_db(second, &id), ACCOUNT_ERROR_DUPLICATED);
  account_destroy(second);
  EXPECT_EQ(account_delete_from_db_by_id(ids[0]), 0);
  account_disconnect_readonly();

  ASSERT_EQ(account_connect_readonly(), 0);
  ids.clear();
  EXPECT_EQ(account_foreach_account_from_db(collect, &ids), 0);
  EXPECT_THAT(ids, ElementsAre(id));
  account_disconnect_readonly();
}

}  // namespace
