"""The phone as a whole, with stand-ins for its applications and desk: real processes, bus, display, sandbox."""

import json
import os
import pathlib
import shutil
import signal
import socket
import stat
import subprocess

import pytest
from desktop import Desktop
from phone_driver import BUILD, Phone, wait_until

CLIENT, SERVICE = "corvane.tavro-lite", "corvane.tavro-svc"

CAN_SANDBOX = subprocess.run(["bwrap", "--dev-bind", "/", "/", "--unshare-pid", "--proc", "/proc", "true"],
                             capture_output=True).returncode == 0
needs_sandbox = pytest.mark.skipif(not CAN_SANDBOX, reason="no sandbox can be made here")

DESK = """#!/usr/bin/python3
import http.server, sys
port = int(dict(zip(sys.argv[1::2], sys.argv[2::2]))["--port"])
server = http.server.HTTPServer(("127.0.0.1", port), http.server.BaseHTTPRequestHandler)
print(f"desk=http://127.0.0.1:{port}\\ndesk_token=secret", flush=True)
server.serve_forever()
"""

# Notes each event of its life in /opt/usr/APPID.events; answers launch requests with their own extra data.
APPLICATION = """#!/usr/bin/python3
import json, os, sys
from gi.repository import Gio, GLib
app_id = os.path.basename(sys.argv[0])
def note(*event):
    with open(f"/opt/usr/{app_id}.events", "a") as events:
        events.write(json.dumps(event) + "\\n")
node = Gio.DBusNodeInfo.new_for_xml('''<node><interface name='org.tavro.AppControl1'><method name='Launch'>
  <arg type='s' direction='in'/><arg type='s' direction='in'/><arg type='s' direction='in'/>
  <arg type='a(ss)' direction='in'/><arg type='i' direction='out'/><arg type='a(ss)' direction='out'/>
</method></interface></node>''')
def launched(connection, sender, path, interface, method, arguments, invocation):
    operation, uri, mime, pairs = arguments.unpack()
    note("launch", operation, pairs)
    invocation.return_value(GLib.Variant("(ia(ss))", (0, pairs)))
bus = Gio.bus_get_sync(Gio.BusType.SESSION)
bus.register_object("/" + app_id.replace(".", "/").replace("-", "_"), node.interfaces[0], launched)
loop = GLib.MainLoop()
GLib.unix_signal_add(GLib.PRIORITY_DEFAULT, 15, lambda: (note("terminate"), loop.quit()))
note("create")
Gio.bus_own_name_on_connection(bus, app_id, Gio.BusNameOwnerFlags.NONE)
loop.run()
"""


@pytest.fixture(scope="session")
def program(tmp_path_factory):
    """A tavro-phone whose applications and desk are the stand-ins."""
    root = tmp_path_factory.mktemp("root")
    files = {"bin/tavro-desk": DESK, f"apps/{CLIENT}/bin/{CLIENT}": APPLICATION,
             f"apps/{SERVICE}/bin/{SERVICE}": APPLICATION}
    for name, text in files.items():
        (root / name).parent.mkdir(parents=True, exist_ok=True)
        (root / name).write_text(text)
        (root / name).chmod(0o755)
    shutil.copy(BUILD / "bin" / "tavro-phone", root / "bin")
    return root / "bin" / "tavro-phone"


@pytest.fixture
def phone(program):
    with Phone(program=program) as one:
        yield one


def events(phone, app_id=CLIENT):
    path = phone.storage() / f"{app_id}.events"
    return [json.loads(line) for line in path.read_text().splitlines()] if path.exists() else []


def wait_for_event(phone, kind, app_id=CLIENT):
    return wait_until(lambda: next((e for e in events(phone, app_id) if e[0] == kind), None), what=kind)


def processes_of(phone):
    """Ids of all processes on this machine that belong to the phone."""
    found = []
    for path in pathlib.Path("/proc").glob("[0-9]*"):
        try:
            if f"TAVRO_PHONE_DIR={phone.directory}\0" in (path / "environ").read_text(errors="replace") or \
                    str(phone.directory) in (path / "cmdline").read_text(errors="replace").split("\0"):
                found.append(int(path.name))
        except OSError:
            pass
    return found


