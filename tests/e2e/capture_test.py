"""Screenshots and videos of the screen, with the real screen recorder and real windows."""

import re
import time

import pytest

from captured import BLACK, BLUE, ORANGE, Pixels, coloured_window, is_near, length
from phone_driver import wait_until
from road import Road

RECORDER = "corvane.tavro-screen-recorder"
FORCE_SAVER = ("import ctypes as c; x=c.CDLL('libX11.so.6'); x.XOpenDisplay.restype=c.c_void_p;"
               "d=c.c_void_p(x.XOpenDisplay(None)); x.XForceScreenSaver(d,%d); x.XSync(d,0)")


class Capture(Road):
    def media(self):
        return self.phone.storage() / "media/VantorCommunity"

    def begin(self, title, what):
        self.write_problem("Something else", title, "text")
        self.begin_again(what)

    def begin_again(self, what):
        self.screen.activate("Attach pictures")
        self.screen.activate(what)

    def record(self, title):
        self.begin(title, "Record video")
        self.screen.activate("Record")
        self.screen.wait_for("Show the controls")

    def left(self):
        """Seconds that the control shows."""
        minutes, seconds = map(int, self.screen.description("Show the controls").split(":"))
        return 60 * minutes + seconds

    def wait_for_left(self, seconds):
        wait_until(lambda: self.left() <= seconds, what=f"00:{seconds}")

    def wait_until_back(self):
        """The client is in front, and nothing of the control is left."""
        self.screen.wait_gone("Flash_top")
        assert not self.screen.look("Video_Time") and not self.screen.look("tavro-minicontrol.QUICKPANEL")

    def attached(self):
        return [name[len("Remove "):] for name in self.screen.names() if name.startswith("Remove ")]

    def shows_the_window(self):
        """The client shows both colours of the window, which are none of its own."""
        seen = Pixels(self.phone.screenshot(self.phone.directory / "tile.png")).some_colours()
        return all(any(is_near(one, colour, 16) for one in seen) for colour in (BLUE, ORANGE))

    def hide_the_middle(self):
        """In the editor; left, top, right and bottom of what is hidden, in pixels of the screenshot."""
        self.screen.activate("Hide")
        self.screen.find("Picture, no hidden area chosen").get_component_iface().grab_focus()
        self.phone.press("Return")
        self.screen.wait_for("Hidden area 1 of 1")
        place = re.match(r"Left (\d+), top (\d+), (\d+) by (\d+) ", self.screen.description("Hidden area 1 of 1"))
        left, top, width, height = map(int, place.groups())
        return left, top, left + width, top + height

    def leave(self):
        self.back()
        if self.screen.look("Keep writing"):
            self.screen.activate("Discard")
        self.screen.wait_for("My Reports")

    def has_died(self):
        self.screen.wait_for("Failed to perform action")
        assert any(node.get_description() == "An unknown issue has occured." for node in self.screen._nodes())
        self.wait_until_back()
        self.screen.activate("OK")
        self.screen.wait_gone("Failed to perform action")
        assert self.screen.text("Title")

    def display(self, is_on):
        self.phone.execute("/usr/bin/python3", "-c", FORCE_SAVER % (0 if is_on else 1))


@pytest.fixture(scope="module")
def road():
    with Capture.started() as road, coloured_window(road.phone):
        road.phone.launch()  # the client in front
        yield road


def test_a_screenshot_shows_the_window_nothing_of_the_control_and_nothing_that_was_hidden(road):
    road.begin("A screenshot", "Take screenshot")
    road.screen.activate("Capture")
    road.screen.wait_for("Selected area")
    left, top, right, bottom = road.hide_the_middle()
    road.screen.activate("Done")
    wait_until(road.attached, what="the picture")
    assert len(road.attached()) == 1
    road.send()
    report = road.arrived("A screenshot")
    [sent] = road.desk.pictures(report["id"])
    (road.phone.directory / "sent").write_bytes(sent)
    picture = Pixels(road.phone.directory / "sent")
    # The status bar's 146 rows are cut off, the other 1134 fill 1200.
    assert picture.size == (720, 1200)
    top, seam, bottom = (round((y - 146) * 1200 / 1134) for y in (top, 640, bottom))
    seen = {(x, y): picture.at(x, y) for y in range(5, 1200, 45) for x in (2, 40, 360, 600, 717)
            if all(abs(y - edge) > 6 for edge in (top, seam, bottom))}
    hidden = {(x, y) for x, y in seen if left < x < right and top < y < bottom}
    assert len(hidden) > 2
    for place, colour in seen.items():
        assert is_near(colour, BLACK if place in hidden else BLUE if place[1] < seam else ORANGE), place


