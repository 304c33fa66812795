#include <app_manager.h>
#include <gmock/gmock.h>

#include <cstdlib>

#include "platform_support.h"

namespace {

using ::testing::ElementsAre;

struct Reply {
  bool has_come = false;
  bool is_null = false;
  app_control_result_e result = APP_CONTROL_RESULT_CANCELED;
  std::vector<std::pair<std::string, std::string>> data;
};

bool take_pair(app_control_h reply, const char *key, void *into) {
  char *value = nullptr;
  app_control_get_extra_data(reply, key, &value);
  static_cast<Reply *>(into)->data.emplace_back(key, value);
  free(value);
  return true;
}

void take_reply(app_control_h, app_control_h reply, app_control_result_e result, void *data) {
  auto *into = static_cast<Reply *>(data);
  into->has_come = true;
  into->is_null = !reply;
  into->result = result;
  if (reply) app_control_foreach_extra_data(reply, take_pair, data);
}

class LaunchRequest : public ::testing::Test {
 protected:
  void SetUp() override { make_startable(kService); }
  void TearDown() override {
    bool is_running = false;
    app_manager_is_running(kService.c_str(), &is_running);
    if (is_running) send(kService, "end");
    EXPECT_TRUE(wait_for([&] {
      app_manager_is_running(kService.c_str(), &is_running);
      return !is_running;
    }));
    wait_for([] { return count_in_record(kService, "create") == count_in_record(kService, "terminate"); }, 3);
    unlink(("/opt/usr/" + kService + ".record").c_str());
  }
};

TEST_F(LaunchRequest, StartsTheApplicationAndArriveInOrder) {
  make_startable(kService, "SAMPLE_SLOW_START=1");
  for (int i = 0; i < 100; ++i) ASSERT_EQ(send(kService, "go", std::to_string(i)), 0);
  ASSERT_TRUE(wait_for([] { return record_of(kService).size() > 100; }));
  const auto lines = record_of(kService);
  EXPECT_EQ(lines[0], "create");
  for (size_t i = 0; i < 100; ++i) EXPECT_EQ(lines[i + 1], "launch go " + std::to_string(i));
}

TEST_F(LaunchRequest, CarriesOneMegabyteBothWaysAndKeepsTheOrderOfItsKeys) {
  app_control_h request = nullptr;
  app_control_create(&request);
  app_control_set_app_id(request, kService.c_str());
  const std::string big(1 << 20, 'v');
  for (const char *key : {"z", "a", "m"}) app_control_add_extra_data(request, key, big.c_str());
  app_control_add_extra_data(request, "a", "ä replaced in place");
  Reply reply;
  ASSERT_EQ(app_control_send_launch_request(request, take_reply, &reply), 0);
  app_control_destroy(request);
  ASSERT_TRUE(wait_for([&] { return reply.has_come; }));
  EXPECT_EQ(reply.result, APP_CONTROL_RESULT_SUCCEEDED);
  EXPECT_TRUE(reply.data == (decltype(reply.data){{"z", big}, {"a", "ä replaced in place"}, {"m", big}}));
}

bool take_array(app_control_h reply, const char *key, void *into) {
  char **values = nullptr;
  int length = 0;
  const int error = app_control_get_extra_data_array(reply, key, &values, &length);
  if (error == APP_CONTROL_ERROR_INVALID_DATA_TYPE) return take_pair(reply, key, into);
  EXPECT_EQ(error, APP_CONTROL_ERROR_NONE);
  for (int i = 0; i < length; ++i) {
    static_cast<Reply *>(into)->data.emplace_back(std::string(key) + "[]", values[i]);
    free(values[i]);
  }
  free(values);
  return true;
}

void take_arrays(app_control_h, app_control_h reply, app_control_result_e, void *into) {
  static_cast<Reply *>(into)->has_come = true;
  app_control_foreach_extra_data(reply, take_array, into);
}

TEST_F(LaunchRequest, CarriesArraysBothWaysAndTellsThemFromSingleValues) {
  app_control_h request = nullptr;
  app_control_create(&request);
  app_control_set_app_id(request, kService.c_str());
  const char *three[] = {"a", "", "a"}, *one[] = {"alone"}, *bad[] = {"good", "\xff"};
  app_control_add_extra_data(request, "files", "replaced by the array, in its place");
  app_control_add_extra_data(request, "last", "");
  EXPECT_EQ(app_control_add_extra_data_array(request, "files", three, 3), APP_CONTROL_ERROR_NONE);
  EXPECT_EQ(app_control_add_extra_data_array(request, "one", one, 1), APP_CONTROL_ERROR_NONE);
  EXPECT_EQ(app_control_add_extra_data_array(request, "bad", bad, 2), APP_CONTROL_ERROR_INVALID_PARAMETER);
  EXPECT_EQ(app_control_add_extra_data_array(request, "none", three, 0), APP_CONTROL_ERROR_INVALID_PARAMETER);
  char *value = nullptr;
  EXPECT_EQ(app_control_get_extra_data(request, "files", &value), APP_CONTROL_ERROR_INVALID_DATA_TYPE);
  Reply reply;
  ASSERT_EQ(app_control_send_launch_request(request, take_arrays, &reply), 0);
  app_control_destroy(request);
  ASSERT_TRUE(wait_for([&] { return reply.has_come; }));
  EXPECT_TRUE(reply.data ==
              (decltype(reply.data){
                  {"files[]", "a"}, {"files[]", ""}, {"files[]", "a"}, {"last", ""}, {"one", "alone"}}));
}

TEST_F(LaunchRequest, ToAnUnknownApplicationIsAnErrorWithAndWithoutReply) {
  Reply reply;
  for (const char *id : {"no.such.app", "", "not a name", ":1.1", "org.freedesktop.DBus"}) {
    EXPECT_EQ(send(id, "go"), APP_CONTROL_ERROR_APP_NOT_FOUND) << id;
    EXPECT_EQ(send(id, "go", "", take_reply, &reply), APP_CONTROL_ERROR_APP_NOT_FOUND) << id;
  }
  EXPECT_FALSE(reply.has_come);
}

TEST_F(LaunchRequest, ToAnApplicationThatDoesNotStartFailsAudibly) {
  make_startable(kService, "SAMPLE_REFUSES=1");
  Reply reply;
  ASSERT_EQ(send(kService, "go", "", take_reply, &reply), 0);
  ASSERT_TRUE(wait_for([&] { return reply.has_come; }));
  EXPECT_EQ(reply.result, APP_CONTROL_RESULT_FAILED);
  EXPECT_TRUE(reply.is_null);
  unlink(("/opt/usr/" + kService + ".record").c_str());
}

TEST_F(LaunchRequest, WithoutReplyThatCannotBeDeliveredIsLogged) {
  make_startable(kService, "/no/such/program");
  ASSERT_EQ(send(kService, "go"), 0);
  EXPECT_TRUE(wait_for([] {
    return file_contents("/opt/usr/share/log/platform.log")
               .find("request to " + kService + " was not delivered") != std::string::npos;
  }));
}

TEST_F(LaunchRequest, IsRepeatedOnceWhenTheReceiverDiesWithIt) {
  Reply reply;
  ASSERT_EQ(send(kService, "die", "", take_reply, &reply), 0);
  ASSERT_TRUE(wait_for([&] { return reply.has_come; }));
  EXPECT_EQ(reply.result, APP_CONTROL_RESULT_FAILED);
  EXPECT_EQ(count_in_record(kService, "create"), 2);
  unlink(("/opt/usr/" + kService + ".record").c_str());
}

TEST_F(LaunchRequest, RacingAnEndingApplicationIsNeverLost) {
  constexpr int kRounds = 100;
  for (int i = 0; i < kRounds; ++i) {
    send(kService, "end");
    g_usleep(static_cast<gulong>(g_random_int_range(0, 3000)));
    ASSERT_EQ(send(kService, "go", std::to_string(i)), 0);
  }
  EXPECT_TRUE(
      wait_for([] { return count_in_record(kService, "launch go " + std::to_string(kRounds - 1)) > 0; }));
  for (int i = 0; i < kRounds; ++i)
    EXPECT_EQ(count_in_record(kService, "launch go " + std::to_string(i)), 1) << i;
}

TEST_F(LaunchRequest, OfAnotherSignatureIsRefused) {
  ASSERT_EQ(send(kService, "go"), 0);
  GError *error = nullptr;
  GDBusConnection *bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  g_dbus_connection_call_sync(bus, kService.c_str(), "/test/sample_service", "org.tavro.AppControl1",
                              "Launch", g_variant_new("(si)", "go", 1), nullptr, G_DBUS_CALL_FLAGS_NONE, 5000,
                              nullptr, &error);
  EXPECT_TRUE(g_error_matches(error, G_DBUS_ERROR, G_DBUS_ERROR_INVALID_ARGS));
  g_clear_error(&error);
}

TEST(LaunchRequestData, RefusesTextThatIsNotUtf8) {
  app_control_h request = nullptr;
  app_control_create(&request);
  EXPECT_EQ(app_control_add_extra_data(request, "key", "\xff"), APP_CONTROL_ERROR_INVALID_PARAMETER);
  EXPECT_EQ(app_control_set_operation(request, "\xc3"), APP_CONTROL_ERROR_INVALID_PARAMETER);
  char *value = nullptr;
  EXPECT_EQ(app_control_get_extra_data(request, "key", &value), APP_CONTROL_ERROR_KEY_NOT_FOUND);
  app_control_destroy(request);
}

TEST_F(LaunchRequest, IsServedByTheOneInstanceWhenStartedByHandTwice) {
  const std::string kDefault = std::string("launch ") + APP_CONTROL_OPERATION_DEFAULT;
  const pid_t first = start({program_of(kService)});
  ASSERT_TRUE(wait_for([&] { return count_in_record(kService, kDefault) == 1; }));
  EXPECT_EQ(wait_for_end(start({program_of(kService)})), 0);
  EXPECT_TRUE(wait_for([&] { return count_in_record(kService, kDefault) == 2; }));
  EXPECT_EQ(count_in_record(kService, "create"), 1);
  kill(first, SIGTERM);
  EXPECT_EQ(wait_for_end(first), 0);
  EXPECT_EQ(record_of(kService).back(), "terminate");
}

// A display with a window manager for one test.
class WindowLifeCycle : public LaunchRequest {
 protected:
  void SetUp() override {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    // Without -noreset the end of the first xprop resets the server, and refuses a manager that is
    // connecting.
    server_ = start(
        {"Xvfb", "-displayfd", "1", "-screen", "0", "720x1280x24", "-nolisten", "tcp", "-noreset"}, ends[1]);
    close(ends[1]);
    char number[16] = {};
    ASSERT_GT(read(ends[0], number, sizeof(number) - 1), 0);
    close(ends[0]);
    display_ = ":" + std::to_string(atoi(number));
    setenv("DISPLAY", display_.c_str(), 1);
    manager_ = start({"openbox"});
    // A window that is mapped before the manager works is not managed, and cannot be iconified.
    const char *has_manager = "xprop -root _NET_SUPPORTING_WM_CHECK 2>/dev/null | grep -q 'window id'";
    ASSERT_TRUE(wait_for([=] { return std::system(has_manager) == 0; }));
    make_startable(kWindow, "DISPLAY=" + display_);
  }
  void TearDown() override {
    for (const pid_t child : {manager_, server_}) {
      kill(child, SIGTERM);
      wait_for_end(child);
    }
    unsetenv("DISPLAY");
  }

