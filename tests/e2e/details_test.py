"""The details page of a report, as a person and support use it together: the way of the report, its files, the
conversation, follow-ups, deleting."""

import time

import pytest
import stored_reports
from phone_driver import wait_until
from road import IN_PROCESS, Road

SOLVED, COMPLETED = 3, 4
TITLE = "Albums stay grey"
TEXT = "Since this morning." + "\nAgain." * 20
SECOND = "An <i>old</i> album is grey."
HINT = "What do you still see? (optional)"
GONE = "This report is not here any more"


class DetailsRoad(Road):
    def wait_for_state(self, text):
        self.screen.wait_for("Status: " + text, timeout=20)

    def open(self, *row):
        if self.screen.look("Report a problem"):
            self.open_history()
        self.screen.activate(self.wait_for_row(*row))

    def scroll_to_end(self, wheel="5"):
        self.phone.execute("xdotool", "mousemove", "360", "700", "click", "--repeat", "60", "--delay", "5", wheel)

    def scroll_to_start(self):
        self.scroll_to_end(wheel="4")

    def open_by_notification(self, voc_id):
        self.phone.launch(TAVRO_NOTIFICATION_EVENT="TAVRO_NOTIFICATION_CLICKED",
                          TAVRO_NOTIFICATION_TYPE="TAVRO_NOTIFICATION_VOC", TAVRO_NOTIFICATION_VOC_ID=voc_id)

    def tell_changed(self, voc_id):
        self.phone.launch(operation="TAVRO_UPDATE_HISTORY", TAVRO_SERVER_PUSH_NOTI_VOC_ID=voc_id,
                          TAVRO_SERVER_PUSH_NOTI_STATUS="TAVRO_SERVER_PUSH_NOTI_UPDATED")


@pytest.fixture(scope="module")
def road():
    with DetailsRoad.started("morning.png", "banner.jpg") as road:
        road.write_problem("Battery", TITLE, "")
        road.attach("morning.png", "banner.jpg")
        road.screen.type_text("What happened? What did you expect?", TEXT)
        road.send()
        road.number = road.arrived(TITLE)["id"]
        yield road


def test_page_tells_the_way_of_the_report_and_what_was_said_and_stays_in_step(road):
    reply = "<b>Thank you</b> &amp; we are \"on it\" <br/>"
    road.desk.answer(road.number, IN_PROCESS, reply)
    road.open(TITLE, "In process")
    assert road.screen.description(reply).startswith("Vantor support")  # what is new comes first
    road.screen.wait_gone("Status: In process")
    road.scroll_to_start()
    road.wait_for_state("In process")
    names = road.screen.names()
    assert names.index("In process") < names.index("Submitted"), names
    road.scroll_to_end()
    road.screen.wait_gone("Status: In process")
    road.desk.answer(road.number, SOLVED, "Mended.")
    road.screen.wait_for("Still happens", timeout=20)
    assert not road.screen.look("Status: Completed"), "the refreshed page jumped to its beginning"


def test_picture_opens_and_is_saved_beside_what_is_there(road):
    images = road.phone.storage() / "media" / "Images"
    original = (images / "morning.png").read_bytes()
    road.screen.activate("morning.png")
    for name in ("morning (2).png", "morning (3).png"):
        road.screen.activate("Save a copy")
        wait_until((images / name).exists, 10, name)
        assert (images / name).read_bytes() == original
        assert (images / name).stat().st_mode & 0o777 == 0o600
    assert not list(images.glob(".copy*")) and (images / "morning.png").read_bytes() == original
    road.back()
    (images / "banner.jpg").unlink()
    road.screen.activate("banner.jpg")
    assert road.screen.description("This cannot be opened") == "This file is no longer on the phone."
    road.screen.activate("OK")


