"""Crashes of a phone's programs, from the core to what the client is told: cores of our handler and of the machine's,
records of the journal, folders put in by hand, a machine that really uses the handler."""

import fcntl
import gzip
import json
import os
import pathlib
import random
import re
import shutil
import subprocess
import sys
import time

import pytest

from bus_watch import BusWatch
from phone_driver import BUILD, Phone, wait_until

SERVICE = "org.tizen.system.crash"
COMMAND = str(BUILD / "bin/tavro-phone")
KEPT = pathlib.Path("/var/lib/tavro-phone/cores")
PATTERN = pathlib.Path("/proc/sys/kernel/core_pattern")
MESSAGE_ID = "fc2e22bc6ee647b6b90729ab34a250b1"
CORE = b"\x7fELF" + random.Random(1).randbytes(300_000)


class Machine:
    """What the tests replace of the machine: the journal, the folder of cores, the handler's home."""

    def __init__(self, folder):
        self.folder, self.bin, self.cores = folder, folder / "bin", folder / "cores"
        self.bin.mkdir()
        self.cores.mkdir()
        self.handler = shutil.copy(BUILD / "bin/tavro-core-handler", folder / "core-handler")
        self.journal = folder / "journal"
        self.journal.touch()
        (self.bin / "journalctl").write_text(
            f"#!/bin/sh\ncase $* in *--follow*{MESSAGE_ID}*) exec tail -n +1 -f {self.journal} ;; esac\n"
            "echo $*; grep core /proc/self/limits\n")
        (self.bin / "journalctl").chmod(0o755)
        self.pid = 100_000
        self.environment = {"PATH": f"{self.bin}:{os.environ['PATH']}", "TAVRO_CORE_FOLDERS": f"{self.cores}:{KEPT}"}

    def put_core(self, program, content=CORE, phone=None, executable=None, note=None):
        """As a handler does; without a phone as the machine's own one. Returns what a record of it would say."""
        self.pid += 1
        facts = dict(pid=self.pid, uid=os.getuid(), signal=11, timestamp=int(time.time()) * 1_000_000,
                     comm=program[:15], exe=executable or f"/usr/bin/{program}")
        path = self.cores / f"core.{self.pid}"
        with open(self.cores / f".{self.pid}", "wb") as file:
            file.write(content)
            for name, value in {**facts, "tavro.phone": phone, "tavro.note": note}.items():
                if value is not None:
                    os.setxattr(file.fileno(), f"user.coredump.{name}", str(value).encode())
        os.rename(file.name, path)
        return {"_UID": str(os.getuid()), "COREDUMP_FILENAME": str(path),
                **{f"COREDUMP_{name.upper()}": str(value) for name, value in facts.items()}}

    def record(self, *lines):
        with open(self.journal, "a") as journal:
            journal.writelines((line if isinstance(line, str) else json.dumps(line)) + "\n" for line in lines)


@pytest.fixture(scope="module")
def machine(tmp_path_factory):
    return Machine(tmp_path_factory.mktemp("machine"))


@pytest.fixture(scope="module")
def phone(machine):
    with Phone(environment=machine.environment) as phone:
        phone.start("--no-client")
        phone.dumps = phone.storage() / "share/crash/dump"
        wait_until(phone.dumps.exists, what="the service")
        phone.watch = BusWatch(phone)
        yield phone
        phone.watch.close()


@pytest.fixture(autouse=True)
def no_folders(phone):
    for folder in phone.dumps.iterdir():
        shutil.rmtree(folder) if folder.is_dir() and not folder.is_symlink() else folder.unlink()


def requests(phone):
    """What the client was told, in order: {key: value} of each crash."""
    return [dict(zip(texts[3::2], texts[4::2])) for to, texts in phone.watch.messages()
            if to == "/corvane/tavro_lite" and texts[0] == "CRASH_PROCESS"]


def told(phone, program):
    """The folders that the client was told of for a program, in order."""
    folders = [request["TAVRO_CRASH_FOLDER"] for request in requests(phone)]
    return [name for name in folders if name.startswith(program + "_")]


def wait_told(phone, program, number=1):
    return wait_until(lambda: told(phone, program)[number - 1:], 30, f"a crash of {program} being told")[0]


def files(phone, name):
    folder = phone.dumps / name
    return {path.name.split(".", 1)[1]: path for path in folder.iterdir()}


def summary(phone, name):
    return files(phone, name)["cs"].read_text()


