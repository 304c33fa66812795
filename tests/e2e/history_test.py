"""The list "My Reports": what it shows, searching in it, selecting and deleting, and how it keeps its place while
the store changes."""

import pytest

import stored_reports as stored
from keyboard_test import Keyboard
from phone_driver import wait_until

SEARCH = "Search in your reports"
REFRESHED = "Called for status update from svc"


@pytest.fixture(scope="module")
def road():
    with Keyboard.started() as keyboard:
        keyboard.open_history()
        yield keyboard


@pytest.fixture
def reports(road):
    """Five reports of all sorts on the list, newest first as named here."""
    stored.remove_all_reports(road.phone)
    ids = {title: stored.add_report(road.phone, title, status, age=age * 100000, **more)
           for age, (title, status, more) in enumerate([
               ("Answered", stored.IN_PROCESS, {"reply": "none#Which <b>model</b>?", "target": "Gallery"}),
               ("Going out", stored.SENDING, {}),
               ("Half written", stored.DRAFT, {"kind": stored.IDEA, "text": "two fingers"}),
               ("Fell over", stored.DRAFT, {"dump": "/opt/usr/share/crash/dump.zip", "target": "Music"}),
               ("Settled", stored.COMPLETED, {})])}
    stored.refresh_history(road.phone)
    road.wait_for_row("Settled")
    return ids


def title_of(row):
    return row.split(": ", 1)[1].split(".")[0]


def rows(road):
    """The titles on the screen, in order."""
    return [title_of(name) for name in road.screen.names() if ": " in name]


def wait_for_rows(road, *titles):
    wait_until(lambda: rows(road) == list(titles), 20, lambda: f"{titles}, not {rows(road)}")


def start_selecting(road):
    road.screen.activate("More")
    road.screen.activate("Select")
    road.screen.wait_for("Select items")


def long_press(road, row):
    road.phone.execute("xdotool", "mousemove", *road.screen.middle(road.screen.find(row)), "mousedown", "1")
    road.screen.wait_for("Cancel")
    road.phone.execute("xdotool", "mouseup", "1")


def ticked(road):
    """The titles of the ticked rows, in order."""
    nodes = [node for node in road.screen._nodes() if node.get_role_name() == "list item"]
    return [title_of(node.get_name()) for node in nodes if ": " in node.get_name() and node.get_description() == "Selected"]


def test_rows_say_in_one_sentence_what_became_of_a_report(road, reports):
    assert rows(road) == list(reports)
    assert road.wait_for_row("Answered").startswith("Gallery: Answered. In process, ")
    assert road.wait_for_row("Answered").endswith(". New reply.")
    road.screen.activate(road.wait_for_row("Answered"))
    road.screen.wait_gone("Search")
    with stored.connect(road.phone) as store:
        assert store.execute("SELECT VOC_ID FROM TABLE_VOC WHERE VOC_PUSH_READ = 0").fetchall() == []
    road.back()
    wait_until(lambda: not road.wait_for_row("Answered").endswith("New reply."), what="the marker leaving")


def test_drafts_are_reopened_in_the_screen_they_belong_to(road, reports):
    for title, hint in (("Half written", "What would make it better?"), ("Fell over", "What were you doing when it stopped?")):
        road.screen.activate(road.wait_for_row(title))
        road.screen.wait_for(hint)
        assert road.screen.text("Title") == title
        road.back()
    road.screen.wait_for("More")
    assert "> selected" in road.phone.log()


def test_a_report_that_is_being_sent_cannot_be_selected_and_back_leaves_the_mode(road, reports):
    long_press(road, road.wait_for_row("Answered"))
    road.screen.wait_for("Select items (1)")
    assert ticked(road) == ["Answered"]
    road.screen.activate(road.wait_for_row("Going out"))
    road.screen.activate("Select all")
    road.screen.wait_for("Select items (4)")
    assert road.screen.description(road.wait_for_row("Going out")) == "Still being sent, cannot be selected"
    assert road.screen.description("Select all") == "Selected"
    road.screen.activate(road.wait_for_row("Settled"))
    road.screen.wait_for("Select items (3)")
    assert road.screen.description("Select all") == "Not selected"
    road.press("Escape")
    road.screen.wait_for("More")
    wait_for_rows(road, *reports)


def test_ticks_stay_with_their_reports_when_the_list_changes(road, reports):
    start_selecting(road)
    road.screen.activate(road.wait_for_row("Half written"))
    road.screen.activate(road.wait_for_row("Settled"))
    road.screen.wait_for("Select items (2)")
    stored.add_report(road.phone, "Brand new")
    stored.change_report(road.phone, reports["Half written"], stored.SENDING)
    stored.refresh_history(road.phone)
    wait_for_rows(road, "Half written", "Brand new", "Answered", "Going out", "Fell over", "Settled")
    road.screen.wait_for("Select items (1)")
    assert ticked(road) == ["Settled"]
    road.screen.activate("Cancel")


