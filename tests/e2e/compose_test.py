"""The compose screens as a person meets them, on a real phone with real touches and keys."""

import time

import pytest

from phone_driver import wait_until
from road import Road

HINT = "What happened? What did you expect?"


@pytest.fixture(scope="module")
def road():
    with Road.started("one.jpg", "two.jpg", environment={"TAVRO_SVC_RETRY_MS": "200"}) as road:
        yield road


def touch(road, name, *doing):
    """Put the finger on the middle of a control, the lowest of that name, which no notification covers; `doing` is
    what xdotool does there."""
    road.screen.wait_for(name)
    time.sleep(0.6)  # a compose screen that has just come up takes no touches yet
    *_, node = (node for node in road.screen._nodes() if road.screen._matches(node, name, None))
    road.phone.execute("xdotool", "mousemove", *road.screen.middle(node), *doing)


def leave(road, answer="Discard"):
    road.back()
    road.screen.activate(answer)
    road.screen.wait_for("My Reports")


def pictures(road):
    """The attachments from left to right."""
    return [name for name in road.screen.names() if name in ("one.jpg", "two.jpg", "lost.jpg")]


def is_on(road, name):
    state = road.screen.find(name).get_state_set()
    return state.contains(road.screen.atspi.StateType.CHECKED)


def titles(road):
    return [report["title"] for report in road.desk.reports()]


def test_first_report_is_shown_before_it_goes_and_later_ones_go_at_once(road):
    road.write_problem("Something else", "The first", "ever sent")
    road.screen.activate("Send")
    road.screen.wait_for("What is sent")
    road.back()
    road.screen.wait_for(HINT)
    assert road.screen.text("Title") == "The first"
    road.send()
    road.arrived("The first")
    road.write_problem("Something else", "The second", "goes at once")
    road.screen.activate("Send")
    road.screen.wait_for("My Reports")
    road.arrived("The second")


def test_two_taps_on_send_make_one_report(road):
    road.write_problem("Something else", "Sent once", "by an impatient person")
    touch(road, "Send", "click", "--repeat", "2", "--delay", "60", "1")
    road.screen.wait_for("My Reports")
    road.arrived("Sent once")
    time.sleep(1)
    assert titles(road).count("Sent once") == 1


def test_pictures_are_moved_and_removed_by_touch_and_by_keys(road):
    road.screen.activate("Report a problem")
    road.attach("one.jpg", "two.jpg")
    assert pictures(road) == ["one.jpg", "two.jpg"]
    touch(road, "one.jpg", "mousedown", "1", "sleep", "1", "mouseup", "1")
    road.screen.activate("Move right")
    wait_until(lambda: pictures(road) == ["two.jpg", "one.jpg"], what="the picture moving right")
    # The focus went along.
    road.phone.execute("xdotool", "key", "Menu")
    road.screen.activate("Move left")
    wait_until(lambda: pictures(road) == ["one.jpg", "two.jpg"], what="the picture moving left")
    road.screen.activate("Remove one.jpg")
    wait_until(lambda: pictures(road) == ["two.jpg"], what="the picture going")
    leave(road)


def test_attachment_that_vanished_is_named_and_nothing_is_lost(road):
    path, = road.add_pictures("lost.jpg")
    road.write_problem("Something else", "One picture is gone", "It was deleted while I wrote")
    road.attach("one.jpg", "lost.jpg")
    path.unlink()
    road.screen.activate("Send")
    road.screen.wait_for("Some attachments are gone")
    road.screen.activate("Keep writing")
    assert pictures(road) == ["one.jpg", "lost.jpg"]
    road.screen.activate("Send")
    road.screen.activate("Send without them")
    road.screen.wait_for("My Reports")
    report = road.arrived("One picture is gone")
    assert [file["name"] for file in report["attachments"] if file["kind"] == "attachment"] == ["one.jpg"]


def test_draft_keeps_its_log_until_it_is_switched_off(road):
    folder = road.phone.storage() / "media" / "QRT_debug"
    road.write_problem("Something else", "With a log", "kept for later")
    before = set(folder.glob("*"))
    assert not is_on(road, "System log")
    road.screen.activate("System log")
    log, = wait_until(lambda: {file for file in set(folder.glob("*")) - before if file.suffix == ".zip"},
                      what="the log")
    wait_until(lambda: "kB" in road.screen.find("System log").get_description(), what="the size of the log")
    leave(road, "Save as draft")
    road.open_history()
    road.screen.activate(road.wait_for_row("With a log", "Draft saved"))
    assert is_on(road, "System log")
    road.screen.activate("System log")
    wait_until(lambda: not is_on(road, "System log"), what="the switch going off")
    assert log.exists(), "the stored draft still has it"
    leave(road, "Save as draft")
    wait_until(lambda: not log.exists(), what="the log being deleted")
