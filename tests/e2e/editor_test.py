"""The image editor as a person uses it: by touch and by keyboard, from the strip of attachments to the desk."""

import struct
import subprocess
import zlib

import pytest

from phone_driver import wait_until
from road import Road

SECRETS, GROUND = ((255, 0, 255), (255, 255, 0)), (40, 160, 80)


class Editor(Road):
    def put_secret(self, name):
        """A picture with stripes in its middle, and a comment."""
        row = bytes(GROUND) * 720
        stripes = bytes(channel for x in range(200) for channel in SECRETS[x // 16 % 2])
        secret = row[:780] + stripes + row[1380:]
        path = self.put(name, b"")
        subprocess.run(["convert", "-", "-set", "comment", "taken at home", path], check=True,
                       input=b"P6 720 960 255\n" + row * 400 + secret * 160 + row * 400)
        return path

    def edit(self, name):
        self.screen.find(name).get_component_iface().grab_focus()
        focused = self.screen.atspi.StateType.FOCUSED
        wait_until(lambda: self.screen.find(name).get_state_set().contains(focused), what=f"the focus on {name}")
        self.phone.press("Menu")
        self.screen.activate("Edit")

    def open_in_editor(self, name):
        self.write_problem("Something else", name, "text")
        self.attach(name)
        self.edit(name)
        self.screen.wait_for("Selected area", timeout=30)

    def wait_for_area(self, *words):
        """Until the chosen area is described so."""
        wait_until(lambda: all(word in self.area() for word in words), what=lambda: f"{words} in '{self.area()}'")

    def area(self):
        names = [name for name in self.screen.names() if name.startswith(("Hidden area", "Selected", "Picture, no"))]
        return f"{names[0]}: {self.screen.description(names[0])}" if names else ""

    def made_files(self):
        return sorted((self.phone.directory / "usr/media/VantorCommunity").glob("*.jpg"))

    def leave(self):
        self.screen.activate("Back")
        self.screen.activate("Discard")
        self.screen.wait_for("My Reports")


@pytest.fixture(scope="module")
def editor():
    with Editor.started() as editor:
        yield editor


def colours(picture):
    """The pixels of a picture's bytes, as (red, green, blue)."""
    raw = subprocess.run(["convert", "-", "-depth", "8", "rgb:-"], input=picture, check=True, capture_output=True).stdout
    return set(zip(raw[::3], raw[1::3], raw[2::3]))


def looks_like(pixel, colour):
    return all(abs(one - other) < 60 for one, other in zip(pixel, colour))


@pytest.mark.parametrize("tool", ["Hide", "Blur"])
def test_what_is_hidden_by_keyboard_is_in_no_file_that_reaches_the_desk(editor, tool):
    name = tool.lower() + ".jpg"
    original = editor.put_secret(name)
    before = original.read_bytes()
    editor.open_in_editor(name)
    editor.screen.activate(tool)
    editor.screen.find("Picture, no hidden area chosen").get_component_iface().grab_focus()
    editor.phone.press("Return")
    editor.wait_for_area("Hidden area 1 of 1", "Left 239, top 383, 241 by 192 ")
    editor.phone.press("Shift_L+Right", "Shift_L+Down", "Left")
    editor.wait_for_area("Left 2", "Delete removes it")
    editor.phone.press("Delete")
    editor.wait_for_area("Picture, no")
    editor.phone.press("Control_L+z", "Next")
    editor.wait_for_area("Hidden area 1 of 1")
    editor.screen.activate("Done")
    editor.screen.wait_for("Title", timeout=30)
    editor.screen.wait_gone("Remove " + name)
    editor.send()
    report = editor.arrived(name)
    pictures = editor.desk.pictures(report["id"])
    assert len(pictures) == 1 and b"taken at home" not in pictures[0]
    sent = colours(pictures[0])
    assert any(looks_like(pixel, GROUND) for pixel in sent)
    assert not [pixel for pixel in sent for secret in SECRETS if looks_like(pixel, secret)]
    assert all(any(looks_like(pixel, secret) for pixel in colours(before)) for secret in SECRETS)
    assert original.read_bytes() == before


def test_an_area_is_drawn_and_moved_by_touch(editor):
    editor.put_secret("touched.jpg")
    editor.open_in_editor("touched.jpg")
    made = editor.made_files()
    editor.screen.activate("Hide")
    stage = editor.screen.find("Picture, no hidden area chosen").get_component_iface()
    place = stage.get_extents(editor.screen.atspi.CoordType.SCREEN)
    middle_x, middle_y = place.x + place.width // 2, place.y + place.height // 2

    def drag(*points):
        editor.phone.execute("xdotool", "mousemove", *map(str, points[0]), "mousedown", "1")
        for x, y in points[1:]:
            editor.phone.execute("xdotool", "mousemove", str(x), str(y))
        editor.phone.execute("xdotool", "mouseup", "1")

    drag((middle_x - 100, middle_y - 60), (middle_x, middle_y), (middle_x + 100, middle_y + 60))
    editor.wait_for_area("Hidden area 1 of 1")
    drawn = editor.area()
    drag((middle_x - 40, middle_y), (middle_x, middle_y + 30), (middle_x + 40, middle_y + 60))
    wait_until(lambda: editor.area() not in ("", drawn), what="the area being moved")
    editor.screen.activate("Undo")
    editor.screen.activate("Undo")
    assert not editor.screen.find("Undo").get_state_set().contains(editor.screen.atspi.StateType.ENABLED)
    editor.screen.activate("Redo")
    editor.screen.activate("Cancel")
    editor.screen.activate("Discard")
    editor.screen.wait_for("Remove touched.jpg")
    assert editor.made_files() == made
    editor.leave()


def png(width, height, rows):
    def chunk(kind, content):
        return struct.pack(">I", len(content)) + kind + content + struct.pack(">I", zlib.crc32(kind + content))
    header = struct.pack(">IIBBBBB", width, height, 1, 0, 0, 0, 0)
    return b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header) + chunk(b"IDAT", zlib.compress(rows)) + chunk(b"IEND", b"")


def test_a_picture_that_cannot_be_edited_is_said_to_be_so_and_stays_attached(editor):
    whole = png(10000, 10000, bytes(1251) * 10000)
    editor.put("huge.png", whole)
    editor.put("broken.png", png(100, 100, b"")[:60])
    editor.write_problem("Something else", "Cannot be edited", "text")
    editor.attach("huge.png", "broken.png")
    for name in ("huge.png", "broken.png"):
        editor.edit(name)
        editor.screen.wait_for("This cannot be opened", timeout=30)
        editor.screen.activate("OK")
        editor.screen.wait_for("Remove " + name)
    editor.leave()


def test_a_client_that_is_killed_while_editing_has_the_draft_as_it_was(editor):
    editor.put_secret("kept.jpg")
    made = editor.made_files()
    editor.open_in_editor("kept.jpg")
    editor.wait_until_kept("/kept.jpg")  # the attachment: the title has no slash
    editor.phone.end()
    editor.phone.launch()
    editor.screen.activate("Go on", timeout=30)
    editor.screen.wait_for("Remove kept.jpg")
    assert editor.made_files() == made
    editor.leave()