def test_follow_up_reaches_support_in_the_conversation_of_the_first_report(road):
    road.screen.activate("Still happens")
    road.screen.type_text(HINT, "Last <summer>'s album is grey.")
    note = road.phone.data() / ".tavro.follow_up"
    wait_until(lambda: note.exists() and "<summer>" in note.read_text(), what="what was typed being kept")
    road.relaunch()
    road.open(TITLE, "Completed")
    road.screen.activate("Still happens")
    assert road.screen.text(HINT) == "Last <summer>'s album is grey.", "the killed client lost what was typed"
    road.screen.type_text(HINT, SECOND)
    road.back()
    road.screen.activate("Still happens")
    assert road.screen.text(HINT) == SECOND, "what was typed went with the page"
    road.screen.activate("Send")
    assert not note.exists()
    road.screen.wait_for("Still happens: " + SECOND)
    assert not road.screen.look("Works now"), "asked again before there was an answer"
    second = road.arrived("Still happens: " + TITLE)
    assert second["text"] == SECOND and second["verdict"] == "still_happens"
    assert second["follow_up_of"] == road.number
    first = road.desk.report(road.number)
    assert first["follow_ups"] == [{"id": second["id"], "verdict": "still_happens"}] and not first["read"]
    page = road.desk.page(f"/staff/reports/{road.number}")
    assert page.index("Mended.") < page.index("An &lt;i&gt;old&lt;/i&gt; album") and f"/staff/reports/{second['id']}" in page
    assert f"/staff/reports/{road.number}" in road.desk.page(f"/staff/reports/{second['id']}")
    road.desk.answer(second["id"], IN_PROCESS, "We look at that album.")
    road.screen.wait_for("We look at that album.", timeout=20)
    wait_until(lambda: time.time() * 1000 > second["created"] + 1000, what="the next second, which stored times tell")
    road.desk.answer(road.number, COMPLETED, "Now it is.")
    road.screen.wait_for("Works now", timeout=20)


def test_follow_up_is_a_row_of_the_history_that_leads_to_the_first_report(road):
    road.back()
    road.open("Still happens: " + TITLE)
    road.screen.activate("Follow-up to: " + TITLE)
    road.wait_for_state("Completed")
    road.screen.wait_for("Works now")
    road.back()


BROKEN = [("", ""), ("#", "#"), ("6#", "-5#0"), ("abc", "99999999999999999999"), ("99999999999", "x"),
          ("1#" * 10000 + "2", "1#" * 10000), ("1#5", "4102444800000#4102444800000")]


def test_broken_histories_are_shown_as_far_as_they_make_sense(road):
    for number, (states, times) in enumerate(BROKEN):
        voc_id = stored_reports.add_report(road.phone, f"broken {number}", states, reply="none#a<br/>b")
        with stored_reports.connect(road.phone) as store, store:
            store.execute("UPDATE TABLE_VOC SET VOC_DATE_OF_UPDATION = ? WHERE VOC_ID = ?", (times, voc_id))
        road.open_by_notification(voc_id)
        wait_until(lambda: any(name.startswith("a\nb") or name == "a b" for name in road.screen.names()), 20,
                   lambda: f"{states[:20]}: {road.screen.names()}")


def test_long_and_invalid_texts_neither_hang_the_page_nor_leave_it_nameless(road):
    voc_id = stored_reports.add_report(road.phone, "long", stored_reports.COMPLETED, text="word " * 200000)
    with stored_reports.connect(road.phone) as store, store:
        store.execute("UPDATE TABLE_VOC SET VOC_PUSH_COMMENTS = CAST(? AS TEXT) WHERE VOC_ID = ?",
                      (b"none#" + b"<b>re\xffply</b> &amp; " * 60000 + b"#none", voc_id))
    road.open_by_notification(voc_id)
    wait_until(lambda: any(name.startswith("re\ufffdply &") for name in road.screen.names()), 20, "the reply")
    road.scroll_to_end()
    road.screen.activate("Read the whole text")
    road.screen.wait_for("Next", timeout=20)
    road.back()


def test_report_is_deleted_from_its_page_but_not_while_it_is_sent(road):
    sending = stored_reports.add_report(road.phone, "on its way", stored_reports.SENDING)
    road.open_by_notification(sending)
    road.wait_for_state("Sending...")
    assert not road.screen.look("Delete this report")
    stored_reports.change_report(road.phone, sending, stored_reports.FAILED)
    road.tell_changed(sending)
    road.screen.activate("Delete this report")
    other = stored_reports.add_report(road.phone, "another", stored_reports.IN_PROCESS, text="I stay.")
    road.open_by_notification(other)
    road.screen.wait_for("Status: In process")
    road.screen.activate("Delete")
    road.screen.wait_for("I stay.")
    road.open_by_notification(sending)
    road.screen.wait_for(GONE)
    road.screen.activate("OK")


def test_report_that_goes_while_its_page_is_open_takes_the_page_with_it(road):
    voc_id = stored_reports.add_report(road.phone, "short-lived", stored_reports.IN_PROCESS, text="Here I am.")
    road.open_by_notification(voc_id)
    road.screen.wait_for("Here I am.")
    with stored_reports.connect(road.phone) as store, store:
        store.execute("DELETE FROM TABLE_VOC WHERE VOC_ID = ?", (voc_id,))
    road.tell_changed(voc_id)
    road.screen.wait_for(GONE)
    road.screen.activate("OK")
    road.screen.wait_gone("Here I am.")
