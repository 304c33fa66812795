"""The client by keyboard alone: real keys on the display, with and without what a screen reader needs."""

import contextlib
import re
import subprocess

import pytest

import stored_reports
from phone_driver import Phone, wait_until
from road import Road

HINT = "What happened? What did you expect?"

# A screen reader that consumes the keys named on its command line, and writes down all that it hears.
SCREEN_READER = """
import sys, gi
gi.require_version("Atspi", "2.0")
from gi.repository import Atspi
def heard(event):
    print(int(event.type), event.event_string, flush=True)
    return event.event_string in sys.argv[1:] and event.type == Atspi.EventType.KEY_PRESSED_EVENT
Atspi.init()
listener = Atspi.DeviceListener.new(heard)
kinds = 1 << Atspi.EventType.KEY_PRESSED_EVENT | 1 << Atspi.EventType.KEY_RELEASED_EVENT
mode = Atspi.KeyListenerSyncType.SYNCHRONOUS | Atspi.KeyListenerSyncType.CANCONSUME
for modifiers in range(256):
    Atspi.register_keystroke_listener(listener, None, modifiers, kinds, mode)
print("ready", flush=True)
Atspi.event_main()
"""


class Keyboard(Road):
    def press(self, *keys):
        self.phone.press(*keys)

    def _focused_nodes(self):
        state = self.screen.atspi.StateType.FOCUSED
        return {node.get_role_name(): node for node in self.screen._nodes() if node.get_state_set().contains(state)}

    def focused(self):
        """The control that the next key goes to. Pages and list items say that they are focused for longer than they
        are: an item counts while its list is."""
        from gi.repository import GLib
        try:
            nodes = self._focused_nodes()
        except GLib.Error:
            return None
        nodes.pop("page tab", None)
        item = nodes.pop("list item", None)
        node = next(iter(nodes.values()), None)
        return item or node if "list" in nodes else node

    def focus_is_on(self, name):
        def is_on():
            node = self.focused()
            return node and node.get_name() == name
        wait_until(is_on, what=lambda: f"the focus on '{name}', not on '{self.focused() and self.focused().get_name()}'")

    def move(self, key):
        """Press the key and wait for the focus to be somewhere else; returns where."""
        before = self.focused()
        self.press(key)
        return wait_until(lambda: self.focused() not in (None, before) and self.focused(), what=f"{key} moving the focus")

    def walk_to(self, name, key="Tab"):
        for _ in range(40):
            if self.focused().get_name() == name:
                return
            self.move(key)
        raise AssertionError(f"{key} never leads to '{name}'")

    def go_round(self, key="Tab"):
        """Where the key takes the focus, from one control on until it is there again."""
        stops = [self.focused()]
        while (stop := self.move(key)) != stops[0]:
            stops.append(stop)
            assert len(stops) < 40, [each.get_name() for each in stops]
        return stops

    def place(self, node):
        box = node.get_component_iface().get_extents(self.screen.atspi.CoordType.WINDOW)
        return box.x, box.y, box.width, box.height


@pytest.fixture(scope="module")
def keyboard():
    with Phone() as phone:
        phone.start("--accessible")
        keyboard = Keyboard(phone)
        keyboard.screen.wait_for("Continue")
        yield keyboard


@contextlib.contextmanager
def screen_reader(phone, *consumed):
    command = [phone.program, "exec", "--dir", str(phone.directory), "--", "/usr/bin/python3", "-W", "ignore", "-c",
               SCREEN_READER, *consumed]
    reader = subprocess.Popen(command, stdout=subprocess.PIPE, text=True, stdin=subprocess.DEVNULL)
    try:
        assert reader.stdout.readline() == "ready\n"
        yield reader
    finally:
        reader.kill()
        reader.communicate()


def is_after(place, previous):
    """Whether the place comes behind the other one as people read: further down, or to the right in the same line."""
    (x, y, _, height), (previous_x, previous_y, _, previous_height) = place, previous
    is_same_line = y < previous_y + previous_height and previous_y < y + height
    return x > previous_x if is_same_line else y > previous_y


