"""The screen recorder, asked over the phone's bus as the client asks it: real windows, real files."""

import os
import subprocess
import threading
import time

import pytest
from gi.repository import Gio, GLib

from captured import BLUE, ORANGE, Pixels, coloured_window, frames, is_near, length
from phone_driver import BUILD, Phone, wait_until

RECORDER = "corvane.tavro-screen-recorder"
FOLDER = "/opt/usr/media/VantorCommunity"
VIDEO = {"impl_method": "xserver", "video_quality": "MID", "video_fps": "10", "video_width": "480",
         "video_height": "640"}


def connect(address):
    flags = Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT | Gio.DBusConnectionFlags.MESSAGE_BUS_CONNECTION
    return Gio.DBusConnection.new_for_address_sync(address, flags, None, None)


class Client:
    def __init__(self, phone):
        self.bus = connect(phone.state["bus"])

    def ask(self, **keys):
        """(result, handle or None)"""
        reply = self.bus.call_sync(RECORDER, "/corvane/tavro_screen_recorder", "org.tavro.AppControl1", "Launch",
                                   GLib.Variant("(sssa(ss))", ("", "", "", list(keys.items()))),
                                   GLib.VariantType("(ia(ss))"), Gio.DBusCallFlags.NONE, 30000, None).unpack()
        return reply[0], dict(reply[1]).get("handle")

    def act(self, action, handle, **keys):
        return self.ask(action_type=action, handle=handle, **keys)

    def open(self, name, **keys):
        result, handle = self.ask(action_type="Video_Init", outfilename=f"{FOLDER}/{name}", **{**VIDEO, **keys})
        assert result == 0 and int(handle) > 0
        return handle

    def record(self, name, **keys):
        handle = self.open(name, **keys)
        assert self.act("Video_Start", handle, impl_method="xserver") == (0, handle)
        return handle


@pytest.fixture(scope="module")
def phone():
    with Phone() as started:
        started.start("--no-client")
        with coloured_window(started):
            yield started


@pytest.fixture
def client(phone):
    return Client(phone)


@pytest.fixture
def media(phone):
    return phone.storage() / "media/VantorCommunity"


def pid(phone):
    return str(phone.status()[RECORDER])


def boxes(path):
    data, names, offset = path.read_bytes(), [], 0
    while offset + 8 <= len(data):
        names.append(data[offset + 4:offset + 8].decode("latin1"))
        offset += max(int.from_bytes(data[offset:offset + 4], "big"), 8)
    return names


def test_a_screenshot_is_what_the_screen_shows_and_takes_nobodys_place(phone, client, media):
    request = {"impl_method": "xserver", "action_type": "Screenshot", "outfilename": f"{FOLDER}/shot.jpg"}
    assert client.ask(orientation="0", **request) == (0, None)
    shot = media / "shot.jpg"
    taken, shown = Pixels(shot), Pixels(phone.screenshot(phone.directory / "shown.png"))
    assert (taken.kind, taken.size) == ("JPEG", (720, 1280)) and is_near(taken.at(600, 200), BLUE)
    assert all(is_near(taken.at(x, y), shown.at(x, y)) for x in range(20, 720, 40) for y in range(20, 1280, 40))
    assert [path.stat().st_mode & 0o777 for path in (media, shot)] == [0o700, 0o600]
    before = shot.read_bytes()
    assert client.ask(orientation="0", **request) == (-1, None)
    assert shot.read_bytes() == before
    # The picture of a phone that lies on its side stands upright: turned clockwise by as much.
    for degrees, size, place in (("90", (1280, 720), (1000, 300)), ("180", (720, 1280), (300, 1000)),
                                 ("270", (1280, 720), (300, 300))):
        assert client.ask(orientation=degrees, **{**request, "outfilename": f"{FOLDER}/{degrees}.jpg"}) == (0, None)
        turned = Pixels(media / f"{degrees}.jpg")
        assert turned.size == size and is_near(turned.at(*place), BLUE), degrees
    assert not [path for path in media.iterdir() if path.name.endswith(".part")]


def test_a_recording_lasts_as_long_as_it_ran_without_its_pause(client, media):
    handle = client.record("pause.mp4")
    began = time.monotonic()
    time.sleep(1.5)
    assert client.act("Video_Pause", handle) == (0, handle)
    ran = time.monotonic() - began
    time.sleep(2)
    assert client.act("Video_Resume", handle) == (0, handle)
    began = time.monotonic()
    time.sleep(1.5)
    assert client.act("Video_Stop", handle) == (0, None)
    ran += time.monotonic() - began
    video = media / "pause.mp4"
    assert abs(length(video) - ran) < 0.5
    found = frames(video)
    assert max(b[0] - a[0] for a, b in zip(found, found[1:])) < 0.11  # no hole where the pause was
    assert sum(is_key for _, _, is_key in found) >= int(ran)
    assert "moov" in boxes(video) and "moof" not in boxes(video) and video.stat().st_mode & 0o777 == 0o600
    assert client.act("Video_Stop", handle) == (-1, None)  # a session ends once
    assert client.ask(action_type="Video_Init", outfilename=f"{FOLDER}/pause.mp4", **VIDEO) == (-1, None)
    assert abs(length(video) - ran) < 0.5