def test_a_start_brings_up_every_part_and_a_stop_ends_them_in_order(phone):
    phone.start()
    assert list(phone.state) == ["dir", "bus", "display", "desk", "desk_token", "mode", "ready"]
    assert phone.state["desk_token"] == "secret"
    assert wait_for_event(phone, "launch") == ["launch", "", []]
    wait_for_event(phone, "create", SERVICE)
    assert {"the desk", "the message bus", "the display server", CLIENT, SERVICE} <= set(phone.status())
    for path in (phone.directory, *phone.directory.rglob("*")):
        assert path.is_socket() or stat.S_IMODE(path.lstat().st_mode) & 0o077 == 0, path
    phone.stop()
    assert events(phone)[-1] == ["terminate"] and events(phone, SERVICE)[-1] == ["terminate"]
    assert processes_of(phone) == []
    assert phone.command("status", check=False).returncode == 1


def test_a_second_start_says_that_the_phone_runs_and_prints_its_values(phone):
    phone.start()
    second = phone.command("start", "--headless", "--detach")
    assert dict(line.split("=", 1) for line in second.stdout.splitlines()) == phone.state
    assert "already runs" in second.stderr


def is_gone(pid):
    """Whether the process has ended; a dead one that nobody has waited for yet counts."""
    try:
        return pathlib.Path(f"/proc/{pid}/stat").read_text().rsplit(")", 1)[1].split()[0] in "ZX"
    except FileNotFoundError:
        return True


@needs_sandbox
@pytest.mark.parametrize("is_in_place", [False, True])
@pytest.mark.parametrize("end", ["stop", "kill"])
def test_a_start_while_the_phone_ends_waits_and_starts_anew(phone, tmp_path, end, is_in_place):
    def run(*words):
        line = [phone.program, words[0], "--dir", phone.directory, *words[1:]]
        return subprocess.Popen(in_place(line, ["--bind", str(tmp_path), "/opt/usr"]) if is_in_place else line,
                                stdout=subprocess.PIPE, text=True)
    start = ["start", "--headless", "--detach"]
    run(*start).communicate(timeout=30)
    state_file = phone.directory / "run" / "state"
    first = dict(line.split("=", 1) for line in state_file.read_text().splitlines())
    if end == "stop":
        ending = run("stop")
        wait_until(lambda: "ready=" not in state_file.read_text(), what="the beginning of the end")
    else:
        os.kill(int(first["pid"]), signal.SIGKILL)
        wait_until(lambda: is_gone(first["pid"]), what="the end of the killed process")
    text, _ = run(*start).communicate(timeout=30)
    if end == "stop":
        assert ending.wait(5) == 0
    second = dict(line.split("=", 1) for line in state_file.read_text().splitlines())
    assert "ready=1" in text and second["pid"] != first["pid"]
    assert "the message bus: runs" in run("status").communicate()[0]
    assert run("stop").wait(20) == 0 and processes_of(phone) == []


def test_the_desk_keeps_its_address_across_starts_unless_it_is_taken(phone):
    first = phone.start().state["desk"]
    phone.stop()
    assert phone.start().state["desk"] == first
    phone.stop()
    with socket.create_server(("127.0.0.1", int(first.rsplit(":", 1)[1]))):
        assert phone.start().state["desk"] != first


@pytest.mark.parametrize("part", ["outer half", "inner half", "the message bus", "the display server"])
def test_a_phone_that_lost_a_vital_part_is_gone_and_can_be_started_again(phone, part):
    phone.start()
    if part == "outer half":
        state = (phone.directory / "run" / "state").read_text()
        os.kill(int(state.split("\npid=")[1].split()[0]), signal.SIGKILL)
    else:
        pid = "$PPID" if part == "inner half" else phone.status()[part]
        phone.execute("sh", "-c", f"kill -9 {pid}", check=False)
    wait_until(lambda: not processes_of(phone), what="end of all processes")
    phone.start()
    assert CLIENT in phone.status()


