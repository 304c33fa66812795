#include "service_world.h"

#include <fcntl.h>
#include <sys/prctl.h>

#include <algorithm>

#include "bus_connection.h"
#include "json_fields.h"

namespace {

constexpr char kInterface[] =
    "<node><interface name='org.tavro.AppControl1'><method name='Launch'>"
    "<arg type='s' direction='in'/><arg type='s' direction='in'/><arg type='s' direction='in'/>"
    "<arg type='a(ss)' direction='in'/><arg type='i' direction='out'/><arg type='a(ss)' direction='out'/>"
    "</method></interface></node>";

}  // namespace

void respond(SoupServerMessage *message, int status, const std::string &body) {
  soup_server_message_set_status(message, static_cast<guint>(status), nullptr);
  soup_server_message_set_response(message, "application/json", SOUP_MEMORY_COPY, body.data(), body.size());
}

void Program::start(const std::vector<std::string> &arguments, int stdout_fd) {
  kill();
  pid_ = start_process([&] {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (stdout_fd >= 0) dup2(stdout_fd, STDOUT_FILENO);
    std::vector<char *> argv;
    for (const auto &argument : arguments) argv.push_back(const_cast<char *>(argument.c_str()));
    argv.push_back(nullptr);
    execv(argv[0], argv.data());
    return 127;
  });
}

void Program::kill() {
  if (pid_ <= 0) return;
  ::kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
  pid_ = 0;
}

bool Program::is_running() const {
  return pid_ > 0 && ::kill(pid_, 0) == 0 && waitpid(pid_, nullptr, WNOHANG) == 0;
}

bool wait_until(const std::function<bool()> &condition) {
  const gint64 deadline = g_get_monotonic_time() + 10 * G_USEC_PER_SEC;
  while (!condition()) {
    if (g_get_monotonic_time() > deadline) return false;
    run_loop_for(5);
  }
  return true;
}

void run_loop_for(unsigned ms) {
  bool is_over = false;
  g_timeout_add(
      ms,
      +[](gpointer over) -> gboolean {
        *static_cast<bool *>(over) = true;
        return G_SOURCE_REMOVE;
      },
      &is_over);
  while (!is_over) g_main_context_iteration(nullptr, TRUE);
}

FakeDesk::FakeDesk() : server_(soup_server_new(nullptr, nullptr)) {
  SoupServer *server = server_.get();
  auto take = +[](SoupServer *, SoupServerMessage *message, const char *path, GHashTable *, gpointer data) {
    auto *self = static_cast<FakeDesk *>(data);
    if (strcmp(path, "/api/v1/devices") == 0) {
      self->token = "token" + std::to_string(++self->registrations);
      return respond(message, 201, R"({"device": "d", "token": ")" + self->token + "\"}");
    }
    if (strcmp(path, "/api/v1/reports") == 0) return ++self->reports, self->on_report(message);
    if (strstr(path, "/attachments/") && self->on_file) return ++self->files, self->on_file(message);
    if (strstr(path, "/complete")) return respond(message, 200, R"({"id": 7, "status": 1})");
    soup_server_message_pause(message);  // no news
  };
  soup_server_add_handler(server, nullptr, take, this, nullptr);
  soup_server_listen_local(server, 0, SOUP_SERVER_LISTEN_IPV4_ONLY, nullptr);
  GSList *uris = soup_server_get_uris(server);
  url = "http://127.0.0.1:" + std::to_string(g_uri_get_port(static_cast<GUri *>(uris->data)));
  g_slist_free_full(uris, [](gpointer uri) { g_uri_unref(static_cast<GUri *>(uri)); });
}

void ServiceWorld::SetUp() {
  StoreWorld::SetUp();
  std::filesystem::remove_all("/opt/usr/apps/corvane.tavro-svc");
  std::filesystem::remove_all(desk_folder_);
  std::filesystem::create_directories("/opt/usr/media");
  g_setenv("TAVRO_SVC_RETRY_MS", "50", TRUE);
  g_unsetenv("TAVRO_SVC_TIMEOUT_S");
  bus_.reset(g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr));
  static GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(kInterface, nullptr);
  static const GDBusInterfaceVTable kTable = {launch_cb, nullptr, nullptr, {}};
  object_ = g_dbus_connection_register_object(bus_.get(), "/corvane/tavro_lite", node->interfaces[0], &kTable,
                                              this, nullptr, nullptr);
  set_client_present(true);
}

void ServiceWorld::set_client_present(bool is_present) {
  set_name_owned(bus_.get(), "corvane.tavro-lite", is_present);
}

void ServiceWorld::TearDown() {
  service_.kill();
  desk_.kill();
  g_dbus_connection_unregister_object(bus_.get(), object_);
  StoreWorld::TearDown();
}

void ServiceWorld::launch_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                             GVariant *arguments, GDBusMethodInvocation *invocation, gpointer self) {
  const char *operation = nullptr, *key = nullptr, *value = nullptr;
  GVariantIter *pairs = nullptr;
  g_variant_get(arguments, "(&sssa(ss))", &operation, nullptr, nullptr, &pairs);
  std::string kind, voc_id, reply;
  while (g_variant_iter_next(pairs, "(&s&s)", &key, &value)) {
    const std::string name = key, text = value;
    if (name == "TAVRO_SERVER_UPLOAD_STATUS") kind = text.substr(strlen("TAVRO_SERVER_UPLOAD_"));
    if (name == "TAVRO_SERVER_PUSH_NOTI_STATUS") kind = text.substr(strlen("TAVRO_SERVER_PUSH_NOTI_"));
    if (name == "TAVRO_SERVER_PUSH_NOTI_VOC_ID") voc_id = text;
    if (name == "TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS") reply = " " + text;
  }
  g_variant_iter_free(pairs);
  EXPECT_STREQ(operation, "TAVRO_UPDATE_HISTORY");
  static_cast<ServiceWorld *>(self)->messages_.push_back(kind + " " + voc_id + reply);
  g_dbus_method_invocation_return_value(invocation, g_variant_new("(ia(ss))", 0, nullptr));
}

