#include "supervisor.h"

#include <fcntl.h>
#include <glib-unix.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <cstdio>

#include "desk.h"
#include "message_bus.h"
#include "options.h"

namespace phone {

namespace {

constexpr int kStartPatienceMilliseconds = 20000;
constexpr int kApplicationPatienceMilliseconds = 3000;
constexpr int kProgramPatienceMilliseconds = 1000;

}  // namespace

ExitStatus Supervisor::run() {
  g_unix_fd_add(kLifeLine, static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), life_line_cb, this);
  for (const int number : {SIGINT, SIGTERM, SIGHUP}) g_unix_signal_add(number, signal_cb, this);
  state_ = read_state(options_.folder);
  if (start_all()) {
    announce_ready();
    while (!is_ending_) g_main_context_iteration(nullptr, TRUE);
  } else if (!is_ending_) {
    end(kFailed);
  }
  shut_down();
  return status_;
}

gboolean Supervisor::life_line_cb(gint, GIOCondition, gpointer self) {
  static_cast<Supervisor *>(self)->end(kDone);
  return G_SOURCE_REMOVE;
}

gboolean Supervisor::signal_cb(gpointer self) {
  static_cast<Supervisor *>(self)->end(kDone);
  return G_SOURCE_CONTINUE;
}

void Supervisor::end(ExitStatus status) {
  if (is_ending_) return;
  is_ending_ = true;
  status_ = status;
  if (state_.erase("ready")) withdraw_ready(options_.folder);
  g_main_context_wakeup(nullptr);
}

bool Supervisor::start_all() {
  socket_folder_ = make_socket_folder(options_.folder);
  if (socket_folder_.empty() || !take_storage()) return false;
  choose_display();
  environment_ = phone_environment(options_.folder, socket_folder_, !has_virtual_display_);
  // The desk and the display come up side by side; the bus needs the display's name for what it starts.
  if (!open_control() || !start_desk() || !start_display() || !start_bus() || !start_helpers()) return false;
  if (!wait_for_desk()) return false;
  start_applications();
  return !is_ending_;
}