def test_a_video_has_a_picture_that_nobody_sees_in_the_folder_and_that_goes_with_it(client, media):
    handle = client.record("shown.mp4")
    time.sleep(0.5)
    picture = media / ".shown.mp4.jpg"
    assert not picture.exists()
    assert client.act("Video_Stop", handle) == (0, None)
    shown = Pixels(picture)
    assert (shown.kind, shown.size, picture.stat().st_mode & 0o777) == ("JPEG", (480, 640), 0o600)
    for place, colour in (((240, 100), BLUE), ((240, 500), ORANGE), ((10, 100), (0, 0, 0))):
        assert is_near(shown.at(*place), colour, 12), place
    (media / "shown.mp4").unlink()
    client.act("Video_Shutdown", client.open("next.mp4"))
    assert not picture.exists() and (media / ".pause.mp4.jpg").exists()


def test_a_client_without_a_session_starts_and_may_stop_in_a_pause(client, media):
    result, handle = client.ask(action_type="Video_Start", handle="0", outfilename=f"{FOLDER}/old.mp4", **VIDEO)
    assert result == 0 and handle
    began = time.monotonic()
    time.sleep(1)
    client.act("Video_Pause", handle)
    ran = time.monotonic() - began
    time.sleep(1)
    assert client.act("Video_Stop", handle) == (0, None)
    assert abs(length(media / "old.mp4") - ran) < 0.3


def test_sessions_give_way_until_one_records_and_leave_no_empty_files(client, media):
    first, second = client.open("first.mp4"), client.open("second.mp4")
    assert not (media / "first.mp4").exists() and (media / "second.mp4").stat().st_size == 0
    assert client.act("Video_Start", first) == (-1, None)
    assert client.act("Video_Start", second) == (0, second)
    assert client.ask(action_type="Video_Init", outfilename=f"{FOLDER}/third.mp4", **VIDEO) == (-1, None)
    time.sleep(0.5)
    assert client.act("Video_Shutdown", second) == (0, None)  # a recording is kept
    assert length(media / "second.mp4") > 0
    assert client.act("Video_Shutdown", client.open("third.mp4")) == (0, None)
    wait_until(lambda: not (media / "third.mp4").exists(), what="the empty file's end")


def test_requests_that_make_no_sense_fail_and_leave_the_session_alone(phone, client, media):
    (media / "out").symlink_to("/tmp")
    (media / "taken.jpg").symlink_to("/tmp/nowhere.jpg")
    handle = client.record("sound.mp4")
    time.sleep(0.5)
    shots = [f"{FOLDER}/../../apps/a.jpg", "/opt/usr/apps/a.jpg", "/tmp/a.jpg", f"{FOLDER}/out/a.jpg", "a.jpg", "",
             f"{FOLDER}/taken.jpg", f"{FOLDER}/.a.jpg", f"{FOLDER}/a.sh", f"{FOLDER}/.jpg", "/opt/usr/mediaa/a.jpg"]
    for path in shots:
        assert client.ask(action_type="Screenshot", orientation="0", outfilename=path) == (-1, None), path
    for action, wrong in (("Video_Pause", ""), ("Video_Stop", "seventeen"), ("Video_Resume", handle + "x"),
                          ("Video_Shutdown", "-1"), ("Video_Stop", "99999999999999999999"), ("Video_Start", handle),
                          ("Video_Explode", handle), ("", handle)):
        assert client.act(action, wrong) == (-1, None), action
    assert client.act("Video_Stop", handle) == (0, None) and length(media / "sound.mp4") > 0
    for wrong in ({"video_fps": "0"}, {"video_width": "480px"}, {"video_height": "100000"}, {"outfilename": "/tmp/a.mp4"}):
        assert client.ask(**{"action_type": "Video_Init", "outfilename": f"{FOLDER}/bad.mp4", **VIDEO, **wrong})[0] == -1
    assert not (media / "bad.mp4").exists() and not os.path.exists("/tmp/nowhere.jpg")


def test_a_killed_recorder_leaves_all_but_the_last_two_seconds(phone, client, media):
    client.record("killed.mp4")
    began = time.monotonic()
    time.sleep(3.5)
    phone.end(RECORDER)
    assert length(media / "killed.mp4") > time.monotonic() - began - 2.5