def crash_in_phone(phone, machine, program, dumpable=1):
    """A program of the phone, whose crash the handler is told of as the kernel does."""
    shutil.copy("/bin/sleep", machine.bin / program)
    (machine.folder / "core").write_bytes(CORE)
    phone.execute("sh", "-c", f"{machine.bin}/{program} 60 & until grep -qx {program} /proc/$!/comm; do :; done; "
                  f"{machine.handler} $! $! {os.getuid()} 6 $(date +%s) {dumpable} < {machine.folder}/core; kill $!")


def test_a_crash_is_a_private_folder_that_the_client_is_told_of_once(phone, machine):
    crash_in_phone(phone, machine, "camera")
    name = wait_told(phone, "camera")
    found = files(phone, name)
    assert set(found) == {"coredump.gz", "log.gz", "cs"}
    assert gzip.decompress(found["coredump.gz"].read_bytes()) == CORE
    log = gzip.decompress(found["log.gz"].read_bytes()).decode()
    assert f"_EXE={machine.bin}/camera" in log
    assert re.search(r"Max core file size +1 ", log)  # a helper's own crash is no next crash
    lines = summary(phone, name).splitlines()
    assert {"Program: camera", f"Executable: {machine.bin}/camera", "Signal: 6 (SIGABRT)", "Core: kept"} <= set(lines)
    assert [path.stat().st_mode & 0o777 for path in ((phone.dumps / name), *found.values())] == [0o700] + [0o600] * 3
    # A service that starts anew has seen it; what crashes meanwhile is told.
    phone.execute("kill", "-9", str(phone.status()[SERVICE]))
    crash_in_phone(phone, machine, "calendar")
    wait_told(phone, "calendar")
    assert told(phone, "camera") == [name]


def test_a_crash_of_the_client_itself_is_told_under_its_name(phone, machine):
    program = "corvane.tavro-lite"
    machine.put_core(program, phone=phone.directory, executable=BUILD / f"apps/{program}/bin/{program}")
    name = wait_told(phone, "corvane-tavro-lite")
    request = next(request for request in requests(phone) if request["TAVRO_CRASH_FOLDER"] == name)
    assert (request["TAVRO_CRASH_APP_ID"], request["TAVRO_CRASH_APP_NAME"]) == (program, "Vantor Community")
    assert "Version: " in summary(phone, name)


def test_cores_are_unpacked_as_far_as_there_is_a_tool(phone, machine):
    contents = {"plain": CORE, "broken": gzip.compress(CORE)[:-1000], "empty": b"", "refused": b"", "text": b"no core"}
    for tool in ("zstd", "xz", "lz4"):
        if shutil.which(tool):
            contents[tool] = subprocess.run([tool, "-c"], input=CORE, capture_output=True, check=True).stdout
    for kind, content in contents.items():
        machine.put_core(f"packed-{kind}", content, phone.directory, note="disk\nfull" if kind == "refused" else None)
    notes = {"broken": "kept, it breaks off", "empty": "not kept, the machine kept none",
             "text": "not kept, it is no core", "refused": "not kept, disk full"}
    for kind in contents:
        name = wait_told(phone, f"packed-{kind}")
        core = files(phone, name).get("coredump.gz")
        assert f"\nCore: {notes.get(kind, 'kept')}\n" in summary(phone, name)
        assert core or "not kept" in notes[kind]
        assert not core or kind == "broken" or gzip.decompress(core.read_bytes()) == CORE


