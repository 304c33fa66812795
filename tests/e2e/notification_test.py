"""Notifications and the icon's badge on a person's desktop: a notification service plays the desktop, the test touches
what is posted; phone, client, upload service and desk are real."""

import contextlib
import re
import sqlite3
import subprocess

import dbus
import pytest

import stored_reports as stored
from desktop import Desktop
from keyboard_test import Keyboard
from phone_driver import CLIENT, Phone, wait_until
from road import IN_PROCESS

NAME, PATH = "org.freedesktop.Notifications", "/org/freedesktop/Notifications"
PREFERENCES, STORE = "dbspace/preference.db", f"apps/{CLIENT}/shared/data/.tavro.db"
MOCK = "org.freedesktop.DBus.Mock"
HINT = "What happened? What did you expect?"
SENDING, SENT, FAILED, REPLY = "Sending feedback...", "Feedback sent.", "Sending failed.", "Support has answered"


class Notifications:
    """The desktop's notification service and its launcher."""

    def __init__(self, desktop, folder):
        self.desktop = desktop
        self.bus = dbus.bus.BusConnection(desktop.environment["DBUS_SESSION_BUS_ADDRESS"])
        self.badge_log = folder / "badges"
        with self.badge_log.open("w") as log:
            desktop.run("dbus-monitor", "--session", "interface='com.canonical.Unity.LauncherEntry'", stdout=log)
        wait_until(lambda: "NameAcquired" in self.badge_log.read_text(), what="listening for badges")
        self.start()

    def start(self):
        self.service = self.desktop.run("/usr/bin/python3", "-m", "dbusmock", "--template", "notification_daemon",
                                        stdout=subprocess.DEVNULL)
        wait_until(lambda: self.bus.name_has_owner(NAME), what="the notification service")

    def stop(self):
        self.service.kill()
        wait_until(lambda: not self.bus.name_has_owner(NAME), what="the end of the notification service")

    def _mock(self, method, *arguments):
        return self.bus.get_object(NAME, PATH).get_dbus_method(method, MOCK)(*arguments)

    def posted(self, title):
        """What was posted under this title: (replaced id, text, actions, hints, lifetime)."""
        calls = [arguments for _, arguments in self._mock("GetMethodCalls", "Notify")]
        return [(int(a[1]), str(a[4]), [str(word) for word in a[5]], dict(a[6]), int(a[7])) for a in calls if a[3] == title]

    def wait_for(self, title, text="", count=1):
        def found():
            matches = [call for call in self.posted(title) if text in call[1]]
            return matches if len(matches) >= count else None
        return wait_until(found, 30, lambda: f"'{title}' '{text}' among {self._mock('GetMethodCalls', 'Notify')}")

    def forget(self):
        self._mock("ClearCalls")

    def touch(self, number, action="default"):
        self._mock("EmitSignal", NAME, "ActionInvoked", "us", [dbus.UInt32(number), action])

    def close(self, number):
        self._mock("EmitSignal", NAME, "NotificationClosed", "uu", [dbus.UInt32(number), dbus.UInt32(2)])

    def badge(self):
        """What the launcher heard last: (desktop entry, count, whether it is shown)."""
        heard = re.findall(r'string "(application://[^"]*)".*?"count".*?int64 (\d+).*?"count-visible".*?boolean (\w+)',
                           self.badge_log.read_text(), re.S)
        return (heard[-1][0], int(heard[-1][1]), heard[-1][2] == "true") if heard else None

    def wait_for_badge(self, count):
        entry = f"application://{CLIENT}.desktop"
        wait_until(lambda: self.badge() == (entry, count, count > 0), 20, lambda: f"badge {count}, not {self.badge()}")


@pytest.fixture(scope="module")
def road(tmp_path_factory):
    with Desktop(tmp_path_factory.mktemp("session"), "480x800") as desktop, Phone(environment=desktop.environment) as phone:
        notifications = Notifications(desktop, tmp_path_factory.mktemp("heard"))
        desktop.switch_screen_reader_on()
        phone.environment["TAVRO_SVC_RETRY_MS"] = "200"
        text = phone.command("start", "--detach", "--accessible").stdout
        phone.state = dict(line.split("=", 1) for line in text.splitlines())
        road = Keyboard(phone)
        road.notifications = notifications
        road.choose_account()
        yield road


