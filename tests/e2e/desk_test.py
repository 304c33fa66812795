"""The real feedback desk over HTTP: devices, files, staff, and what survives a kill."""
import hashlib
import http.client
import json
import os
import re
import sqlite3
import subprocess
import threading
import time
import urllib.parse

import pytest

from phone_driver import BUILD

DESK = str(BUILD / "bin" / "tavro-desk")
PNG = b"\x89PNG\r\n\x1a\n" + b"\0" * 64
PHONE = "phone-0123456789abcdef"


class Desk:
    def __init__(self, folder):
        self.folder = str(folder)
        self.device = None
        self.start()

    def start(self):
        self.process = subprocess.Popen([DESK, "--data", self.folder], stdout=subprocess.PIPE, text=True)
        lines = dict(self.process.stdout.readline().strip().split("=", 1) for _ in range(2))
        self.host, self.staff = urllib.parse.urlparse(lines["desk"]).netloc, lines["desk_token"]

    def kill(self):
        self.process.kill()
        self.process.wait()

    def call(self, method, path, body=None, token=None, **headers):
        connection = http.client.HTTPConnection(self.host, timeout=20)
        if isinstance(body, dict):
            body = json.dumps(body)
        if token:
            headers["Authorization"] = token if " " in token else "Bearer " + token
        names = {name.replace("_", "-"): value for name, value in headers.items()}
        connection.request(method, path, body, names)
        answer = connection.getresponse()
        data = answer.read()
        connection.close()
        is_json = answer.headers.get_content_type() == "application/json"
        return answer.status, json.loads(data) if is_json else data, answer.headers

    def register(self, phone=PHONE):
        with open(self.folder + "/enrolment", encoding="ascii") as file:
            secret = file.read().strip()
        status, body, _ = self.call("POST", "/api/v1/devices", {"phone": phone}, "Enrolment " + secret)
        assert status == 201
        return body

    def token(self):
        self.device = self.device or self.register()
        return self.device["token"]

    def report(self, key="k1", **fields):
        body = {"kind": "problem", "title": "Grey boxes", "text": "All grey", "app": "Gallery", **fields}
        status, answer, _ = self.call("POST", "/api/v1/reports", body, self.token(), Idempotency_Key=key)
        assert status == 201, answer
        return answer["id"]

    def put(self, report, number, data, name="a.png", kind="attachment", sha=None, **headers):
        path = f"/api/v1/reports/{report}/attachments/{number}?" + urllib.parse.urlencode(
            {"name": name, "kind": kind})
        return self.call("PUT", path, data, self.token(),
                         X_Content_SHA256=sha or hashlib.sha256(data).hexdigest(), **headers)

    def complete(self, report, attachments=(), **fields):
        return self.call("POST", f"/api/v1/reports/{report}/complete",
                         {"attachments": list(attachments), **fields}, self.token())

    def answer(self, report, status, reply=""):
        return self.call("POST", f"/api/v1/staff/reports/{report}/answers",
                         {"status": status, "reply": reply}, self.staff)

    def sign_in(self):
        status, _, headers = self.call("POST", "/staff/login", "token=" + self.staff,
                                       Content_Type="application/x-www-form-urlencoded")
        assert status == 303
        assert "HttpOnly" in headers["Set-Cookie"] and "SameSite=Strict" in headers["Set-Cookie"]
        return headers["Set-Cookie"].split(";")[0]


@pytest.fixture
def desk(tmp_path):
    running = Desk(tmp_path)
    yield running
    running.kill()


def test_only_those_with_the_right_secret_get_in(desk):
    registration = {"phone": PHONE}
    desk.token()
    for method, path, token, body, expected in [
            ("POST", "/api/v1/devices", None, registration, 403),
            ("POST", "/api/v1/devices", "Enrolment wrong", registration, 403),
            ("POST", "/api/v1/reports", None, {}, 401),
            ("POST", "/api/v1/reports", desk.staff, {}, 401),
            ("GET", "/api/v1/updates", "x" * 64, None, 401),
            ("GET", "/api/v1/staff/reports", desk.device["token"], None, 401),
            ("GET", "/staff", None, None, 303),
            ("GET", "/staff/reports/1/files/1", None, None, 303),
            ("GET", "/nothing", None, None, 404),
            ("DELETE", "/api/v1/reports", desk.device["token"], None, 405)]:
        assert desk.call(method, path, body, token)[0] == expected, (method, path, token)