def test_a_record_of_the_journal_adds_the_stack_and_what_is_no_crash_of_ours_is_skipped(phone, machine):
    secret = machine.folder / "secret"
    secret.write_bytes(CORE)
    noise = machine.put_core("alien", phone="/other/phone")
    forged = {**noise, "COREDUMP_PID": "7", "COREDUMP_EXE": "/usr/bin/forged", "_UID": "4242"}
    elsewhere = {**noise, "COREDUMP_PID": "8", "COREDUMP_EXE": "/usr/bin/claims", "COREDUMP_FILENAME": str(secret)}
    neighbour = {**noise, "COREDUMP_PID": "9", "COREDUMP_EXE": "/usr/bin/alien",
                 "COREDUMP_ENVIRON": "A=1\nTAVRO_PHONE_DIR=/other/phone\nB=2"}
    itself = {**noise, "COREDUMP_PID": "10", "COREDUMP_EXE": f"/x/{SERVICE}"}
    good = machine.put_core("gallery")
    machine.record("", "no json", "[1]", "{}", {**noise, "COREDUMP_PID": "x"}, {"COREDUMP_PID": "1", "_UID": "0"},
                   json.dumps({"MESSAGE": "y" * 5_000_000}), forged, elsewhere, neighbour, itself,
                   {**good, "MESSAGE": list(b"Process 1 dumped core.\n\nStack trace of thread 1:\n#0 snap \xff(gallery)\n")})
    name = wait_told(phone, "gallery")
    assert "#0 snap" in summary(phone, name)
    assert gzip.decompress(files(phone, name)["coredump.gz"].read_bytes()) == CORE
    assert "coredump.gz" not in files(phone, wait_told(phone, "claims"))
    machine.record(good)  # once more, as after the journal's own start
    machine.put_core("last", phone=phone.directory)
    wait_told(phone, "last")
    assert told(phone, "gallery") == [name]
    assert told(phone, "forged") + told(phone, "alien") + told(phone, SERVICE) == []


def test_a_core_that_vanishes_before_it_is_copied_leaves_a_folder_that_says_so(phone, machine):
    core = machine.put_core("vanishing")
    machine.put_core("present", phone=phone.directory)
    wait_told(phone, "present")  # both were seen; the first one still waits for its record
    os.unlink(core["COREDUMP_FILENAME"])
    assert "\nCore: not kept, it is gone\n" in summary(phone, wait_told(phone, "vanishing"))


def test_a_folder_that_is_put_in_is_told_of_when_it_has_become_quiet(phone, machine):
    outside, long_name = machine.folder / "moved_1_2", "x" * 240 + "_1_2"
    (phone.dumps / "link_1_2").symlink_to(machine.folder)
    (phone.dumps / "empty_1_2").mkdir()
    (phone.dumps / "file_1_2").write_text("no folder")
    for folder, text in ((phone.dumps / long_name, ""), (phone.dumps / "line\nbreak_1_2", ""),
                         (outside, "Application: org.maker.app\nApplication name: The \x01 App\nTime: nonsense\n")):
        folder.mkdir()
        (folder / "any.cs").write_text(text)
    outside.rename(phone.dumps / outside.name)
    growing = phone.dumps / "growing_1_2"
    growing.mkdir()
    for _ in range(8):
        with open(growing / "a.log.gz", "a") as log:
            log.write("more")
        assert told(phone, "growing") == []
        time.sleep(0.3)
    for program in ("growing", "moved", "x" * 240):
        wait_told(phone, program)
    moved = next(request for request in requests(phone) if request["TAVRO_CRASH_FOLDER"] == outside.name)
    assert (moved["TAVRO_CRASH_APP_ID"], moved["TAVRO_CRASH_APP_NAME"]) == ("org.maker.app", "The   App")
    assert abs(int(moved["TAVRO_CRASH_TIME"]) / 1000 - time.time()) < 600
    (phone.dumps / "empty_1_2" / "late.cs").write_text("Program: late\n")
    assert wait_told(phone, "empty") == "empty_1_2" and len(told(phone, "growing")) == 1
    assert told(phone, "link") + told(phone, "file") == []


def test_a_crash_loop_gets_three_folders_and_leaves_room_for_others(phone, machine):
    for _ in range(30):
        machine.put_core("looping", phone=phone.directory)
    wait_told(phone, "looping", 3)
    machine.put_core("other", phone=phone.directory)
    wait_told(phone, "other")
    assert len(told(phone, "looping")) == 3 and len({name.rsplit("_")[-1] for name in told(phone, "looping")}) == 3
    assert phone.log().count("looping crashes again and again") == 1


def test_only_the_newest_twenty_folders_within_500_megabytes_stay(phone, machine):
    for number in range(25):
        folder = phone.dumps / f"old_{number}_2"
        folder.mkdir()
        (folder / "a.cs").touch()
        os.utime(folder, (number + 1, number + 1))
    machine.put_core("newest", phone=phone.directory)
    newest = wait_told(phone, "newest")
    left = {path.name for path in phone.dumps.iterdir()}
    assert left == {newest, *(f"old_{number}_2" for number in range(6, 25))}
    with open(phone.dumps / "old_20_2" / "a.coredump.gz", "w") as large:
        large.truncate(600_000_000)
    os.utime(phone.dumps / "old_20_2", (21, 21))
    machine.put_core("later", phone=phone.directory)
    later = wait_told(phone, "later")
    assert {path.name for path in phone.dumps.iterdir()} == {later, newest, *(f"old_{n}_2" for n in range(21, 25))}