@pytest.fixture(scope="module")
def report(road):
    """A report that was sent: its number at the desk and in the phone's store."""
    road.write_problem("Something else", "The camera", "is <b>black</b> & cold")
    road.send()
    arrived = road.arrived("The camera", 30)
    road.notifications.wait_for(SENT)
    number, = rows(road, STORE, "SELECT VOC_ID FROM TABLE_VOC")[0]
    return {"desk": arrived["id"], "phone": number}


def rows(road, path, statement):
    with contextlib.closing(sqlite3.connect(road.phone.storage() / path, timeout=10)) as database, database:
        return database.execute(statement).fetchall()


def kept(road, tag):
    """The number of what the phone knows to be shown under the tag, waited for."""
    found = wait_until(lambda: rows(road, PREFERENCES,
                                    f"SELECT id FROM posted_notification WHERE tag = '{tag}'"), 20, f"a row of {tag}")
    return found[0][0]


def wait_for_none_kept(road, number):
    wait_until(lambda: not rows(road, PREFERENCES, f"SELECT 1 FROM posted_notification WHERE tag = 'TAVRO_REPLY_{number}'"),
               20, "the answer's notification going")


def wait_for_report(road):
    road.screen.wait_for("Status: In process", timeout=20)
    road.screen.wait_for("is <b>black</b> & cold")


def answer(road, report, text):
    road.notifications.forget()
    road.desk.answer(report["desk"], IN_PROCESS, text)
    road.notifications.wait_for(REPLY, text)
    return kept(road, f"TAVRO_REPLY_{report['phone']}")


def test_sending_becomes_sent_in_the_same_notification(road, report):
    (_, text, actions, hints, lifetime), *_ = road.notifications.posted(SENDING)
    assert "is &lt;b&gt;black&lt;/b&gt; &amp; cold" in text and actions[0] == "default"
    assert (hints["resident"], lifetime) == (True, 0)
    (replaced, text, actions, hints, lifetime), = road.notifications.posted(SENT)
    assert replaced and "resident" not in hints and lifetime == -1
    assert not road.notifications._mock("GetMethodCalls", "CloseNotification")


def test_a_failure_is_told_and_its_touch_brings_the_history(road, report):
    road.phone.launch(operation="TAVRO_UPDATE_HISTORY", TAVRO_SERVER_UPLOAD_STATUS="TAVRO_SERVER_UPLOAD_FAIL",
                      TAVRO_SERVER_PUSH_NOTI_VOC_ID=str(report["phone"]))
    road.notifications.wait_for(FAILED)
    road.screen.activate("OK")  # the popup says so, too
    untagged = "SELECT id FROM posted_notification WHERE tag LIKE 'untagged%'"
    number = wait_until(lambda: len(shown := rows(road, PREFERENCES, untagged)) > 1 and shown, 20)[-1][0]
    road.phone.launch()
    road.screen.wait_for("Report a problem")
    road.notifications.touch(number)
    road.wait_for_row("The camera")


def test_a_newer_answer_replaces_the_older_and_its_touch_opens_the_report(road, report):
    number = answer(road, report, "We look at it")
    road.notifications.wait_for_badge(1)
    assert answer(road, report, "We have it") == number
    assert [call[0] for call in road.notifications.posted(REPLY)] == [number]
    road.notifications.touch(number)
    wait_for_report(road)
    road.notifications.wait_for_badge(0)
    wait_for_none_kept(road, report["phone"])


def test_nothing_is_told_about_a_report_that_is_being_deleted(road, report):
    thrown = stored.add_report(road.phone, "Thrown away", reply="none#Why?")
    push = {"operation": "TAVRO_UPDATE_HISTORY", "TAVRO_SERVER_PUSH_NOTI_STATUS": "TAVRO_SERVER_PUSH_NOTI_UPDATED",
            "TAVRO_SERVER_PUSH_NOTI_VOC_ID": str(thrown)}
    road.phone.launch(**push, TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS="Why?")
    kept(road, f"TAVRO_REPLY_{thrown}")
    road.back()
    road.screen.activate("More")
    road.screen.activate("Select")
    road.screen.activate(road.wait_for_row("Thrown away"))
    road.screen.activate("Delete")
    road.screen.wait_for("Delete this report?")
    road.press("Return")
    road.screen.wait_for("Undo")
    road.phone.launch(**push, TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS="Still there?")
    wait_for_none_kept(road, thrown)
    road.notifications.wait_for_badge(0)
    assert not [call for call in road.notifications.posted(REPLY) if "Still there?" in call[1]]