def test_an_ended_recorder_and_one_whose_client_left_finish_the_file(phone, client, media):
    client.record("ended.mp4")
    time.sleep(0.7)
    phone.end(RECORDER, "TERM")
    leaving = Client(phone)
    leaving.record("left.mp4")
    time.sleep(0.7)
    leaving.bus.close_sync(None)
    wait_until(lambda: "moof" not in boxes(media / "left.mp4") and length(media / "left.mp4") > 0.5, what="the whole file")
    assert "moof" not in boxes(media / "ended.mp4") and length(media / "ended.mp4") > 0.5


def test_a_full_disk_ends_the_recording_with_an_error_and_a_file_that_plays(phone, client, media):
    handle = client.record("full.mp4", video_quality="HIGH")
    time.sleep(2.5)
    size = (media / "full.mp4").stat().st_size
    assert size > 0
    phone.execute("prlimit", "--pid", pid(phone), f"--fsize={size + 10}")
    wait_until(lambda: "the recording fails" in phone.log(), what="the fault")
    assert client.act("Video_Pause", handle) == (-1, None)
    assert length(media / "full.mp4") > 0.9
    phone.execute("prlimit", "--pid", pid(phone), "--fsize=10")
    handle = client.record("useless.mp4")
    time.sleep(0.5)
    assert client.act("Video_Stop", handle) == (-1, None)
    assert client.ask(action_type="Screenshot", orientation="0", outfilename=f"{FOLDER}/full.jpg") == (-1, None)
    assert [path.name for path in media.iterdir() if path.name.lstrip(".").startswith(("useless", "full.j", "full.mp4."))] == []
    phone.end(RECORDER, "TERM")


PORTAL = """<node><interface name='org.freedesktop.portal.Screenshot'><method name='Screenshot'>
<arg type='s' direction='in'/><arg type='a{sv}' direction='in'/><arg type='o' direction='out'/></method></interface></node>"""


def serve_portal(address, picture):
    """A portal that answers as the desktop's does; its picture is made for the asker alone."""
    bus = connect(address)

    def called_cb(_bus, sender, _path, _interface, _method, arguments, invocation):
        name = sender[1:].replace(".", "_")
        path = f"/org/freedesktop/portal/desktop/request/{name}/{arguments.unpack()[1]['handle_token']}"
        invocation.return_value(GLib.Variant("(o)", (path,)))
        bus.emit_signal(sender, path, "org.freedesktop.portal.Request", "Response",
                        GLib.Variant("(ua{sv})", (0, {"uri": GLib.Variant("s", picture.as_uri())})))

    bus.register_object("/org/freedesktop/portal/desktop", Gio.DBusNodeInfo.new_for_xml(PORTAL).interfaces[0],
                        called_cb, None, None)
    bus.call_sync("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "RequestName",
                  GLib.Variant("(su)", ("org.freedesktop.portal.Desktop", 0)), None, Gio.DBusCallFlags.NONE, -1, None)
    loop = GLib.MainLoop()
    thread = threading.Thread(target=loop.run, daemon=True)
    thread.start()
    return bus, lambda: (loop.quit(), thread.join())


def test_without_an_x_display_the_portal_is_asked_or_the_log_says_why_not(phone, client, media):
    shot = {"action_type": "Screenshot", "orientation": "0"}
    picture = phone.directory / "from_portal.png"
    subprocess.run(["convert", "-size", "60x40", "xc:#00ff00", picture], check=True)
    daemon = subprocess.Popen(["dbus-daemon", "--session", "--nofork", "--print-address=1"], stdout=subprocess.PIPE)
    address = daemon.stdout.readline().decode().strip()
    recorder = subprocess.Popen([phone.program, "exec", "--dir", str(phone.directory), "--", "env", "-u", "DISPLAY",
                                 f"TAVRO_HOST_SESSION_BUS={address}", str(BUILD / f"apps/{RECORDER}/bin/{RECORDER}")])
    try:
        wait_until(lambda: RECORDER in phone.status(), what="the recorder")
        assert client.ask(outfilename=f"{FOLDER}/none.jpg", **shot) == (-1, None)
        assert "the screen cannot be taken: no X display" in phone.log() and not (media / "none.jpg").exists()
        portal, stop_serving = serve_portal(address, picture)
        assert client.ask(outfilename=f"{FOLDER}/portal.jpg", **shot) == (0, None)
        assert is_near(Pixels(media / "portal.jpg").at(30, 20), (0, 255, 0)) and not picture.exists()
        assert client.ask(action_type="Video_Init", outfilename=f"{FOLDER}/none.mp4", **VIDEO) == (-1, None)
        assert "the screen cannot be recorded: no X display" in phone.log() and not (media / "none.mp4").exists()
        stop_serving()
        portal.close_sync(None)
    finally:
        phone.end(RECORDER, "TERM")
        recorder.wait()
        daemon.terminate()
        daemon.wait()
