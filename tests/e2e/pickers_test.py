"""Choosing what a report is about and which files go with it, as a person does it."""

import os

import pytest
import stored_reports
from phone_driver import wait_until
from road import Road

APPLICATIONS = ["Gallery", "Messages", "Éditeur", "100% <b>bold</b>", "Clock"]


@pytest.fixture(scope="module")
def road(tmp_path_factory):
    data = tmp_path_factory.mktemp("data")
    (data / "applications").mkdir()
    for number, name in enumerate(APPLICATIONS):
        icon = data / f"icon{number}.png"
        icon.write_bytes(b"no picture")
        (data / "applications" / f"demo{number}.desktop").write_text(
            f"[Desktop Entry]\nType=Application\nName={name}\nExec=true\nIcon={icon}\n")
    with Road.started(environment={"XDG_DATA_HOME": str(data)}) as road:
        yield road


def open_picker(road):
    road.screen.activate("Report a problem")
    road.screen.activate("About: Choose what it is about")
    road.screen.wait_for("Battery")


def open_gallery(road):
    road.screen.activate("Attach pictures")
    road.screen.activate("Choose from gallery")


def tap(road, name):
    road.phone.execute("xdotool", "mousemove", *road.screen.middle(road.screen.find(name)), "click", "1")


def sought(road, text):
    """What the list offers once this was typed into the search."""
    road.screen.type_text("Search for a name", text)
    shown = road.screen.names()
    return [name for name in shown[shown.index("Close search") + 1:] if name not in ("Search for a name", "What is it about?")]


def test_search_narrows_both_sections_and_back_ends_it_first(road):
    open_picker(road)
    road.screen.activate("Search")
    assert wait_until(lambda: sought(road, "EDITEUR")) == ["Applications", "Éditeur"]
    assert sought(road, "soft")[:2] == ["Phone", "Software update"]
    assert sought(road, "<b>") == ["Applications", "100% <b>bold</b>"]
    assert sought(road, "no such thing")[0] == 'Nothing is called "no such thing"'
    road.back()
    road.screen.wait_for("Hardware")
    road.screen.wait_gone("Search for a name")
    road.screen.activate("Search")
    sought(road, "éDI")
    road.screen.activate("Éditeur")
    road.screen.wait_for("About: Éditeur")
    road.back()


def test_performance_has_a_page_of_its_own_that_returns_to_the_report(road):
    open_picker(road)
    road.screen.activate("Search")
    sought(road, "perf")
    road.screen.activate("Performance")
    road.screen.wait_for("Gets too warm")
    road.back()
    road.screen.activate("Performance")
    road.screen.activate("Gets too warm")
    road.screen.wait_for("About: Gets too warm")
    road.back()


def test_the_stores_table_learns_what_is_installed(road):
    def downloaded():
        return set(stored_reports.column(road.phone, "SELECT APP_NAME FROM APP_DATA WHERE APP_DOWNLOADED = 1"))

    wait_until(lambda: downloaded() == set(APPLICATIONS), 30, lambda: f"the table {downloaded()}")


def test_gallery_shows_videos_and_broken_files_and_attaches_in_the_order_of_choosing(road):
    road.screen.activate("Report a problem")
    open_gallery(road)
    road.screen.wait_for("No pictures yet")
    road.back()
    picture, _ = road.add_pictures("morning.png", "banner.jpg")
    road.put("clip.mp4", b"\0\0\0\x18ftypmp42")
    (picture.parent / "empty.jpg").write_bytes(b"")
    (picture.parent / "cut.jpg").write_bytes((picture.parent / "banner.jpg").read_bytes()[:2000])
    (picture.parent / "notes.txt").write_text("not offered")
    for age, name in enumerate(["clip.mp4", "cut.jpg", "empty.jpg", "banner.jpg", "morning.png"]):
        os.utime(picture.parent / name, (1700000000 - age, 1700000000 - age))
    open_gallery(road)
    road.screen.wait_for("clip.mp4")
    shown = [name for name in road.screen.names() if "." in name]
    assert shown == ["clip.mp4", "cut.jpg", "empty.jpg", "banner.jpg", "morning.png"]
    for name in ("morning.png", "cut.jpg", "clip.mp4", "cut.jpg"):
        tap(road, name)
    road.screen.activate("Attach (2)")
    road.screen.wait_for("Remove clip.mp4")
    attached = [name for name in road.screen.names() if name.startswith("Remove ")]
    assert attached == ["Remove morning.png", "Remove clip.mp4"]
