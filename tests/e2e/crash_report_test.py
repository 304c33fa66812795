"""From a crash to its report on a real phone: the question, what silences it, the dump on its way to the desk."""

import io
import os
import random
import shutil
import time
import zipfile

import pytest

from phone_driver import CLIENT, Phone, wait_until
from road import Road

HINT = "What were you doing when it stopped?"
MEGABYTE = 1024 * 1024


@pytest.fixture(scope="module")
def road(tmp_path_factory):
    # What else crashes on the machine is none of this phone's.
    with Phone(environment={"TAVRO_CORE_FOLDERS": str(tmp_path_factory.mktemp("cores"))}) as phone:
        phone.start("--accessible", "--no-client")
        yield Road(phone)


def client(road):
    return road.phone.status().get(CLIENT)


def wait_until_client_ends(road):
    wait_until(lambda: not client(road), 20, "the client having ended")


def crash(road, app_id, app_name, **more):
    road.phone.launch(operation="CRASH_PROCESS", TAVRO_CRASH_APP_ID=app_id, TAVRO_CRASH_APP_NAME=app_name, **more)


def add_folder(road, name, app_id, core=b"memory of the program"):
    """The crash service finds it too and tells of the same crash."""
    folder = road.phone.storage() / "share/crash/dump" / name
    folder.mkdir(parents=True)
    (folder / "core.coredump.gz").write_bytes(core)
    (folder / "app.cs").write_text(f"Application: {app_id}\nSignal: 11 (SIGSEGV)\n#0 play_next (player.c:40)\n")
    return folder


def archives(road):
    folder = road.phone.storage() / "media/Orbel"
    return sorted(path.name for path in folder.iterdir()) if folder.exists() else []


def never(road):
    return road.phone.preference("get", "tavro_crash_never", check=False)


def test_only_a_person_who_is_signed_in_is_asked_and_once_a_day(road):
    crash(road, "org.example.music", "Music player")
    wait_until_client_ends(road)
    assert "nobody is signed in" in road.phone.log()
    road.phone.preference("set", "tavro_username", "string", "anna")
    crash(road, "org.example.music", "Music <b>player</b>\n")
    question = "Music <b>player</b> stopped"
    assert "First time this week" in road.screen.description(question)
    crash(road, "org.example.music", "Music player")  # stands for the same question
    wait_until(lambda: "Crashed 2 times this week" in road.screen.description(question), what="the count")
    road.screen.activate("Not now")
    wait_until_client_ends(road)
    crash(road, "org.example.music", "Music player")
    wait_until_client_ends(road)
    assert "it was asked about today" in road.phone.log()


def test_never_is_remembered_and_can_be_taken_back(road):
    crash(road, "org.example.radio", "Radio")
    road.screen.activate("Never for this app")
    road.screen.wait_for("Not asked again")
    assert "org.example.radio" in never(road)
    road.screen.activate("Undo")
    wait_until_client_ends(road)
    assert "org.example.radio" not in never(road)
    # Two at once are asked about one after the other.
    crash(road, "org.example.camera", "Camera")
    road.screen.wait_for("Camera stopped")
    crash(road, "org.example.clock", "Clock")
    road.screen.activate("Never for this app")
    road.screen.activate("OK")
    road.screen.wait_for("Clock stopped")
    road.phone.execute("xdotool", "key", "Escape")
    wait_until_client_ends(road)
    assert never(road).split() == ["org.example.camera"]
    crash(road, "org.example.camera", "Camera")
    wait_until_client_ends(road)
    assert "the person said never" in road.phone.log()