def test_secrets_and_data_are_readable_by_the_owner_alone(desk):
    report = desk.report()
    desk.put(report, 1, PNG)
    for folder, _, files in os.walk(desk.folder):
        for name in files:
            assert os.stat(os.path.join(folder, name)).st_mode & 0o077 == 0, name
    with open(desk.folder + "/desk.db", "rb") as database, open(desk.folder + "/desk.db-wal", "rb") as log:
        assert desk.token().encode() not in database.read() + log.read()


def test_the_same_key_gives_the_same_report_also_after_registering_again(desk):
    report = desk.report("k1")
    assert desk.report("k1", title="Other words") == report
    assert desk.report("k2") != report
    old_token = desk.token()
    desk.device = desk.register()
    assert desk.report("k1") == report
    assert desk.call("GET", "/api/v1/updates", None, old_token)[0] == 401


def test_a_device_with_its_most_reports_can_still_finish_one_that_the_desk_knows(desk):
    report = desk.report("known")
    with sqlite3.connect(desk.folder + "/desk.db", timeout=10) as database:
        columns = ", ".join(row[1] for row in database.execute("PRAGMA table_info(report)")
                            if row[1] not in ("id", "idempotency_key"))
        database.execute("WITH RECURSIVE n(i) AS (SELECT 2 UNION ALL SELECT i + 1 FROM n WHERE i < 10000) "
                         f"INSERT INTO report(idempotency_key, {columns}) "
                         f"SELECT 'more' || i, {columns} FROM report, n")
    database.close()
    assert desk.report("known") == report
    status, answer, _ = desk.call("POST", "/api/v1/reports", {"kind": "idea"}, desk.token(),
                                  Idempotency_Key="new")
    assert status == 403 and "10000" in answer["error"]


def test_a_device_cannot_reach_the_report_of_another(desk):
    report = desk.report("k1")
    other = desk.register("another-phone-0123456789")["token"]
    assert desk.call("POST", f"/api/v1/reports/{report}/complete", {}, other)[0] == 404
    assert desk.call("GET", f"/api/v1/reports/{report}/attachments/1", None, other)[0] == 404
    assert desk.call("POST", "/api/v1/reports", {"kind": "idea"}, other, Idempotency_Key="k1")[0] == 503
    desk.complete(report)
    desk.answer(report, 2, "for the first phone")
    assert desk.call("GET", "/api/v1/updates?since=0", None, other)[1]["events"] == []


def test_a_file_goes_on_where_it_stopped_also_after_a_kill(desk):
    report, data = desk.report(), os.urandom(300000)
    sha = hashlib.sha256(data).hexdigest()
    path = f"/api/v1/reports/{report}/attachments/1"
    assert desk.put(report, 1, data[:100000], sha=sha, Content_Range="bytes 0-99999/300000")[0] == 202
    desk.kill()
    desk.start()
    state = desk.call("GET", path, None, desk.token())[1]
    assert (state["received"], state["complete"]) == (100000, False)
    assert desk.complete(report, [1])[0] == 409
    assert desk.put(report, 1, data[50:], sha=sha, Content_Range="bytes 50-299999/300000")[0] == 416
    status, state, _ = desk.put(report, 1, data[100000:], sha=sha, Content_Range="bytes 100000-299999/300000")
    assert (status, state["complete"]) == (200, True)
    assert desk.put(report, 1, data)[0] == 200  # the same again
    assert desk.put(report, 1, b"other")[0] == 409
    assert desk.complete(report, [1])[0] == 200
    with open(f"{desk.folder}/reports/{report}/1", "rb") as file:
        assert file.read() == data


def test_a_body_that_breaks_off_leaves_what_arrived(desk):
    report, data = desk.report(), b"x" * 200000
    connection = http.client.HTTPConnection(desk.host)
    connection.putrequest("PUT", f"/api/v1/reports/{report}/attachments/1?name=a&kind=attachment")
    for name, value in [("Authorization", "Bearer " + desk.token()), ("Content-Length", len(data)),
                        ("X-Content-SHA256", hashlib.sha256(data).hexdigest())]:
        connection.putheader(name, value)
    connection.endheaders(data[:150000])
    deadline = time.time() + 10
    received = 0
    while received < 150000 and time.time() < deadline:
        status, state, _ = desk.call("GET", f"/api/v1/reports/{report}/attachments/1", None, desk.token())
        received = state.get("received", 0) if status in (200, 202) else 0
    connection.close()
    status, state, _ = desk.put(report, 1, data[received:], sha=hashlib.sha256(data).hexdigest(),
                                Content_Range=f"bytes {received}-199999/200000")
    assert (received, status, state["complete"]) == (150000, 200, True)