def assert_reading_order(keyboard):
    stops = keyboard.go_round()
    places = [keyboard.place(stop) for stop in stops]
    first = min(range(len(stops)), key=lambda i: (places[i][1] + places[i][3] // 2, places[i][0]))
    names = [stop.get_name() for stop in stops[first:] + stops[:first]]
    in_order = places[first:] + places[:first]
    assert all(is_after(place, previous) for previous, place in zip(in_order, in_order[1:])), names
    assert all(names), f"a control without a name among {names}"
    back = [stop.get_name() for stop in keyboard.go_round("Shift_L+Tab")]
    assert sorted(back) == sorted(names)
    return names


def test_the_account_is_chosen_with_keys(keyboard):
    assert_reading_order(keyboard)
    keyboard.focus_is_on(keyboard.focused().get_name())
    keyboard.walk_to("Continue")
    keyboard.press("space")
    keyboard.focus_is_on("Report a problem")
    assert assert_reading_order(keyboard) == ["Report a problem", "Share an idea", "My Reports"]


def test_the_ring_is_shown_at_a_key_and_not_at_a_touch(keyboard, tmp_path):
    def picture():
        place = keyboard.place(keyboard.screen.find("Share an idea"))
        path = keyboard.phone.screenshot(tmp_path / "screen.png")
        crop = "{2}x{3}+{0}+{1}".format(*place)
        return subprocess.run(["convert", path, "-crop", crop, "rgb:-"], check=True, capture_output=True).stdout

    def touch_nothing():
        keyboard.screen.atspi.generate_mouse_event(300, 1200, "b1c")
    keyboard.walk_to("Share an idea")
    with_ring = picture()
    touch_nothing()
    wait_until(lambda: picture() != with_ring, what="the ring going at a touch")
    keyboard.move("Tab")
    keyboard.move("Shift_L+Tab")
    wait_until(lambda: picture() == with_ring, what="the ring being back at a key")


@pytest.mark.parametrize("page, is_writing", [("Report a problem", True), ("Share an idea", True), ("My Reports", False)])
def test_a_page_opens_with_enter_and_leads_back_to_where_it_was_opened(keyboard, page, is_writing):
    keyboard.walk_to(page)
    keyboard.press("Return")
    keyboard.focus_is_on("Title" if is_writing else "Back")
    if is_writing:
        names = assert_reading_order(keyboard)
        assert names[0] == "Back" and names.index("About: Choose what it is about") < names.index("Title")
        keyboard.focus_is_on("Title")
    keyboard.press("Escape")
    keyboard.focus_is_on(page)


def test_text_goes_into_the_field_and_tab_leads_on_instead_of_into_the_text(keyboard):
    keyboard.walk_to("Report a problem")
    keyboard.press("Return")
    keyboard.focus_is_on("Title")
    keyboard.press("Shift_L+h", "e", "l", "l", "o", "Tab", "a", "space", "b")
    keyboard.focus_is_on(HINT)
    wait_until(lambda: keyboard.screen.text(HINT) == "a b", what="the second field's text")
    assert keyboard.screen.text("Title") == "Hello"


def test_a_popup_keeps_the_focus_and_gives_it_back(keyboard):
    keyboard.press("Escape")
    keyboard.focus_is_on("Save as draft")
    buttons = {"Keep writing", "Discard", "Save as draft"}
    assert {stop.get_name() for stop in keyboard.go_round()} == buttons
    assert {stop.get_name() for stop in keyboard.go_round("Shift_L+Tab")} == buttons
    keyboard.press("Escape")
    keyboard.focus_is_on(HINT)
    assert keyboard.screen.look("Keep your text?") is None and keyboard.screen.text("Title") == "Hello"


def test_a_list_is_walked_with_the_arrows_and_chosen_from_with_enter(keyboard):
    keyboard.walk_to("About: Choose what it is about", "Shift_L+Tab")
    keyboard.press("Return")
    keyboard.focus_is_on("Back")
    keyboard.walk_to("Battery")
    assert keyboard.move("Down").get_name() == "Hardware"
    keyboard.press("Return")
    keyboard.screen.wait_for("About: Hardware")


def test_a_key_that_a_screen_reader_consumes_is_not_typed_and_the_others_keep_their_order(keyboard):
    keyboard.focus_is_on("Title")
    with screen_reader(keyboard.phone, "x", "Escape") as reader:
        keyboard.press("a", "x", "b", "x", "Escape", "c", "d")
        wait_until(lambda: keyboard.screen.text("Title").endswith("cd"), what="the last keys")
        heard = [reader.stdout.readline().split() for _ in range(14)]
    assert keyboard.screen.text("Title") == "Helloabcd"
    assert keyboard.screen.look("Keep your text?") is None
    assert heard == [[kind, key] for key in ["a", "x", "b", "x", "Escape", "c", "d"] for kind in "01"]


def test_keys_go_on_when_the_registry_is_gone(keyboard):
    registry = keyboard.phone.execute("pgrep", "-f", "at-spi2-registryd").stdout.split()
    keyboard.phone.execute("kill", "-STOP", *registry)
    try:
        keyboard.press("e", "f", "Escape")
    finally:
        keyboard.phone.execute("kill", "-CONT", *registry)
    keyboard.focus_is_on("Save as draft")
    assert keyboard.screen.text("Title") == "Helloabcdef"


def test_a_phone_without_a_screen_reader_takes_keys_the_same_way():
    def has_typed():
        phone.press("z")
        return (phone.data() / ".tavro.compose").exists()
    with Phone() as phone:
        phone.start("--no-client")
        phone.preference("set", "tavro_username", "string", "ann")
        phone.launch()
        wait_until(lambda: re.search("id # 0x[1-9a-f]", phone.execute("xprop", "-root", "_NET_ACTIVE_WINDOW").stdout),
                   what="the window")
        phone.press("Return")
        wait_until(has_typed, what="a text in the title field")
        phone.press("Escape")

        # Enter is nobody's until the popup has the focus.
        def has_stored():
            phone.press("Return")
            return stored_reports.titles(phone)
        assert set(wait_until(has_stored, what="the draft")[0]) == {"z"}