def test_deleted_reports_leave_the_list_and_undo_brings_them_back(road, reports):
    start_selecting(road)
    road.screen.activate(road.wait_for_row("Settled"))
    road.screen.activate("Delete")
    road.screen.wait_for("Delete this report?")
    road.press("Return")
    wait_for_rows(road, "Answered", "Going out", "Half written", "Fell over")
    road.screen.activate("Undo")
    wait_for_rows(road, *reports)


def test_search_and_filters_narrow_the_list_and_are_cleared_in_one_step(road, reports):
    road.screen.activate("New replies")
    wait_for_rows(road, "Answered")
    road.screen.activate("Drafts")
    wait_for_rows(road, "Half written", "Fell over")
    road.screen.activate("Search")
    road.screen.type_text(SEARCH, "FINGERS")
    wait_for_rows(road, "Half written")
    stored.add_report(road.phone, "Five fingers", stored.DRAFT)
    stored.refresh_history(road.phone)
    wait_for_rows(road, "Five fingers", "Half written")
    road.screen.type_text(SEARCH, "%' OR 1 --" * 40)
    road.screen.wait_for("No report found")
    assert len(road.screen.text(SEARCH)) == 200
    road.screen.activate("Show all reports")
    wait_for_rows(road, "Five fingers", *reports)
    road.screen.activate("Search")
    road.screen.type_text(SEARCH, "settled")
    wait_for_rows(road, "Settled")
    road.press("Escape")
    wait_for_rows(road, "Five fingers", *reports)


def test_list_by_keyboard_from_the_menu_to_the_tick(road, reports):
    road.screen.find("More").get_component_iface().grab_focus()
    road.focus_is_on("More")
    road.press("Return")
    road.focus_is_on("Select")
    road.press("Return")
    road.focus_is_on("Select all")
    road.press("Down")
    road.focus_is_on(road.wait_for_row("Answered"))
    road.press("Return")
    road.screen.wait_for("Select items (1)")
    road.press("Escape")
    road.screen.wait_for("More")


def test_an_emptied_list_says_what_to_do_next(road, reports):
    road.screen.find("All").get_component_iface().grab_focus()
    road.focus_is_on("All")
    road.move("Down")
    stored.remove_all_reports(road.phone)
    stored.refresh_history(road.phone)
    # The emptied list says that it is focused for longer than it is.
    wait_until(lambda: road._focused_nodes()["push button"].get_name() == "Write a report", what="the focus on the button")
    assert road.screen.description("No feedback").startswith("After you compose feedback messages")
    assert not road.screen.look("Search")
    road.back()
    road.open_history()
    road.screen.wait_for("After you compose feedback messages, they will be shown here.")
    road.screen.activate("Write a report")
    road.screen.wait_for("About: Choose what it is about")
    road.back()


def test_refresh_keeps_the_place_and_the_focus(road):
    ids = [stored.add_report(road.phone, f"Number {i}", age=1000 + i) for i in range(60)]
    stored.refresh_history(road.phone)
    road.screen.find("All").get_component_iface().grab_focus()
    road.focus_is_on("All")
    road.press(*["Down"] * 21)
    focused = road.wait_for_row("Number 20.")
    road.focus_is_on(focused)
    place = road.place(road.screen.find(focused))
    for voc_id in (ids[50], ids[2]):
        stored.change_report(road.phone, voc_id, stored.IN_PROCESS)
    stored.change_report(road.phone, ids[18], stored.DRAFT, moves=False)
    stored.add_report(road.phone, "Brand new")
    stored.refresh_history(road.phone)
    road.wait_for_row("Number 18.", "Draft saved")
    assert road.place(road.screen.find(focused)) == place
    road.focus_is_on(focused)
    road.move("Up")
    road.focus_is_on(road.wait_for_row("Number 19."))


def test_a_list_that_was_scrolled_away_from_the_focus_stays_where_it_is(road):
    road.phone.execute("xdotool", "mousemove", "360", "640", "click", "--repeat", "4", "4")
    wait_until(lambda: "Number 20." not in str(road.screen.names()), what="the focused row leaving the screen")
    row = rows(road)[3]

    def place_of():
        return road.place(road.screen.find(road.wait_for_row(f": {row}.")))
    wait_until(lambda: place_of() == place_of(), what="the list coming to rest")
    place = place_of()
    stored.add_report(road.phone, "Newer still")
    refreshed = road.phone.log().count(REFRESHED)
    stored.refresh_history(road.phone)
    wait_until(lambda: road.phone.log().count(REFRESHED) > refreshed, what="the refresh")
    assert place_of() == place
    long_press(road, road.wait_for_row(f": {row}."))
    road.screen.wait_for("Select items (1)")
    assert ticked(road) == [row]
    road.press("Escape")
    road.screen.wait_for("More")
    wait_until(lambda: place_of() == place, what=lambda: f"the row at {place}, not at {place_of()}")
