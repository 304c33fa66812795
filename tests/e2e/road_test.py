"""The road of a report on a real phone: what a person sees when all goes well, and what is left when parts of it
are killed or away."""

import os
import random
import signal
import socket
import subprocess
import sys
import threading
import time

import pytest

import stored_reports
from phone_driver import BUILD, ROOT, Phone, wait_until
from road import Road

NAMED_ROLES = ("push button", "entry", "list item", "check box", "toggle button")


class OwnDesk:
    """A desk outside the phone, which the test can take away and bring back at the same address."""

    def __init__(self, folder):
        self.folder = folder
        with socket.socket() as probe:
            probe.bind(("127.0.0.1", 0))
            self.port = probe.getsockname()[1]
        self.start()

    def start(self):
        self.process = subprocess.Popen([str(BUILD / "bin" / "tavro-desk"), "--data", str(self.folder), "--port",
                                         str(self.port)], stdout=subprocess.PIPE, text=True)
        lines = dict(self.process.stdout.readline().strip().split("=", 1) for _ in range(2))
        self.address, self.token = lines["desk"], lines["desk_token"]

    def kill(self):
        self.process.kill()
        self.process.wait()


@pytest.fixture(scope="module")
def desk(tmp_path_factory):
    desk = OwnDesk(tmp_path_factory.mktemp("desk"))
    yield desk
    desk.kill()


@pytest.fixture(scope="module")
def road(desk):
    environment = {"TAVRO_DESK_ENROLMENT": str(desk.folder / "enrolment"), "TAVRO_SVC_RETRY_MS": "200"}
    with Phone(environment=environment) as phone:
        phone.start("--accessible", "--desk", desk.address)
        phone.state["desk_token"] = desk.token
        road = Road(phone)
        road.choose_account()
        road.add_pictures("morning.png", "banner.jpg")
        yield road


def titles_at(desk_page):
    return [report["title"] for report in desk_page.reports() if desk_page.report(report["id"])["complete"]]


def test_demo_plays_the_road_to_its_end(tmp_path):
    environment = {**os.environ, "TAVRO_BUILD_DIR": str(BUILD)}
    result = subprocess.run([sys.executable, "-W", "ignore", str(ROOT / "tests/e2e/demo.py"), str(tmp_path)],
                            capture_output=True, text=True, env=environment, timeout=180)
    assert result.returncode == 0, result.stdout + result.stderr
    assert len(list(tmp_path.glob("*.png"))) == 13


def test_every_control_has_a_name(road):
    def check(where):
        nameless = [node.get_role_name() for node in road.screen._nodes()
                    if node.get_role_name() in NAMED_ROLES and not node.get_name()
                    and road.screen._matches(node, "", None)]
        assert not nameless, f"{where}: {nameless}"

    check("landing page")
    road.write_problem("Hardware", "Names", "every control has one")
    road.attach("banner.jpg")
    check("compose screen")
    road.screen.activate("Back")
    check("question before leaving")
    road.screen.activate("Save as draft")
    road.open_history()
    road.wait_for_row("Names", "Draft saved")
    check("history")
    road.back()


def test_draft_is_reopened_with_all_it_held_and_sent_once(road):
    road.open_history()
    road.screen.activate(road.wait_for_row("Names", "Draft saved"))
    assert road.screen.text("Title") == "Names"
    assert road.screen.text("What happened? What did you expect?") == "every control has one"
    road.screen.wait_for("Remove banner.jpg")
    road.has_seen_what_is_sent = False  # a draft is shown once more
    road.send()
    report = road.arrived("Names")
    assert [file["name"] for file in report["attachments"] if file["kind"] == "attachment"] == ["banner.jpg"]
    road.open_history()
    road.wait_for_row("Names", "Submitted")
    assert not [name for name in road.screen.names() if "Draft saved" in name]
    road.back()


def test_texts_are_shown_and_stored_as_typed(road):
    title = "O'Neil's <b>&amp; 'DROP TABLE"
    text = "'); DELETE FROM TABLE_VOC; -- <a href=x> \U0001F600 \u05E9\u05DC\u05D5\u05DD\n" + "long " * 40000
    road.write_problem("Something else", title, text)
    road.send()
    report = road.arrived(title)
    assert report["text"] == text
    road.open_history()
    road.wait_for_row(title)
    road.back()


def test_report_without_a_desk_waits_and_goes_out_by_itself(road, desk):
    desk.kill()
    road.write_problem("Battery", "Sent into the void", "The desk is away")
    road.send()
    road.open_history()
    road.wait_for_row("Sent into the void", "Send", timeout=10)
    wait_until(lambda: road.screen.look("OK"), 20, "word that support cannot be reached")
    road.screen.activate("OK")
    road.wait_for_row("Sent into the void", "Sending failed")
    desk.start()
    road.wait_for_row("Sent into the void", "Submitted", timeout=60)
    road.arrived("Sent into the void")
    road.back()


def test_person_is_told_what_is_missing(road):
    road.screen.activate("Report a problem")
    road.screen.activate("Send")
    road.screen.wait_for("Something is missing")
    road.screen.activate("OK")
    road.choose_target("Network")
    road.screen.activate("Send")
    road.screen.wait_for("Something is missing")
    road.screen.activate("OK")
    road.back()
    road.screen.wait_for("My Reports")


@pytest.mark.parametrize("victim", ["corvane.tavro-lite", "corvane.tavro-svc", "desk"])
def test_nothing_is_lost_when_a_part_is_killed_while_sending(road, desk, victim):
    random.seed(victim)
    sent = []
    for turn in range(4):
        title = f"killed {victim} {turn}"
        road.write_problem("Battery", title, "text of " + title)
        road.attach("banner.jpg")
        pid = desk.process.pid if victim == "desk" else wait_until(lambda: road.phone.status().get(victim))

        def strike(delay=random.uniform(0.0, 0.25), target=pid):
            time.sleep(delay)
            if victim == "desk":
                os.kill(target, signal.SIGKILL)
            else:
                road.phone.execute("kill", "-9", str(target), check=False)

        killer = threading.Thread(target=strike)
        killer.start()
        try:
            road.screen.activate("Send")
        except Exception as ended:  # the client died under the tap
            print("the tap was cut off:", ended)
        killer.join()
        if victim == "desk":
            desk.process.wait()
            desk.start()
        if victim == "corvane.tavro-lite":
            road.relaunch()
        else:
            road.screen.wait_for("Report a problem")
        sent.append(title)
    stored = [title for title in sent if title in stored_reports.titles(road.phone)]
    # A client that was killed before it began to store had nothing to lose but its own screen.
    assert victim == "corvane.tavro-lite" or stored == sent
    for title in stored:
        report = road.arrived(title, timeout=60)
        assert report["text"] == "text of " + title
        assert [f["name"] for f in report["attachments"] if f["kind"] == "attachment"] == ["banner.jpg"]
    assert len(titles_at(road.desk)) == len(set(titles_at(road.desk))), "a report reached the desk twice"