  pid_t server_ = 0, manager_ = 0;
  std::string display_;
};

TEST_F(WindowLifeCycle, GoesFromCreateToLaunchToResumeAndPausesWhileItIsOutOfSight) {
  const std::string kDefault = APP_CONTROL_OPERATION_DEFAULT;
  ASSERT_EQ(send(kWindow, kDefault), 0);
  ASSERT_TRUE(wait_for([] { return count_in_record(kWindow, "resume") == 1; }));
  const char *is_managed = "xprop -root _NET_CLIENT_LIST 2>/dev/null | grep -q '# 0x'";
  ASSERT_TRUE(wait_for([=] { return std::system(is_managed) == 0; }));
  g_usleep(300'000);  // and its visibility has been told
  ASSERT_EQ(send(kWindow, "iconify"), 0);
  ASSERT_TRUE(wait_for([] { return count_in_record(kWindow, "pause") == 1; }));
  ASSERT_EQ(send(kWindow, kDefault), 0);
  EXPECT_TRUE(wait_for([] { return count_in_record(kWindow, "resume") == 2; }));
  ASSERT_EQ(send(kWindow, "end"), 0);
  ASSERT_TRUE(wait_for([] { return count_in_record(kWindow, "terminate") == 1; }));
  EXPECT_THAT(record_of(kWindow),
              ElementsAre("create", "launch " + kDefault, "resume", "launch iconify", "pause",
                          "launch " + kDefault, "resume", "launch end", "terminate"));
}

}  // namespace