void ServiceWorld::start_desk() {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const std::string port = desk_url_.empty() ? "0" : desk_url_.substr(desk_url_.rfind(':') + 1);
  desk_.start({TAVRO_DESK_PROGRAM, "--data", desk_folder_, "--port", port}, ends[1]);
  close(ends[1]);
  std::unique_ptr<FILE, int (*)(FILE *)> lines(fdopen(ends[0], "r"), fclose);
  char url[256] = "", token[256] = "";
  ASSERT_EQ(fscanf(lines.get(), "desk=%255s desk_token=%255s", url, token), 2);
  desk_url_ = url;
  staff_token_ = token;
}

void ServiceWorld::start_service(const std::string &desk_url) {
  const std::string url = desk_url.empty() ? desk_url_ : desk_url;
  g_setenv("TAVRO_DESK_URL", url.c_str(), TRUE);
  g_setenv("TAVRO_DESK_ENROLMENT", (desk_folder_ + "/enrolment").c_str(), TRUE);
  service_.start({TAVRO_SVC_PROGRAM});
  auto has_name = [this] {
    GVariant *reply = g_dbus_connection_call_sync(
        bus_.get(), "org.freedesktop.DBus", "/", "org.freedesktop.DBus", "NameHasOwner",
        g_variant_new("(s)", "corvane.tavro-svc"), nullptr, G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
    gboolean is_there = FALSE;
    g_variant_get(reply, "(b)", &is_there);
    g_variant_unref(reply);
    return is_there != FALSE;
  };
  ASSERT_TRUE(wait_until(has_name));
}

void ServiceWorld::launch(const std::vector<std::pair<std::string, std::string>> &extra_data) {
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const auto &[key, value] : extra_data)
    g_variant_builder_add(&pairs, "(ss)", key.c_str(), value.c_str());
  g_dbus_connection_call(
      bus_.get(), "corvane.tavro-svc", "/corvane/tavro_svc", "org.tavro.AppControl1", "Launch",
      g_variant_new("(sssa(ss))", "http://tizen.org/appcontrol/operation/default", "", "", &pairs), nullptr,
      G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr, nullptr);
}

void ServiceWorld::launch(const char *operation, int voc_id) {
  launch({{"TAVRO_OPERATION_TYPE", operation}, {"TAVRO_VOC_ID", std::to_string(voc_id)}});
}

int ServiceWorld::store_report(const std::vector<std::string> &paths, const std::string &text) {
  Problem report = problem_report("jana", text.c_str(), paths);
  for (char **path : {&report->dump_file, &report->syslog_file, &report->device_data_filepath})
    TAVRO_FREE(*path);
  report->device_data_filepath = TAVRO_STRDUP(make_file("status.txt", "Battery: 83 %").c_str());
  return tavro_dbmgr_update_bug_report(report.get());
}

nlohmann::json ServiceWorld::staff(const std::string &path, const nlohmann::json &body) {
  GObjectPtr<SoupSession> session(soup_session_new());
  GObjectPtr<SoupMessage> message(
      soup_message_new(body.is_null() ? "GET" : "POST", (desk_url_ + "/api/v1/staff" + path).c_str()));
  soup_message_headers_append(soup_message_get_request_headers(message.get()), "Authorization",
                              ("Bearer " + staff_token_).c_str());
  const std::string line = json_line(body);
  GBytesPtr sent(g_bytes_new(line.data(), line.size()));
  if (!body.is_null())
    soup_message_set_request_body_from_bytes(message.get(), "application/json", sent.get());
  GBytesPtr answer(soup_session_send_and_read(session.get(), message.get(), nullptr, nullptr));
  if (!answer) return nullptr;
  return parse_json(static_cast<const char *>(g_bytes_get_data(answer.get(), nullptr)),
                    g_bytes_get_size(answer.get()));
}

nlohmann::json ServiceWorld::desk_report(int voc_id) {
  return staff("/reports/" + column("VOC_ID_SERVER", voc_id));
}

void ServiceWorld::answer(int voc_id, int status, const std::string &reply) {
  staff("/reports/" + column("VOC_ID_SERVER", voc_id) + "/answers", {{"status", status}, {"reply", reply}});
}

// Through the store's own lock: the service works on the file at the same time.
std::string ServiceWorld::column(const char *name, int voc_id) {
  sqlite3 *db = nullptr;
  if (tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE) != 0) return "NULL";
  const std::string where = "VOC_ID = " + std::to_string(voc_id);
  std::string text = taken(_tavro_dbmgr_get_col_data(db, "TABLE_VOC", name, where.c_str()));
  tavro_dbmgr_db_close(db);
  return text;
}

bool ServiceWorld::wait_for_state(int voc_id, const std::string &state) {
  return wait_until([&] { return column("VOC_STATE", voc_id) == state; });
}

int ServiceWorld::count_messages(const std::string &message) const {
  return static_cast<int>(std::count(messages_.begin(), messages_.end(), message));
}

bool ServiceWorld::wait_for_message(const std::string &message, int count) {
  return wait_until([&] { return count_messages(message) >= count; });
}

std::string ServiceWorld::make_file(const std::string &name, const std::string &content) {
  return write_file("/opt/usr/media/" + name, content);
}