@pytest.mark.parametrize("part", ["the desk", "the window manager", "the notification daemon", "the desktop link",
                                  SERVICE])
def test_a_helper_that_is_killed_is_started_again(phone, part):
    phone.start()
    wait_for_event(phone, "create", SERVICE)
    before = phone.status()[part]
    phone.execute("kill", "-9", str(before))
    wait_until(lambda: phone.status().get(part, before) != before, what=f"{part} running again")


def test_a_client_that_is_killed_stays_away_until_it_is_launched(phone):
    phone.start()
    phone.execute("kill", "-9", str(phone.status()[CLIENT]))
    wait_until(lambda: CLIENT not in phone.status())
    phone.launch(operation="again")
    assert wait_until(lambda: events(phone)[-1][0] == "launch") and CLIENT in phone.status()


def test_launch_requests_start_the_application_and_arrive_in_order(phone):
    phone.start("--no-client")
    for number in range(20):
        phone.launch(operation="TAVRO_TEST", number=str(number), text="a=b Ä")
    wait_until(lambda: len(events(phone)) == 21)
    expected = [["launch", "TAVRO_TEST", [["number", str(n)], ["text", "a=b Ä"]]] for n in range(20)]
    assert events(phone)[1:] == expected
    assert phone.launch(reply=True, key="value") == "result=0\nkey=value\n"


def test_wrong_uses_and_failures_are_told_apart_by_exit_status(phone):
    assert phone.command("launch", CLIENT, check=False).returncode == 1  # nothing runs
    assert phone.command("exec", "--", "true", check=False).returncode == 1
    phone.start("--no-client")
    cases = [(["launch", "no.such.app"], 1), (["launch", "no app"], 2), (["launch", CLIENT, "word"], 2),
             (["launch", CLIENT, b"k=\xff"], 2), (["launch"], 2), (["exec"], 2), (["screenshot"], 2),
             (["screenshot", "/no/such/folder/file.png"], 1), (["preference", "get"], 2),
             (["start", "--size", "1x1"], 2), (["start", "--desk", "ftp://x"], 2), (["stop", "--what"], 2),
             (["log", "word"], 2), (["status", "--dir", ""], 2), (["nonsense"], 2), (["start", "--help"], 0), (["--help"], 0)]
    for words, status in cases:
        line = [phone.program, words[0], "--dir", str(phone.directory), *words[1:]]
        result = subprocess.run(line if words[0] != "--help" else line[:2], capture_output=True)
        assert result.returncode == status, words
        assert status == 0 or len(result.stderr.splitlines()) == 1, words


def test_a_command_inside_the_phone_has_its_files_its_status_and_its_signals(phone, tmp_path):
    phone.start("--no-client")
    assert phone.execute("sh", "-c", "echo out; echo err >&2; exit 7", check=False).returncode == 7
    assert phone.execute("sh", "-c", "touch /opt/usr/here; echo $DISPLAY").stdout.strip() == phone.state["display"]
    assert (phone.storage() / "here").exists()
    assert phone.execute("no-such-command", check=False).returncode == 1
    mark = tmp_path / "mark"
    script = f"trap 'echo ended > {mark}; exit 3' TERM; touch {mark}; while :; do sleep 0.1; done"
    running = subprocess.Popen([phone.program, "exec", "--dir", phone.directory, "--", "sh", "-c", script])
    wait_until(mark.exists)
    running.terminate()
    assert running.wait(10) == 3 and mark.read_text() == "ended\n"


@needs_sandbox
def test_two_phones_run_side_by_side_without_seeing_each_other(phone, program):
    with Phone(program=program) as other:
        phone.start("--no-client")
        other.start("--no-client")
        for key in ("bus", "display", "desk"):
            assert phone.state[key] != other.state[key]
        phone.execute("ipcmk", "-S", "1")
        assert "0x" not in other.execute("ipcs", "-s").stdout
        phone.stop()
        assert "the desk" in other.status()