def test_the_dump_of_the_crash_that_is_reported_reaches_the_desk(road):
    add_folder(road, "mail_17_aa", "org.example.mail")
    other = add_folder(road, "camera_18_bb", "org.example.camera")
    os.utime(other, (time.time() + 3600,) * 2)  # newer by a clock that was set back since
    crash(road, "org.example.mail", "Mail", TAVRO_CRASH_FOLDER="mail_17_aa")
    road.screen.activate("Report")
    road.screen.wait_for("About: Mail")
    assert road.screen.text("Title") == "Mail stopped"
    assert "tavro_aa.zip" in road.screen.description("Crash dump")
    road.screen.activate("Crash dump")
    wait_until(lambda: any("play_next" in name for name in road.screen.names()) or
               "play_next" in road.screen.text("Crash dump", "entry"), what="the summary")
    road.back()
    wait_until(lambda: "kB" in road.screen.description("System log"), what="the log that came by itself")
    road.screen.type_text(HINT, "I listened to a letter")
    road.send()
    report = road.arrived("Mail stopped")
    dump = [file for file in report["attachments"] if file["name"] == "tavro_aa.zip"]
    assert len(dump) == 1 and dump[0]["complete"]
    page = road.desk.page(f"/staff/reports/{report['id']}")
    path = next(part.split('"')[0] for part in page.split('href="') if ">tavro_aa.zip<" in part)
    sent = zipfile.ZipFile(io.BytesIO(road.desk._request(path)))
    assert sent.testzip() is None and "core.coredump.gz" in sent.namelist()
    assert "system_log" in [file["kind"] for file in report["attachments"]]
    wait_until(lambda: archives(road) == [], what="the archive being deleted")
    shutil.rmtree(other)  # the crash service keeps what is newest


def test_a_crash_waits_for_what_is_being_written_and_is_told_without_a_dump(road):
    road.write_problem("Something else", "Half a", "thought")
    crash(road, "org.example.maps", "Maps", TAVRO_CRASH_FOLDER="gone_1_2")
    wait_until(lambda: "CRASH_PROCESS" in road.phone.log(), what="the crash being told")
    assert road.screen.text("Title") == "Half a" and not road.screen.look("Maps stopped")
    road.back()
    road.screen.activate("Discard")
    road.screen.activate("Report")
    road.screen.wait_for("About: Maps")
    assert "None was found" in road.screen.description("Crash dump")
    road.back()  # nothing to lose
    road.screen.wait_for("My Reports")
    assert archives(road) == []


def test_collecting_can_be_cancelled_and_leaves_nothing(road):
    folder = add_folder(road, "slow_19_cc", "org.example.slow")
    with open(folder / "core.coredump.gz", "wb") as core:
        core.truncate(20_000 * MEGABYTE)
    crash(road, "org.example.slow", "Slow", TAVRO_CRASH_FOLDER="slow_19_cc")
    road.screen.activate("Report")
    road.screen.wait_for("Collecting details")
    road.screen.activate("Cancel")
    road.screen.wait_gone("Collecting details")
    wait_until(lambda: archives(road) == [], what="nothing being left")
    assert not road.screen.look("About: Slow") and road.screen.look("My Reports")
    os.truncate(folder / "core.coredump.gz", 1)


def test_a_killed_crash_report_comes_back_and_goes_without_too_large_a_dump(road):
    add_folder(road, "big_20_dd", "org.example.big", random.Random(1).randbytes(32 * MEGABYTE))
    crash(road, "org.example.big", "Big", TAVRO_CRASH_FOLDER="big_20_dd")
    road.screen.activate("Report")
    crash(road, "org.example.big", "Big", TAVRO_CRASH_FOLDER="gone_1_2")  # again, while that is collected
    road.screen.wait_for("About: Big", timeout=20)
    assert "tavro_dd.zip" in road.screen.description("Crash dump")
    kept = road.phone.data() / ".tavro.compose"
    wait_until(lambda: kept.exists() and "tavro_dd.zip" in kept.read_text(), what="the report being kept")
    road.phone.end()
    road.phone.launch()
    road.screen.activate("Go on")
    assert "tavro_dd.zip" in road.screen.description("Crash dump")
    road.screen.activate("Send")
    road.screen.wait_for("Too large to send")
    assert archives(road) == ["tavro_dd.zip"]
    road.screen.activate("Leave the dump out")
    wait_until(lambda: archives(road) == [], what="the dump being deleted")
    road.screen.wait_for("My Reports")
    names = [file["name"] for file in road.arrived("Big stopped")["attachments"]]
    assert names and "tavro_dd.zip" not in names