def test_a_core_that_the_disk_does_not_take_is_left_out_and_its_crash_is_told(phone, machine):
    service = str(phone.status()[SERVICE])
    phone.execute("prlimit", "--pid", service, "--fsize=1000000:")
    machine.put_core("large", b"\x7fELF" + random.randbytes(3_000_000), phone.directory)
    name = wait_told(phone, "large")
    phone.execute("prlimit", "--pid", service, "--fsize=unlimited:")
    assert set(files(phone, name)) == {"log.gz", "cs"} and phone.log().count("a core is not kept") == 1
    assert "\nCore: not kept, File too large\n" in summary(phone, name)
    assert [path.name for path in phone.dumps.parent.iterdir()] == ["dump"]


def test_the_handler_keeps_few_cores_of_who_has_most_and_lets_only_their_user_read_them(tmp_path):
    if os.getuid():
        pytest.skip("only root can give a file to another user")
    handler = shutil.copy(BUILD / "bin/tavro-core-handler", tmp_path / "core-handler")
    run = lambda *words: subprocess.run([handler, *map(str, words)], input=CORE).returncode
    (tmp_path / "cores").mkdir()
    others = os.open(tmp_path / "cores", os.O_RDONLY)
    fcntl.flock(others, fcntl.LOCK_EX)  # as any user may; it keeps nobody waiting
    lock = tmp_path / "cores/.lock-4243"
    lock.touch()
    os.utime(lock, (1, 1))
    for number in range(20):
        assert run(os.getpid(), 5, 4242 if number else 4243, 11, 1000 + number, 1 if number < 19 else 2) == 0
    os.close(others)
    kept = sorted((tmp_path / "cores").glob("core.*"), key=lambda path: path.name.split(".")[-2])
    assert [path.name.split(".")[-2] for path in kept] == [str(1000 + number) for number in (0, *range(5, 20))]
    assert lock.exists()  # another handler may hold it
    rights = [os.getxattr(path, "system.posix_acl_access") for path in kept[1:-1]]
    assert all((4242).to_bytes(4, "little") in right for right in rights)
    assert "system.posix_acl_access" not in os.listxattr(kept[-1])
    assert {(path.stat().st_uid, path.stat().st_mode & 0o007) for path in kept} == {(0, 0)}
    assert gzip.decompress(kept[0].read_bytes()) == CORE
    assert run(1, 2, 3) == 2 and run("../x", 1, 1, 1, 1, 1) == 2


SMALL_DISK = r'''
import os, pathlib, resource, subprocess, sys
handler, disk, limit = sys.argv[1:]
subprocess.run(["mount", "-t", "tmpfs", "-o", f"size={disk}", "none", os.path.dirname(handler) + "/cores"], check=True)
resource.setrlimit(resource.RLIMIT_FSIZE, (int(limit), int(limit)))
subprocess.run([handler, str(os.getpid()), "5", "0", "11", "1", "1"], stdin=sys.stdin, check=True)
core, = pathlib.Path(handler).parent.glob("cores/core.*")
print(core.stat().st_size, os.getxattr(core, "user.coredump.tavro.note").decode())
'''


@pytest.mark.parametrize("disk, limit, note", [("100M", 1 << 40, "nearly full"), ("400M", 100_000, "full")])
def test_a_disk_without_room_leaves_an_empty_core_that_tells_of_the_crash(tmp_path, disk, limit, note):
    if subprocess.run(["unshare", "-m", "true"]).returncode:
        pytest.skip("no small disk can be made here")
    handler = shutil.copy(BUILD / "bin/tavro-core-handler", tmp_path / "core-handler")
    (tmp_path / "cores").mkdir()
    (tmp_path / "core").write_bytes(CORE)
    with open(tmp_path / "core", "rb") as core:
        said = subprocess.run(["unshare", "-m", sys.executable, "-c", SMALL_DISK, handler, disk, str(limit)],
                              stdin=core, capture_output=True, text=True, check=True).stdout
    assert said == f"0 the disk is {note}\n"


@pytest.mark.parametrize("before, meanwhile, after", [
    ("core.%p", None, "core.%p"), ("|/usr/share/other/handler %p", None, "|/usr/share/other/handler %p"), ("", None, ""),
    ("core", "|/their/handler", "|/their/handler"),
    ("|/lib/systemd/systemd-coredump %P", None, "|/lib/systemd/systemd-coredump %P")])