def test_a_video_is_as_long_as_the_display_said_without_its_pauses(road):
    road.record("A video")
    road.wait_for_left(58)
    road.display(is_on=False)
    wait_until(lambda: not road.screen.look("Video_Time"), what="the pause")
    time.sleep(1.5)
    assert road.screen.look("Go on")
    road.display(is_on=True)
    road.screen.wait_for("Show the controls")
    road.screen.activate("Show the controls")
    road.screen.activate("Pause")
    road.screen.wait_for("Go on")
    time.sleep(1.5)
    road.screen.activate("Go on")
    road.wait_for_left(55)
    shown, since = 60 - road.left(), time.monotonic()
    road.screen.activate("Stop")
    shown_at_most = shown + 1 + time.monotonic() - since  # whole seconds are shown
    road.wait_until_back()
    [name] = wait_until(road.attached, what="the video")
    assert shown - 0.5 < length(road.media() / name) < shown_at_most + 0.5
    wait_until(lambda: road.shows_the_window(), what="the video's first frame on its tile")
    first = Pixels(road.media() / f".{name}.jpg")
    for place, colour in (((240, 90), BLUE), ((62, 100), BLUE), ((240, 638), ORANGE)):  # the hint, the frame
        assert is_near(first.at(*place), colour, 16), place
    road.screen.activate("Attach pictures")
    road.screen.activate("Choose from gallery")
    road.screen.wait_for(name)
    assert not [other for other in road.screen.names() if other.startswith(".")]
    road.back()
    road.send()
    report = road.arrived("A video")
    assert not road.desk.pictures(report["id"])  # the video alone


def test_a_cancelled_video_is_nowhere(road):
    before = sorted(road.media().glob("*.mp4"))
    road.record("Cancelled")
    road.screen.activate("Show the controls")
    road.screen.activate("Discard")
    time.sleep(0.6)  # before that it is a double tap's
    road.screen.activate("Discard?")
    road.wait_until_back()
    assert not road.attached() and sorted(road.media().glob("*.mp4")) == before
    road.begin_again("Record video")
    road.screen.wait_for("Record")  # the menu, which has a "Cancel" of its own, is gone
    road.screen.activate("Cancel")  # before anything is recorded
    road.wait_until_back()
    wait_until(lambda: sorted(road.media().glob("*.mp4")) == before, what="the empty file's end")
    road.leave()


def test_a_recorder_that_dies_leaves_the_report_as_it_was(road):
    road.record("Killed")
    road.wait_for_left(59)  # stopping is possible by then
    time.sleep(1.5)  # a second of it is whole
    road.phone.end(RECORDER)
    road.has_died()
    assert not road.attached()
    assert length(max(road.media().glob("*.mp4"))) > 0.5  # to be chosen from the gallery
    road.leave()


def test_escape_in_the_panel_keeps_the_video_and_ends_all_that_is_shown(road):
    road.record("Escaped")
    road.wait_for_left(59)
    road.screen.activate("Show the controls")
    road.screen.wait_for("Discard")
    time.sleep(1)  # no sign tells when the panel has the keyboard
    road.phone.press("Escape")
    road.wait_until_back()
    assert wait_until(road.attached, what="the video")
    road.leave()


def test_returning_to_the_client_keeps_what_was_recorded(road):
    road.record("Returned")
    road.wait_for_left(59)
    road.phone.launch()
    road.wait_until_back()
    [name] = wait_until(road.attached, what="the video")
    assert length(road.media() / name) > 0.5
    road.leave()


def test_a_client_that_dies_in_a_recording_leaves_no_video(road):
    before = sorted(road.media().glob("*.mp4"))
    road.record("Left")
    road.wait_for_left(58)
    road.phone.end()
    road.phone.launch()
    road.screen.wait_for("Go on")
    wait_until(lambda: sorted(road.media().glob("*.mp4")) == before, what="the video's end")
    road.screen.activate("Discard")


def test_a_client_that_dies_in_a_capture_loses_no_text(road):
    road.begin("Still here", "Take screenshot")
    road.screen.wait_for("Capture")
    road.phone.end()
    road.phone.launch()
    road.screen.activate("Go on")
    road.screen.wait_for("Title")
    assert road.screen.text("Title") == "Still here"
    assert not re.search("Flash_|tavro-mini", " ".join(road.screen.names()))