def test_preferences_are_the_same_whether_the_phone_runs_or_not(phone):
    phone.start("--no-client")
    values = [("text", "string", "O'Neil \"x\"\nä"), ("count", "int", "-7"), ("share", "double", "0.5"),
              ("is_on", "boolean", "true")]
    for key, kind, value in values:
        phone.preference("set", key, kind, value)
    for is_running in (True, False):
        assert [phone.preference("get", key) for key, _, _ in values] == [value for _, _, value in values]
        assert "count int -7" in phone.preference("list").splitlines()
        phone.stop()
    phone.preference("unset", "count")
    assert phone.command("preference", "get", "count", check=False).returncode == 1
    for words in (["set", "n", "int", "7x"], ["set", "n", "int", "99999999999"], ["set", "n", "float", "1"]):
        assert phone.command("preference", *words, check=False).returncode == 2


def test_a_picture_shows_the_whole_virtual_display(phone, tmp_path):
    phone.start("--no-client", "--size", "480x800")
    picture = phone.screenshot(tmp_path / "screen.png").read_bytes()
    assert picture[:8] == b"\x89PNG\r\n\x1a\n"
    assert (int.from_bytes(picture[16:20], "big"), int.from_bytes(picture[20:24], "big")) == (480, 800)
    assert phone.execute("sh", "-c", "echo $ELM_SCALE").stdout == "1.333\n"


def test_the_followed_log_goes_on_when_the_file_is_begun_anew(phone, tmp_path):
    phone.start("--no-client")
    log = phone.storage() / "share" / "log" / "platform.log"
    log.write_text("first\n")
    assert phone.log() == "first\n"
    with open(tmp_path / "seen", "w+") as seen:
        follower = subprocess.Popen([phone.program, "log", "--follow", "--dir", phone.directory], stdout=seen)
        wait_until(lambda: "first" in (tmp_path / "seen").read_text())
        log.rename(str(log) + ".1")
        log.write_text("second\n")
        wait_until(lambda: "second" in (tmp_path / "seen").read_text())
        follower.terminate()
        follower.wait()
    assert (tmp_path / "seen").read_text() == "first\nsecond\n"


def test_ctrl_c_ends_a_phone_in_the_foreground_in_order(phone):
    running = subprocess.Popen([phone.program, "start", "--headless", "--dir", phone.directory],
                               stdout=subprocess.PIPE, text=True)
    wait_until(lambda: running.stdout.readline() == "ready=1\n", what="ready")
    wait_for_event(phone, "launch")
    running.send_signal(signal.SIGINT)
    assert running.wait(10) == 0 and events(phone)[-1] == ["terminate"] and processes_of(phone) == []


@pytest.mark.parametrize("options", [[], ["--detach"]])
def test_a_phone_that_cannot_start_says_why(phone, program, tmp_path, options):
    (tmp_path / "bin").mkdir()
    phone.program = shutil.copy(program, tmp_path / "bin")  # with no desk beside it
    result = phone.command("start", "--headless", *options, check=False)
    assert result.returncode == 1 and "the desk cannot be started" in result.stderr
    wait_until(lambda: not processes_of(phone), what="end of all processes")


def in_place(command, storage):
    """`command` on a machine where no sandbox can be made and whose /opt/usr is `storage`."""
    return ["bwrap", "--dev-bind", "/", "/", "--tmpfs", "/opt", *storage, "--setenv", "TAVRO_PHONE_NO_SANDBOX",
            "1", "--", *map(str, command)]