def test_the_core_pattern_is_put_back_exactly(tmp_path, before, meanwhile, after):
    if os.getuid():
        pytest.skip("the command wants root")
    pattern = tmp_path / "proc/sys/kernel/core_pattern"
    pattern.parent.mkdir(parents=True)
    pattern.write_text(before + "\n")
    run = lambda action: subprocess.run([COMMAND, "crash-handler", action, "--root", tmp_path], text=True,
                                        capture_output=True, check=True).stdout
    said = run("enable")
    ours = pattern.read_text().strip()
    if "systemd" in before:
        assert ours == before and "nothing to change" in said
    else:
        assert f'was "{before}"' in said and len(ours) <= 127 and "enabled" in run("status")
        program = tmp_path / ours.split()[0][2:]
        assert program.stat().st_mode & 0o777 == 0o755 and "already" in run("enable")
        state = program.with_name("crash-handler").rename(tmp_path / "aside")
        assert subprocess.run([COMMAND, "crash-handler", "disable", "--root", tmp_path]).returncode == 1
        assert pattern.read_text().strip() == ours  # what it was is not known
        state.rename(program.with_name("crash-handler"))
    if meanwhile:
        pattern.write_text(meanwhile + "\n")
    said = run("disable")
    assert pattern.read_text() == after + "\n" and ("not ours" in said) == bool(meanwhile)
    assert "not enabled" in run("disable") and run("status").startswith("not enabled")
    assert not (tmp_path / "var/lib/tavro-phone").exists()


def enable_for_the_test():
    """Returns what takes it back; that also happens when this process is killed."""
    if os.getuid():
        pytest.skip("the machine's core pattern wants root")
    if subprocess.run([COMMAND, "crash-handler", "enable"], capture_output=True).returncode:
        pytest.skip("this machine's core pattern cannot be changed")
    guard = subprocess.Popen(["sh", "-c", f"read line; exec {COMMAND} crash-handler disable"], stdin=subprocess.PIPE,
                             stdout=subprocess.DEVNULL, start_new_session=True)
    return lambda: guard.communicate()


CRASHES = r"""
#include <pthread.h>
#include <stdlib.h>
#include <string.h>
int deeper(int level) { volatile char room[4096]; room[0] = (char)level; return deeper(level + 1) + room[0]; }
void *fall(void *nothing) { *(volatile int *)nothing = 1; return nothing; }
int main(int count, char **words) {
  pthread_t thread;
  if (strstr(words[0], "aborts")) abort();
  if (strstr(words[0], "overflows")) return deeper(count);
  if (strstr(words[0], "threads") && pthread_create(&thread, NULL, fall, NULL) == 0) pthread_join(thread, NULL);
  fall(NULL);
}
"""


def test_programs_that_really_crash_become_crash_folders(phone, machine):
    programs = {"falls": "SIGSEGV", "aborts": "SIGABRT", "overflows": "SIGSEGV", "threads": "SIGSEGV"}
    source = machine.folder / "crashes.c"
    source.write_text(CRASHES)
    subprocess.run(["gcc", "-g", "-pthread", "-o", machine.bin / "falls", source], check=True)
    for program in programs:
        shutil.copy(machine.bin / "falls", machine.bin / program) if program != "falls" else None
    if PATTERN.read_text().startswith("|"):
        pytest.skip("this machine has a crash handler of its own")
    was_there, before = KEPT.parent.exists(), PATTERN.read_text()
    take_back = enable_for_the_test()
    try:
        for program in programs:
            phone.execute(str(machine.bin / program), "--password=secret", check=False)
    finally:
        take_back()
    try:
        names = {program: wait_told(phone, program) for program in programs}
    finally:
        for core in KEPT.glob("core.*"):
            if os.getxattr(core, "user.coredump.exe").decode().startswith(str(machine.bin)):
                core.unlink()
        if not was_there:
            shutil.rmtree(KEPT.parent)
    assert PATTERN.read_text() == before
    for program, name in names.items():
        text = summary(phone, name)
        assert f"({programs[program]})" in text and "secret" not in text
        assert gzip.decompress(files(phone, name)["coredump.gz"].read_bytes()).startswith(b"\x7fELF")
        if shutil.which("gdb"):
            assert {"aborts": "abort", "overflows": "deeper"}.get(program, "fall") in text
