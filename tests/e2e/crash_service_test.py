"""The crash service on a phone of its own, asked over the bus: what lies in the log folder then, and what the client
is answered."""

import os
import random
import time
import zipfile

import pytest

from phone_driver import Phone, wait_until

SERVICE = "org.tizen.system.crash"
CALL = ["gdbus", "call", "--session", "-d", SERVICE, "-o", "/Org/Tizen/System/Crash/Crash", "-m"]


@pytest.fixture
def phone(tmp_path):
    (tmp_path / "bin").mkdir()
    with Phone(environment={"PATH": f"{tmp_path / 'bin'}:{os.environ['PATH']}"}) as phone:
        phone.bin = tmp_path / "bin"
        make_journal(phone, "true")
        phone.start("--no-client")
        phone.media = phone.storage() / "media"
        phone.logs = phone.media / "QRT_debug"
        with open(phone.storage() / "share/log/platform.log", "a") as log:
            log.write(platform_line(0, "the phone is up"))
        yield phone


def make_journal(phone, words):
    (phone.bin / "journalctl").write_text(f"#!/bin/sh\ncase $* in *--follow*) exec sleep 600 ;; esac\n{words}\n")
    (phone.bin / "journalctl").chmod(0o755)


def ask(phone, method="dump_log"):
    words = ["2", "none", "none"] if method == "dump_log" else ["2", "none"]
    phone.execute(*CALL, f"{SERVICE}.Crash.{method}", *words)


def answers(phone):
    """What the client was told, in order: names of files, or reasons."""
    lines = (line.split(" > TAVRO_DUMP_LOG_") for line in phone.log().splitlines())
    return [line[1].split(":", 1)[1] for line in lines if len(line) == 2]


def answer(phone, number=1):
    return wait_until(lambda: len(answers(phone)) >= number and answers(phone)[number - 1], what="the answer")


def unpack(phone, name):
    archive = zipfile.ZipFile(phone.logs / name)
    assert archive.testzip() is None and archive.namelist() == ["system.log"]
    return archive.read("system.log").decode()


def platform_line(minutes_ago, text):
    stamp = time.strftime("%Y-%m-%d %H:%M:%S", time.localtime(time.time() - minutes_ago * 60))
    return f"{stamp}.000 I/TEST(1): {text}\n"


def test_a_log_is_the_last_hour_of_both_sources_and_of_a_long_one_the_newest_lines(phone):
    log = phone.storage() / "share/log/platform.log"
    log.with_name("platform.log.1").write_text(platform_line(70, "too old") + platform_line(50, "rotated"))
    make_journal(phone, "seq -f 'journal line %06.0f' 200000; echo hint >&2")
    ask(phone)
    journal, platform = unpack(phone, answer(phone))[len("---- journal ----\n"):].split("---- platform log ----\n")
    lines = journal.splitlines()
    assert lines[0].startswith("journal line ") and lines[-1] == "journal line 200000"
    assert 1024 * 1024 - 100 < len(journal) <= 1024 * 1024
    assert "rotated\n" in platform and "too old" not in platform
    assert [path.stat().st_mode & 0o777 for path in (phone.logs, *phone.logs.iterdir())] == [0o700, 0o600]


def full_disk(phone):
    noise = "".join(platform_line(0, str(random.random())) for _ in range(2000))
    (phone.storage() / "share/log/platform.log.1").write_text(noise)
    # A file that may not grow; the answer's own line in the log comes from another program.
    pid = wait_until(lambda: phone.status().get(SERVICE), what="the service")
    phone.execute("prlimit", "--pid", str(pid), "--fsize=8192")


def file_for_folder(phone):
    phone.logs.rmdir()
    phone.logs.write_text("a file")


def planted_link(phone):
    (phone.media / "other").write_text("kept")
    (phone.logs / ".SystemLog.part").symlink_to("../other")


@pytest.mark.parametrize("prepare, reason, left", [
    (full_disk, "the log was not written", []),
    (file_for_folder, "no log folder", None),
    (planted_link, "no file for the log", [".SystemLog.part"])])
def test_a_log_that_cannot_be_written_is_answered_and_leaves_nothing(phone, prepare, reason, left):
    prepare(phone)
    ask(phone)
    assert reason in answer(phone)
    assert left is None or [path.name for path in phone.logs.iterdir()] == left
    assert not (phone.media / "other").exists() or (phone.media / "other").read_text() == "kept"


def test_requests_are_answered_one_by_one_while_the_bus_is_served(phone):
    dumps, outside = phone.storage() / "share/crash/dump", phone.storage() / "outside"
    (dumps / "one").mkdir(parents=True)
    outside.mkdir()
    (dumps / "link").symlink_to(outside)
    os.mkfifo(phone.bin / "gate")
    make_journal(phone, f"read line < {phone.bin / 'gate'}; echo $line")
    for method in ("dump_log", "delete_dump", "dump_log"):
        ask(phone, method)  # returns when the call was taken
    assert (dumps / "one").exists() and answers(phone) == []
    for number, text in enumerate(("first", "second"), 1):
        (phone.bin / "gate").write_text(text + "\n")
        assert text in unpack(phone, answer(phone, number))
    assert list(dumps.iterdir()) == [] and outside.exists()


def test_an_end_in_the_middle_leaves_no_file_and_starts_no_client(phone):
    os.mkfifo(phone.bin / "gate")
    make_journal(phone, f"read line < {phone.bin / 'gate'}")
    ask(phone)
    with open(phone.bin / "gate", "w"):  # opens when the journal is being read
        pid = str(phone.status()[SERVICE])
        phone.execute("kill", "-TERM", pid)
        wait_until(lambda: phone.execute("kill", "-0", pid, check=False).returncode, what="the end of the service")
    assert list(phone.logs.iterdir()) == []
    wait_until(lambda: phone.status().get(SERVICE), what="its next start")
    assert "corvane.tavro-lite" not in phone.status() and answers(phone) == []