// In direct mode two phones would share one /opt/usr.
bool Supervisor::take_storage() {
  const std::string usr = options_.mode == Mode::kDirect ? kStorageRoot : options_.folder.usr();
  publish("usr", usr);
  if (!create_storage(usr)) return false;
  if (options_.mode == Mode::kSandbox) return true;
  const std::string path = usr + "/.tavro-phone.lock";
  storage_lock_ = TavroFd(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  if (storage_lock_ && flock(storage_lock_.get(), LOCK_EX | LOCK_NB) == 0) return true;
  say(usr + " is in use by another phone; end that one first");
  return false;
}

bool Supervisor::open_control() {
  const std::string path = socket_folder_ + "/control";
  ControlActions actions = {[this] { end(kDone); }, [this] { return status_lines(); }};
  control_ = ControlServer::create(path, std::move(actions), environment_);
  if (!control_) return false;
  publish("control", path);
  return write_state(options_.folder, state_);
}

void Supervisor::choose_display() {
  const Environment current = Environment::current();
  const HostDisplay host = options_.is_headless ? HostDisplay::kNone : probe_display(current);
  has_virtual_display_ = host != HostDisplay::kUsable;
  publish("virtual_display", has_virtual_display_ ? "1" : "0");
  if (!has_virtual_display_) publish("display", current.get("DISPLAY"));
  if (host == HostDisplay::kUnmanaged) {
    say("the display " + current.get("DISPLAY") + " has no window manager; the phone draws on a virtual one");
  } else if (has_virtual_display_ && !options_.is_headless) {
    say("no display here; the phone draws on a virtual one");
  }
}

bool Supervisor::start_display() {
  if (!has_virtual_display_) return true;
  if (!write_display_files(options_.folder, options_.size)) return false;
  Program *display =
      add_program({"the display server", display_command(options_.folder, options_.size), environment_,
                   [this](const std::string &line) { display_number_ = line; }, fatal("the display server")});
  const bool is_up = display && wait_for("the display server", [&] { return !display_number_.empty(); });
  if (!is_up) return false;
  use_virtual_display(&environment_, options_.folder, options_.size, display_number_);
  publish("display", ":" + display_number_);
  return true;
}

bool Supervisor::start_desk() {
  if (!options_.desk_url.empty()) {
    environment_.set("TAVRO_DESK_URL", options_.desk_url);
    publish("desk", options_.desk_url);
    return true;
  }
  const auto port = choose_desk_port(options_.folder);
  if (!port) return false;
  environment_.set("TAVRO_DESK_URL", desk_url(*port));
  environment_.set("TAVRO_DESK_ENROLMENT", options_.folder.desk() + "/enrolment");
  return add_program({"the desk", desk_command(options_.folder, *port), environment_,
                      [this](const std::string &line) { note_desk_line(line); }, nullptr});
}

void Supervisor::note_desk_line(const std::string &line) {
  for (const char *key : {"desk", "desk_token"}) {
    const std::string prefix = std::string(key) + "=";
    if (line.compare(0, prefix.size(), prefix) == 0) publish(key, line.substr(prefix.size()));
  }
}

bool Supervisor::wait_for_desk() {
  if (!options_.desk_url.empty()) return true;
  return wait_for("the desk", [this] { return state_.count("desk") && state_.count("desk_token"); });
}

bool Supervisor::start_bus() {
  forwarder_ = AccessibilityForwarder::create(environment_.get("TAVRO_HOST_SESSION_BUS"));
  if (options_.is_accessible || (forwarder_ && forwarder_->is_screen_reader_on()))
    environment_.set("ELM_ATSPI_MODE", "1");
  BusFiles files;
  if (!write_bus_files(options_.folder, socket_folder_, !forwarder_, &files)) return false;
  Program *daemon =
      add_program({"the message bus", bus_command(files), environment_,
                   [this](const std::string &line) { note_bus_line(line); }, fatal("the message bus")});
  if (!daemon || !wait_for("the message bus", [&] { return !bus_address_.empty(); })) return false;
  const std::string known_address = environment_.get("DBUS_SESSION_BUS_ADDRESS");
  std::string reason;
  bus_ = connect_to_bus(known_address, &reason);
  if (!bus_) say("the message bus does not answer: " + reason);
  publish("bus", known_address);
  return bus_ != nullptr;
}

// The first line is the address. All others come from programs that the bus started, which share its output.
void Supervisor::note_bus_line(const std::string &line) {
  if (bus_address_.empty()) {
    bus_address_ = line;
  } else {
    std::printf("%s\n", line.c_str());
    std::fflush(stdout);
  }
}

bool Supervisor::start_helpers() {
  const Folder &folder = options_.folder;
  if (has_virtual_display_) {
    if (!add_program({"the window manager", window_manager_command(folder), environment_, nullptr, nullptr}))
      return false;
    // A desktop shows notifications itself. Without this one a phone works, but says less.
    add_program({"the notification daemon", notification_command(folder), environment_, nullptr, nullptr});
  }
  // Before the applications, which may post at once.
  if (!add_program({"the desktop link", {own_program(), "desktop-link"}, environment_, nullptr, nullptr}))
    return false;
  open_accessibility();
  return true;
}

void Supervisor::open_accessibility() {
  std::string reason;
  bool is_open = true;
  if (forwarder_) {
    is_open = forwarder_->serve(bus_.get(), &reason);
  } else if (options_.is_accessible) {
    is_open = switch_on_accessibility(bus_.get(), &reason);
  }
  if (!is_open) say("screen readers cannot read the phone: " + reason);
}

void Supervisor::start_applications() {
  const std::pair<const char *, const char *> services[] = {{kServiceId, "the upload service"},
                                                            {kCrashServiceId, "the crash service"}};
  for (const auto &[app_id, name] : services) {
    if (is_installed(app_id)) {
      service_keepers_.push_back(std::make_unique<ServiceKeeper>(bus_.get(), app_id, name));
    } else {
      say(std::string("there is no program of ") + name + " at " + application_program(app_id));
    }
  }
  if (!options_.has_client) return;
  std::string reason;
  if (!send_launch_request(bus_.get(), {kClientId, "", "", "", {}}, &reason))
    say("the client cannot be started: " + reason);
}

void Supervisor::announce_ready() {
  publish("ready", "1");
  write_state(options_.folder, state_);
  const char mark = 'r';
  if (write(kLifeLine, &mark, 1) != 1) end(kFailed);
  if (!options_.is_detached) return;
  say_on(STDERR_FILENO);
  close(kTerminal);
}

// Applications first, while all they need is there; then everything else, last started first.
void Supervisor::shut_down() {
  service_keepers_.clear();
  if (bus_) {
    for (const char *app_id : {kClientId, kRecorderId, kServiceId, kCrashServiceId}) {
      end_application(bus_.get(), app_id, kApplicationPatienceMilliseconds);
    }
  }
  control_.reset();
  forwarder_.reset();
  bus_.reset();
  while (!programs_.empty()) {
    programs_.back()->stop(kProgramPatienceMilliseconds);
    programs_.pop_back();
  }
  if (!socket_folder_.empty()) remove_tree(socket_folder_);
}

Program *Supervisor::add_program(Program::Recipe recipe) {
  auto program = std::make_unique<Program>(std::move(recipe));
  if (!program->start()) return nullptr;
  programs_.push_back(std::move(program));
  return programs_.back().get();
}

std::function<void()> Supervisor::fatal(const std::string &what) {
  return [this, what] {
    if (is_ending_) return;
    say("the phone ends: it cannot do without " + what);
    end(kFailed);
  };
}

bool Supervisor::wait_for(const std::string &what, const std::function<bool()> &is_there) {
  bool is_late = false;
  const guint timer = g_timeout_add(
      kStartPatienceMilliseconds,
      [](gpointer late) -> gboolean {
        *static_cast<bool *>(late) = true;
        return G_SOURCE_CONTINUE;
      },
      &is_late);
  while (!is_there() && !is_late && !is_ending_) g_main_context_iteration(nullptr, TRUE);
  g_source_remove(timer);
  if (is_late) say(what + " is not ready in time");
  return is_there() && !is_ending_;
}

std::string Supervisor::status_lines() const {
  std::string text;
  for (const auto &program : programs_) {
    const std::string state =
        program->is_running() ? "runs, pid " + std::to_string(program->pid()) : "starts again";
    text += program->name() + ": " + state + "\n";
  }
  for (const char *app_id : {kServiceId, kClientId, kCrashServiceId, kRecorderId}) {
    const int pid = bus_ ? application_pid(bus_.get(), app_id) : 0;
    text += std::string(app_id) + ": " + (pid ? "runs, pid " + std::to_string(pid) : "does not run") + "\n";
  }
  return text;
}

void Supervisor::publish(const std::string &key, const std::string &value) {
  const bool is_changed = state_[key] != value;
  state_[key] = value;
  // Before that the file is written when all of it is known.
  if (is_changed && state_.count("ready")) write_state(options_.folder, state_);
}

}  // namespace phone