def test_an_answer_to_a_client_that_does_not_run_opens_the_report_when_touched(road, report):
    road.phone.end(how="TERM")
    number = answer(road, report, "It is mended")
    wait_until(lambda: CLIENT not in road.phone.status(), 20, "the end of the client that only brought the answer")
    road.notifications.wait_for_badge(1)
    road.notifications.touch(number, "another")
    road.notifications.touch(number)
    wait_for_report(road)
    assert road.phone.log().count("noti_action:TAVRO_NOTIFICATION_CLICKED") == 3  # each touch once


def test_a_touch_leaves_what_is_being_written_where_it_was(road, report):
    road.phone.end(how="TERM")
    number = answer(road, report, "While you write")
    road.phone.launch()
    road.write_problem("Something else", "Half", "a thought")
    road.notifications.touch(number)
    wait_for_report(road)
    road.back()
    road.screen.wait_for("Search")
    road.back()
    assert road.screen.text("Title") == "Half" and road.screen.text(HINT) == "a thought"


def test_news_that_are_about_no_report_bring_their_ids_back_unless_they_are_switched_off(road):
    for number in (6, 7):
        rows(road, STORE, "INSERT INTO TABLE_NOTIFICATIONS(NTFCTN_ID, NTFCTN_TITLE, NTFCTN_MESSAGE, NTFCTN_READ_STATUS)"
             f" VALUES({number}, 'Beta {number}', '<i>begins</i>' || CAST(x'F0' AS TEXT), 0)")
    def push(number):
        road.phone.launch(operation="TAVRO_NON_VOC_PUSH_NTFCTN", TAVRO_NOTIFICATION_NOTI_ID=str(number),
                          TAVRO_NOTIFICATION_BETA_ID="3")
    road.phone.preference("set", "tavro_notify", "boolean", "false")
    push(6)
    wait_until(lambda: "notifications are switched off" in road.phone.log(), 20)
    road.phone.preference("set", "tavro_notify", "boolean", "true")
    push(7)
    (_, text, *_), = road.notifications.wait_for("Beta 7")
    assert text == "&lt;i&gt;begins&lt;/i&gt;\ufffd" and not road.notifications.posted("Beta 6")
    road.notifications.touch(kept(road, "TAVRO_NEWS_7"))
    wait_until(lambda: {"betaId:3", "notiId:7"} <= set(re.findall(r"(?:beta|noti)Id:\d", road.phone.log())), 20)


def test_without_a_service_toasts_are_in_the_window_and_the_next_service_begins_anew(road, report):
    road.phone.end(how="TERM")
    answer(road, report, "Before the end")
    road.notifications.stop()
    wait_until(lambda: not rows(road, PREFERENCES, "SELECT id FROM posted_notification"), 20, "nothing being shown")
    road.phone.launch()
    road.write_problem("Something else", "Kept", "for later")
    road.back()
    road.screen.activate("Save as draft")
    road.screen.wait_for("Saved as draft in My Reports.")
    road.screen.wait_gone("Saved as draft in My Reports.")
    assert "the notification service failed" in road.phone.log()
    road.notifications.start()
    answer(road, report, "After the end")
    assert [call[0] for call in road.notifications.posted(REPLY)] == [0]


def test_a_touch_for_a_deleted_report_says_so_and_shows_the_history(road, report):
    road.phone.end(how="TERM")
    number = answer(road, report, "Too late")
    rows(road, STORE, f"DELETE FROM TABLE_VOC WHERE VOC_ID = {report['phone']}")
    road.notifications.touch(number)
    road.notifications.wait_for("This report is no longer on the phone.")
    road.wait_for_row("Kept")