@needs_sandbox
def test_without_a_sandbox_the_phone_runs_in_place_and_recovers_from_a_kill(phone, tmp_path):
    storage = ["--bind", str(tmp_path), "/opt/usr"]
    start = [phone.program, "start", "--headless", "--detach", "--dir", phone.directory]
    first = subprocess.run(in_place(start, storage), capture_output=True, text=True)
    assert first.returncode == 0 and "mode=direct" in first.stdout and "/opt/usr" in first.stderr, first.stderr
    wait_until((tmp_path / f"{CLIENT}.events").exists)
    for pid in processes_of(phone):
        name = pathlib.Path(f"/proc/{pid}/comm").read_text()
        if name == "tavro-phone\n":
            os.kill(pid, signal.SIGKILL)
    second = subprocess.run(in_place(start, storage), capture_output=True, text=True)
    assert second.returncode == 0 and "ready=1" in second.stdout, second.stderr
    stop = [phone.program, "stop", "--dir", phone.directory]
    assert subprocess.run(in_place(stop, storage)).returncode == 0
    assert processes_of(phone) == []
    assert json.loads((tmp_path / f"{CLIENT}.events").read_text().splitlines()[-1]) == ["terminate"]


@needs_sandbox
def test_a_machine_that_allows_neither_sandbox_nor_storage_gets_one_clear_line(phone):
    start = [phone.program, "start", "--headless", "--dir", phone.directory]
    result = subprocess.run(in_place(start, ["--remount-ro", "/opt"]), capture_output=True, text=True)
    assert result.returncode == 1 and len(result.stderr.splitlines()) == 1, result.stderr
    assert "bubblewrap" in result.stderr and "/opt/usr" in result.stderr


@pytest.fixture
def desktop(tmp_path):
    with Desktop(tmp_path) as desktop:
        yield desktop


ADDRESS = ["gdbus", "call", "--session", "--dest", "org.a11y.Bus", "--object-path", "/org/a11y/bus", "--method",
           "org.a11y.Bus.GetAddress"]
READER_IS_ON = [*ADDRESS[:-1], "org.freedesktop.DBus.Properties.Get", "org.a11y.Status", "ScreenReaderEnabled"]
SWITCH_READER_ON = [*ADDRESS[:-1], "org.freedesktop.DBus.Properties.Set", "org.a11y.Status",
                    "ScreenReaderEnabled", "<true>"]


def test_on_a_desktop_the_phone_uses_its_display_its_bus_and_its_screen_reader(phone, desktop):
    phone.environment.update(desktop.environment)
    text = phone.command("start", "--detach").stdout
    assert f"display={desktop.environment['DISPLAY']}\n" in text
    assert not {"the display server", "the window manager"} & set(phone.status())
    shown = phone.execute("sh", "-c", "echo $TAVRO_HOST_SESSION_BUS").stdout.strip()
    assert shown == desktop.environment["DBUS_SESSION_BUS_ADDRESS"]
    host = {**os.environ, **desktop.environment}
    host_address = subprocess.run(ADDRESS, env=host, capture_output=True, text=True).stdout
    assert "unix:" in host_address and phone.execute(*ADDRESS).stdout == host_address
    assert "false" in phone.execute(*READER_IS_ON).stdout
    subprocess.run(SWITCH_READER_ON, env=host, check=True, stdout=subprocess.DEVNULL)
    wait_until(lambda: "true" in phone.execute(*READER_IS_ON).stdout)


def test_on_a_display_without_a_window_manager_the_phone_draws_on_its_own(phone, desktop):
    phone.environment.update(desktop.environment)
    desktop.window_manager.kill()
    desktop.window_manager.wait()
    started = phone.command("start", "--detach", "--no-client")
    assert "has no window manager" in started.stderr and f"display={desktop.environment['DISPLAY']}\n" not in started.stdout
    assert "the window manager" in phone.status()


def test_a_headless_phone_leaves_the_desktop_of_its_user_alone(phone, desktop):
    phone.environment.update(desktop.environment)
    phone.start("--no-client")
    assert phone.state["display"] != desktop.environment["DISPLAY"] and "the window manager" in phone.status()
    assert phone.execute("sh", "-c", "echo $TAVRO_HOST_SESSION_BUS").stdout == "\n"