def test_a_wrong_checksum_is_refused_and_the_file_can_be_sent_again(desk):
    report = desk.report()
    assert desk.put(report, 1, PNG, sha=hashlib.sha256(b"other").hexdigest())[0] == 422
    assert desk.complete(report, [1])[0] == 409
    assert desk.put(report, 1, PNG)[0] == 200


def test_what_is_too_large_or_malformed_is_refused_with_a_reason(desk):
    token, report = desk.token(), desk.report()

    def post(body, key="k9", **headers):
        return desk.call("POST", "/api/v1/reports", body, token, Idempotency_Key=key, **headers)

    for status, answer in [
            (400, post("not json")), (400, post(b'{"kind": "\xff"}')), (400, post("[1]")),
            (400, post({"kind": "idea"}, key="")), (422, post({"kind": "poem"})),
            (422, post({"kind": "idea", "text": "x" * 1000001})), (422, post({"kind": 7, "title": {"a": 1}})),
            (413, post(b" " * (8 * 1024 * 1024 + 1))), (411, post(iter([b"{}"]))),
            (413, desk.put(report, 1, PNG, Content_Range="bytes 0-71/99999999")),
            (422, desk.put(report, 33, PNG)), (400, desk.put(report, 1, PNG, sha="zz")),
            (400, desk.put(report, 1, PNG, kind="virus")),
            (400, desk.put(report, 1, PNG, Content_Range="bytes 0-5/99999")),
            (404, desk.put(999999999999, 1, PNG))]:
        assert answer[0] == status and answer[1]["error"], (status, answer)
    assert post({"kind": "idea", "text": "ü" * 200000})[0] == 201


def test_follow_up_stays_within_its_device_and_calls_staff_back_to_the_first_report(desk):
    first = desk.report("first")
    desk.complete(first)
    desk.answer(first, 3)
    foreign = desk.register("another-phone-0123456789")["token"]

    def follow_up(of, verdict, key, token=None):
        return desk.call("POST", "/api/v1/reports", {"kind": "problem", "follow_up_of": of, "verdict": verdict},
                         token or desk.token(), Idempotency_Key=key)

    for of, verdict, token, why in [(7, "works_now", None, "names no report"), (-1, "works_now", None, "names no report"),
                                    (str(first), "works_now", None, "names no report"), (first, "maybe", None, "verdict"),
                                    (first, "works_now", foreign, "names no report")]:
        status, answer, _ = follow_up(of, verdict, "refused", token)
        assert status == 422 and why in answer["error"], (of, verdict, answer)
    status, answer, _ = follow_up(first, "still_happens", "e")
    assert status == 201 and follow_up(first, "still_happens", "e")[1]["id"] == answer["id"]
    cookie = {"Cookie": desk.sign_in()}
    page = desk.call("GET", "/staff", **cookie)[1].decode()
    assert "Still happens" not in page and 'class="unread"' not in page, "it is not complete yet"
    desk.complete(answer["id"])
    page = desk.call("GET", "/staff", **cookie)[1].decode()
    assert page.count("Still happens") == 1 and page.count('class="unread"') == 2, "the first report and the follow-up"
    desk.answer(first, 2)
    assert "Still happens" not in desk.call("GET", "/staff", **cookie)[1].decode()


def test_news_arrive_while_a_device_waits_and_only_once(desk):
    report = desk.report()
    desk.complete(report)
    answers = []
    path = "/api/v1/updates?since=0&wait=20"
    waiting = threading.Thread(target=lambda: answers.append(desk.call("GET", path, None, desk.token())[1]))
    waiting.start()
    time.sleep(0.3)
    started = time.time()
    assert desk.answer(report, 2, "We look at it")[0] == 201
    waiting.join(5)
    assert time.time() - started < 2
    event = answers[0]["events"][0]
    assert (event["report"], event["status"], event["reply"], event["key"]) == (report, 2, "We look at it", "k1")
    path = f"/api/v1/updates?since={answers[0]['cursor']}&wait=1"
    assert desk.call("GET", path, None, desk.token())[1] == {"cursor": answers[0]["cursor"], "events": []}


def test_nothing_that_was_acknowledged_is_lost_by_a_kill(desk):
    report = desk.report()
    assert desk.put(report, 1, PNG)[0] == 200
    assert desk.complete(report, [1], missing=["gone.png"])[0] == 200
    assert desk.answer(report, 3, "Solved")[0] == 201
    staff = desk.staff
    desk.kill()
    desk.start()
    assert desk.staff == staff
    stored = desk.call("GET", f"/api/v1/staff/reports/{report}", None, staff)[1]
    assert (stored["status"], stored["missing"], stored["attachments"][0]["complete"]) == (3, ["gone.png"], True)
    assert desk.call("GET", "/api/v1/updates?since=0", None, desk.token())[1]["events"][0]["reply"] == "Solved"


