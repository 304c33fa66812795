"""The system log on a real phone: from the switch on the compose screen to the desk and away again, and what a
person sees when the crash service cannot give it."""

import io
import os
import zipfile

import pytest

from phone_driver import wait_until
from road import Road

CRASH_SERVICE = "org.tizen.system.crash"
# What a problem about it need not carry.
TARGET = "Something else"


@pytest.fixture(scope="module")
def machine(tmp_path_factory):
    """Programs of the machine that the tests replace; put before its own."""
    return tmp_path_factory.mktemp("bin")


def make_journal(machine, words):
    path = machine / "journalctl"
    path.unlink(missing_ok=True)
    path.write_text(f"#!/bin/sh\n{words}\n")
    path.chmod(0o755)


@pytest.fixture(scope="module")
def road(machine):
    make_journal(machine, "echo a line of the journal")
    with Road.started(environment={"PATH": f"{machine}:{os.environ['PATH']}"}) as road:
        yield road


def logs(road):
    return sorted((road.phone.storage() / "media" / "QRT_debug").iterdir())


def one_log(road):
    return wait_until(lambda: len(logs(road)) == 1 and not logs(road)[0].name.startswith(".") and logs(road)[0],
                      what=lambda: f"one log in {logs(road)}")


def wait_for_description(road, text):
    wait_until(lambda: text in road.screen.description("System log"),
               what=lambda: f"'{text}' in '{road.screen.description('System log')}'")


def test_a_log_that_is_switched_on_reaches_the_desk_and_is_then_deleted(road):
    road.write_problem(TARGET, "With log", "Look at what the phone wrote")
    assert logs(road) == []
    road.screen.activate("System log")
    log = one_log(road)
    wait_for_description(road, "kB")
    assert CRASH_SERVICE in road.phone.status()
    assert log.stat().st_mode & 0o777 == 0o600
    content = log.read_bytes()
    archive = zipfile.ZipFile(io.BytesIO(content))
    assert archive.testzip() is None
    text = archive.read("system.log").decode()
    assert "a line of the journal" in text and "TAVRO" in text
    road.send()
    report = road.arrived("With log")
    sent = [file for file in report["attachments"] if file["kind"] == "system_log"]
    assert [(file["name"], file["size"], file["complete"]) for file in sent] == [(log.name, len(content), True)]
    page = f"/staff/reports/{report['id']}"
    assert log.name in road.desk.page(page)
    path = next(part.split('"')[0] for part in road.desk.page(page).split('href="') if f">{log.name}<" in part)
    assert road.desk._request(path) == content
    wait_until(lambda: logs(road) == [], what="the log being deleted")


def test_a_log_that_is_switched_off_again_is_deleted_at_once(road):
    road.write_problem(TARGET, "Without log", "Nothing of the phone goes with it")
    road.screen.activate("System log")
    one_log(road)
    wait_for_description(road, "kB")
    road.screen.activate("System log")
    wait_until(lambda: logs(road) == [], what="the log being deleted")
    road.send()
    assert "system_log" not in [file["kind"] for file in road.arrived("Without log")["attachments"]]


def test_a_crash_service_that_dies_is_seen_and_the_log_can_be_asked_for_again(road, machine):
    started = machine / "started"
    make_journal(machine, f"touch {started}; exec sleep 600")
    road.write_problem(TARGET, "Second try", "The first log failed")
    road.screen.activate("System log")
    wait_until(started.exists, what="the journal being read")
    wait_for_description(road, "Being collected")
    road.phone.execute("kill", "-9", str(road.phone.status()[CRASH_SERVICE]))
    wait_for_description(road, "Could not be collected")
    make_journal(machine, "echo again")
    road.screen.activate("System log")
    log = one_log(road)
    wait_for_description(road, "kB")
    assert b"again" in zipfile.ZipFile(log).read("system.log")
    # A person who discards the report keeps no log of it on the phone.
    road.screen.activate("Back")
    road.screen.activate("Discard")
    wait_until(lambda: logs(road) == [], what="the log being deleted")
