"""The page "What is sent" and what opens from it, as a person uses them."""

import pytest
from gi.repository import Gio

from phone_driver import wait_until
from road import Road

PLAYER = "[Desktop Entry]\nType=Application\nName=Player\nMimeType=video/mp4;\nExec=cp %f /opt/usr/played\n"


@pytest.fixture(scope="module")
def road(tmp_path_factory):
    data = tmp_path_factory.mktemp("data")
    (data / "applications").mkdir()
    with Road.started(environment={"XDG_DATA_HOME": str(data)}) as road:
        road.applications = data / "applications"
        yield road


def write_problem_with(road, title, **files):
    """A problem with these files, {"clip_mp4": content}."""
    names = [name.replace("_", ".") for name in files]
    for name, content in zip(names, files.values()):
        road.put(name, content)
    road.write_problem("Something else", title, "text")
    road.attach(*names)
    road.open_review()


def test_what_is_removed_leaves_the_list_and_the_compose_screen(road):
    start = b"\xff\xd8\xff"
    write_problem_with(road, "Two pictures", one_jpg=start + b"1" * 90000, two_jpg=start + b"2" * 9000)
    wait_until(lambda: "5 items, 97 kB" in road.screen.names(), what=lambda: f"the total in {road.screen.names()}")
    assert road.screen.description("Picture 1") == "one.jpg \u00b7 88 kB"
    road.screen.activate("Remove Picture 1")
    wait_until(lambda: "4 items, 10 kB" in road.screen.names(), what=lambda: f"the total in {road.screen.names()}")
    assert road.screen.description("Picture 1") == "two.jpg \u00b7 9 kB"
    road.back()
    road.screen.wait_for("Remove two.jpg")
    assert not road.screen.look("Remove one.jpg")


def test_long_text_is_shown_in_parts_and_exactly(road):
    road.screen.type_text("What happened? What did you expect?", "<b>&amp;</b> \U0001F600 " * 8000)
    road.screen.activate("More")
    road.screen.activate("What is sent")
    road.screen.activate("Your text")
    shown = ""
    while True:
        shown += road.screen.text("Your text", "entry")
        if not road.screen.find("Next").get_state_set().contains(road.screen.atspi.StateType.ENABLED):
            break
        road.screen.activate("Next")
    assert shown == "About Something else\n\nTwo pictures\n\n" + "<b>&amp;</b> \U0001F600 " * 8000
    road.back()


def test_file_that_is_no_picture_is_said_to_be_none(road):
    road.screen.activate("Picture 1")
    node = road.screen.find("This picture cannot be shown. It may have been deleted, or it is damaged.")
    assert node and not road.screen.look("Zoom in")
    road.back()
    road.back()
    road.screen.activate("Back")
    road.screen.activate("Discard")
    road.screen.wait_for("My Reports")


def test_video_goes_to_the_phones_player_and_without_one_that_is_said(road):
    write_problem_with(road, "A video", clip_mp4=b"\0\0\0\x18ftypmp42" + b"v" * 100)
    road.screen.activate("Video 1")
    if not Gio.AppInfo.get_default_for_type("video/mp4", False):  # else the machine's own player would come up
        road.screen.activate("Open")
        description = road.screen.description("This cannot be opened")
        assert description == "No application on this phone plays videos."
        road.screen.activate("OK")
    (road.applications / "player.desktop").write_text(PLAYER)
    (road.applications / "mimeapps.list").write_text("[Default Applications]\nvideo/mp4=player.desktop\n")

    def played():
        road.screen.activate("Open")
        if road.screen.look("OK"):  # the list of applications is read anew a little later
            road.screen.activate("OK")
        return (road.phone.storage() / "played").exists()

    wait_until(played, what="the player being started")