def test_text_from_a_phone_is_only_ever_text_on_a_page(desk):
    evil = "<script>alert(1)</script>\"'&"
    report = desk.report(title=evil, text=evil, app=evil, user=evil)
    desk.put(report, 1, b"plain text", name="../../etc/passwd\r\nX: y<b>")
    desk.put(report, 2, PNG, name=evil)
    desk.put(report, 3, b"<html><script>1</script>", name="page.html")
    desk.put(report, 4, b"<i>status</i>", name="s.txt", kind="device_status")
    desk.complete(report, [1, 2, 3, 4], missing=[evil])
    desk.answer(report, 2, evil)
    second = desk.report("second", title=evil, text=evil, user=evil, follow_up_of=report, verdict="still_happens")
    desk.complete(second)
    cookie = desk.sign_in()
    for path in ("/staff", f"/staff/reports/{report}", f"/staff/reports/{second}"):
        status, page, headers = desk.call("GET", path, Cookie=cookie)
        assert status == 200 and b"&lt;script&gt;alert(1)" in page
        assert b"<script" not in page and b"<i>" not in page and b"<b>" not in page
        assert headers["Content-Security-Policy"].startswith("default-src 'none'")
    for number, expected in [(1, "attachment"), (2, "inline"), (3, "attachment")]:
        _, _, headers = desk.call("GET", f"/staff/reports/{report}/files/{number}", Cookie=cookie)
        assert headers["Content-Disposition"].startswith(expected + ";")
        assert headers["X-Content-Type-Options"] == "nosniff" and headers["X"] is None
    assert sorted(os.listdir(f"{desk.folder}/reports/{report}")) == ["1", "2", "3", "4"]


def test_staff_answer_on_the_page_and_a_foreign_form_is_refused(desk):
    cookie, report = desk.sign_in(), desk.report(title="Idea for the page")
    assert b"No reports yet" in desk.call("GET", "/staff", Cookie=cookie)[1]
    desk.complete(report)
    assert b'class="unread"' in desk.call("GET", "/staff", Cookie=cookie)[1]
    path = f"/staff/reports/{report}"
    page = desk.call("GET", path, Cookie=cookie)[1].decode()
    assert b'class="unread"' not in desk.call("GET", "/staff", Cookie=cookie)[1]
    secret = re.search(r'name="secret" value="(\w+)"', page).group(1)
    form = urllib.parse.urlencode({"secret": secret, "status": 2, "reply": "Grüße & Dank"})
    for fields, origin, expected in [(form, "http://evil.example", 403), ("status=2&reply=x", None, 403),
                                     (form.replace("status=2", "status=9"), None, 422),
                                     (form, "http://" + desk.host, 303)]:
        headers = {"Origin": origin} if origin else {}
        assert desk.call("POST", path + "/answers", fields, Cookie=cookie, **headers)[0] == expected, origin
    stored = desk.call("GET", "/api/v1" + path, None, desk.staff)[1]
    assert stored["answers"][0]["reply"] == "Grüße & Dank" and len(stored["answers"]) == 1
    assert b"In process" in desk.call("GET", "/staff?status=2", Cookie=cookie)[1]
    assert desk.call("POST", "/staff/logout", "secret=" + secret, Cookie=cookie)[0] == 303
    assert desk.call("GET", "/staff", Cookie=cookie)[0] == 303


@pytest.mark.parametrize("method, path, token, wrong", [
    ("POST", "/staff/login", None, 403), ("GET", "/api/v1/staff/reports", "guess", 401),
    ("POST", "/api/v1/devices", "Enrolment guess", 403)])
def test_wrong_secrets_are_limited_but_lock_nobody_out(desk, method, path, token, wrong):
    statuses = [desk.call(method, path, "token=guess", token)[0] for _ in range(60)]
    assert statuses[0] == wrong and statuses[-1] == 429
    desk.sign_in()
    assert desk.call("GET", "/api/v1/staff/reports", None, desk.staff)[0] == 200
    assert desk.report()


def test_a_desk_that_is_asked_to_end_ends_cleanly_and_bad_options_are_explained(desk, tmp_path):
    desk.process.terminate()
    assert desk.process.wait(5) == 0
    for arguments in (["--data"], [], ["--data", str(tmp_path), "--port", "99999"]):
        ended = subprocess.run([DESK, *arguments], capture_output=True, text=True, timeout=10)
        assert ended.returncode == 2 and "tavro-desk:" in ended.stderr
