// The upload service with a desk that misbehaves.
#include "service_world.h"

namespace {

void answer_half(SoupServerMessage *message) {
  GObjectPtr<GIOStream> stream(soup_server_message_steal_connection(message));
  const char half[] = "HTTP/1.1 201 Created\r\nContent-Length: 900\r\n\r\n{\"id\": 7";
  g_output_stream_write_all(g_io_stream_get_output_stream(stream.get()), half, sizeof half - 1, nullptr,
                            nullptr, nullptr);
  g_io_stream_close(stream.get(), nullptr, nullptr);
}

struct Fault {
  const char *name;
  void (*answer)(SoupServerMessage *message);
};

class TransientFault : public ServiceWorld, public ::testing::WithParamInterface<Fault> {};

TEST_P(TransientFault, LeavesTheReportToBeSentAndTellsTheClientOnce) {
  g_setenv("TAVRO_SVC_TIMEOUT_S", "1", TRUE);
  FakeDesk desk;
  desk.on_report = GetParam().answer;
  const int id = store_report();
  start_service(desk.url);
  ASSERT_TRUE(wait_until([&] { return desk.reports >= 3; }));
  EXPECT_EQ(column("VOC_STATE", id), "11");
  EXPECT_EQ(column("VOC_TEXT", id), "Grey boxes");
  EXPECT_EQ(messages_, std::vector<std::string>{"FAIL " + std::to_string(id)});
}

INSTANTIATE_TEST_SUITE_P(
    Faults, TransientFault,
    ::testing::Values(
        Fault{"ServerError", [](SoupServerMessage *m) { respond(m, 503, R"({"error": "no"})"); }},
        Fault{"TooManyCalls", [](SoupServerMessage *m) { respond(m, 429, "{}"); }},
        Fault{"Garbage", [](SoupServerMessage *m) { respond(m, 200, "\xff\xfe<html>"); }},
        Fault{"NoId", [](SoupServerMessage *m) { respond(m, 201, R"({"id": "7"})"); }},
        Fault{"HugeId", [](SoupServerMessage *m) { respond(m, 201, R"({"id": 4294967297})"); }},
        Fault{"Endless", [](SoupServerMessage *m) { respond(m, 201, std::string(5000000, ' ')); }},
        Fault{"Redirection",
              [](SoupServerMessage *m) {
                soup_server_message_set_redirect(m, 302, "http://127.0.0.1:9/elsewhere");
              }},
        Fault{"HalfAnAnswer", answer_half},
        Fault{"Nothing", [](SoupServerMessage *m) { soup_server_message_pause(m); }}),
    [](const auto &tested) { return std::string(tested.param.name); });

using ServiceFaults = ServiceWorld;

TEST_F(ServiceFaults, ARefusedReportFailsForGoodUntilItIsAskedForAgain) {
  FakeDesk desk;
  desk.on_report = [](SoupServerMessage *message) {
    respond(message, 422, R"({"error": "title is too long"})");
  };
  const int id = store_report();
  start_service(desk.url);
  ASSERT_TRUE(wait_for_state(id, "0"));
  run_loop_for(400);
  EXPECT_EQ(desk.reports, 1);
  launch("TAVRO_SEND_FAILED_VOC", id);
  EXPECT_TRUE(wait_for_message("FAIL " + std::to_string(id), 2));
  EXPECT_EQ(desk.reports, 2);
}

TEST_F(ServiceFaults, ATokenThatTheDeskForgotIsReplacedOnce) {
  FakeDesk desk;
  desk.on_report = [&](SoupServerMessage *message) {
    if (desk.reports < 3) return respond(message, desk.reports == 1 ? 503 : 401, "{}");
    const char *sent =
        soup_message_headers_get_one(soup_server_message_get_request_headers(message), "Authorization");
    EXPECT_EQ(sent ? sent : "", "Bearer " + desk.token);
    respond(message, 201, R"({"id": 7, "complete": true})");
  };
  const int id = store_report();
  start_service(desk.url);
  EXPECT_TRUE(wait_for_state(id, "1"));
  EXPECT_EQ(desk.registrations, 2);
}

TEST_F(ServiceFaults, ADeskIdThatAnotherReportHasDoesNotMakeItSentForEver) {
  FakeDesk desk;
  desk.on_report = [](SoupServerMessage *message) {
    respond(message, 201, R"({"id": 7, "complete": true})");
  };
  const int first = store_report(), second = store_report();
  start_service(desk.url);
  EXPECT_TRUE(wait_for_state(first, "1"));
  EXPECT_TRUE(wait_for_state(second, "12"));
  run_loop_for(300);
  EXPECT_EQ(desk.reports, 2);
}

TEST_F(ServiceFaults, ADeskThatNeverTakesMoreOfAFileEndsTheAttempt) {
  FakeDesk desk;
  desk.on_report = [](SoupServerMessage *message) { respond(message, 201, R"({"id": 7})"); };
  desk.on_file = [](SoupServerMessage *message) {
    const bool is_question = strcmp(soup_server_message_get_method(message), "GET") == 0;
    respond(message, is_question ? 404 : 202, R"({"received": 5, "complete": false})");
  };
  const int id = store_report();
  start_service(desk.url);
  ASSERT_TRUE(wait_until([&] { return desk.reports >= 3; }));
  EXPECT_LE(desk.files, 9);  // each time one question, the first piece and the rest
  EXPECT_EQ(column("VOC_STATE", id), "11");
}

TEST_F(ServiceFaults, AReportThatOneFaultHoldsBackDoesNotHoldBackTheOthers) {
  FakeDesk desk;
  desk.on_report = [&](SoupServerMessage *message) {
    GBytesPtr body(soup_message_body_flatten(soup_server_message_get_request_body(message)));
    const std::string text(static_cast<const char *>(g_bytes_get_data(body.get(), nullptr)),
                           g_bytes_get_size(body.get()));
    if (text.find("poison") != std::string::npos) return respond(message, 500, "{}");
    respond(message, 201, R"({"id": 7, "complete": true})");
  };
  const int first = store_report({}, "poison"), second = store_report();
  start_service(desk.url);
  EXPECT_TRUE(wait_for_state(second, "1"));
  EXPECT_EQ(column("VOC_STATE", first), "11");
}

}  // namespace
