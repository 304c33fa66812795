"""Launch requests from outside, every operation, to a client that runs and to one that does not: what it asks the
upload service for, what it logs, what it shows and whether it ends."""

import pytest

import stored_reports
from bus_watch import BusWatch
from phone_driver import CLIENT, Phone, Screen, wait_until

SHARE = "http://tizen.org/appcontrol/operation/share"
NEWS = ["TAVRO_OPERATION_TYPE_APP_UPDATE", "TAVRO_OPERATION_TYPE_GET_BETA_URLS", "TAVRO_OPERATION_TYPE_GET_MAX_LIMIT"]
START = ["TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS", "TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS"]
ENDS_ALONE = {"TAVRO_BOARDS_URLS", "DUMP_LOG_PROCESS"}

# operation, log lines behind that of the operation
ROWS = [
    ("CPMGR_ERROR", ["Error received from CPMGR"]),
    ("TAVRO_GET_BETA_URLS", ["beta urls obtained", "not there yet: community pages"]),
    ("TAVRO_LICENSE_URL", ["License url obtained", "not there yet: community pages"]),
    ("TAVRO_BOARDS_URLS", ["Boards urls obtained"]),
    ("TAVRO_BANNER_INFO", ["TAVRO_BANNER_INFO", "not there yet: the banner carousel"]),
    ("TAVRO_JOIN_BETA", ["TAVRO_JOIN_BETA", "tavro_join_beta_program_status_code:", "the banner carousel"]),
    ("TAVRO_GET_BETA_LIST", ["TAVRO_GET_BETA_LIST"]),
    ("TAVRO_GET_BETA_DETAILS", ["TAVRO_GET_BETA_DETAILS", "the details of a beta programme"]),
    ("TAVRO_QUIT_BETA", ["TAVRO_QUIT_BETA", "tavro_quit_beta_program_status_code:", "the banner carousel"]),
    ("TAVRO_OPT_IN_BETA", ["TAVRO_OPT_IN_BETA", "tavro_opt_in_status_code:"]),
    ("TAVRO_OPT_OUT_BETA", ["TAVRO_OPT_OUT_BETA", "tavro_opt_out_status_code:"]),
    ("TAVRO_GET_BETA_USER_STATUS", ["TAVRO_GET_BETA_USER_STATUS", "tavro_get_beta_user_status_code:", "banner"]),
    ("TAVRO_NON_VOC_PUSH_NTFCTN", ["TAVRO_NON_VOC_PUSH_NTFCTN", "notification 0 is not in the store"]),
    ("TAVRO_BETA_PUSH_NTFCTN", ["TAVRO_BETA_PUSH_NTFCTN", "notification 0 is not in the store"]),
    ("DUMP_LOG_PROCESS", ["dump log"]),
    (SHARE, []),
    ("TAVRO_UPDATE_HISTORY", ["app_control_get_extra_data(community_replies) failed:",
                              "app_control_get_extra_data(version_updated) failed:",
                              "app_control_get_extra_data(upload_status) failed:",
                              "app_control_get_extra_data(push_noti_status) failed:"]),
    ("NOBODY_KNOWS_THIS", ["app_control_get_extra_data(noti_action) failed:", *(f"key:{name}" for name in START)]),
]


class World:
    def __init__(self, phone):
        self.phone = phone
        self.watch = BusWatch(phone)
        self.log_path = phone.storage() / "share/log/platform.log"
        self.sign_in()
        phone.launch()  # makes the store
        self.screen = Screen(phone)
        self.screen.wait_for("Report a problem")
        wait_until(lambda: set(START) < set(self.watch.asked(0)), 30, "the start having asked for everything")

    def sign_in(self):
        self.phone.preference("set", "tavro_username", "string", "anna")

    def begin(self):
        """Only what comes from here on counts."""
        self.log_length = len(self.log_path.read_bytes())
        self.message_count = len(self.watch.messages())

    def log(self):
        return self.log_path.read_bytes()[self.log_length:].decode(errors="replace")

    def client(self):
        return self.phone.status().get(CLIENT)

    def wait_for_log(self, *lines):
        """The lines one after the other, whatever lies between."""
        def position():
            text, place = self.log(), 0
            for line in lines:
                place = text.find(line, place) + 1
                if place == 0:
                    return None
            return place
        wait_until(position, 30, lambda: f"{lines} in\n{self.log()}")

    def wait_for_end(self):
        wait_until(lambda: not self.client(), 30, "the client being gone")

    def notified(self):
        return self.watch.notifications(self.message_count)

    def add_report(self):
        """An answered report of the person, unread, with a system log: its id and the log's path."""
        log = self.phone.storage() / "media/QRT_debug/sent.zip"
        log.parent.mkdir(parents=True, exist_ok=True)
        log.write_text("log")
        with stored_reports.connect(self.phone) as store, store:
            voc_id = store.execute(
                "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_STATE, VOC_PUSH_COMMENTS, VOC_PUSH_READ, "
                "VOC_USER_NAME, VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION) VALUES('BUG', 'no sound', 'Hardware', "
                "'12#2', 'we look', 0, 'anna', '1700000000000', '1700000000000')").lastrowid
            store.execute("INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2) VALUES(?, 'Mute', ?)",
                          (voc_id, "/opt/usr/media/QRT_debug/sent.zip"))
        return voc_id, log


@pytest.fixture(scope="module")
def world():
    with Phone() as phone:
        phone.start("--accessible", "--no-client")
        world = World(phone)
        yield world
        world.watch.close()


@pytest.fixture
def account(world):
    """Somebody is signed in after a test that signs out, and has no reports."""
    yield
    world.sign_in()
    stored_reports.remove_all_reports(world.phone)


def check_asked(world, *further):
    """The three requests that come first, whatever else the life cycle sends; then the row's own."""
    def asked():
        return [name for name in world.watch.asked(world.message_count) if name in [*NEWS, *START]]
    wait_until(lambda: len(asked()) >= 3 + len(further), 30, lambda: f"the requests, not {asked()}")
    assert asked() == [*NEWS, *further]


@pytest.mark.parametrize("operation, lines", ROWS, ids=[row[0].rsplit("/")[-1] for row in ROWS])
@pytest.mark.parametrize("is_running", [True, False], ids=["running", "alone"])
def test_every_operation_asks_for_news_first_and_does_what_its_row_says(world, operation, lines, is_running):
    if not is_running:
        world.phone.end()
    client = world.client()
    world.begin()
    world.phone.launch(operation=operation)
    world.wait_for_log(*(f"key:{name}" for name in NEWS), f"op:{operation}\n", *lines)
    check_asked(world, *(START if operation == "NOBODY_KNOWS_THIS" else []))
    if not is_running and operation in ENDS_ALONE:
        world.wait_for_log("dump log inside exit", "app terminate", "total leak = 0")
        world.wait_for_end()
        return
    world.screen.wait_for("Report a problem", timeout=30)
    assert "dump log inside exit" not in world.log()
    assert not is_running or client and world.client() == client


UPDATE = "TAVRO_UPDATE_HISTORY"
SENT = {"TAVRO_SERVER_UPLOAD_STATUS": "TAVRO_SERVER_UPLOAD_SUCCESS"}
FAILED = {"TAVRO_SERVER_UPLOAD_STATUS": "TAVRO_SERVER_UPLOAD_FAIL"}
ANSWERED = {"TAVRO_SERVER_PUSH_NOTI_STATUS": "TAVRO_SERVER_PUSH_NOTI_UPDATED",
            "TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS": "we look"}
SENT_NOTE, FAILED_NOTE = ("Feedback sent.", "no sound"), ("Sending failed.", "no sound")
ANSWER_NOTE = ("Support has answered", "we look")

# what the request carries, whether somebody is signed in, log lines in order, notifications, whether the log file goes
MESSAGES = {
    "sent and answered": ({**SENT, **ANSWERED}, True,
                          ["upload_status:", "voc_id:", "content:no sound", "user_name:anna", "successfully uploaded",
                           "push_noti_status:", "user_name:anna"], [SENT_NOTE, ANSWER_NOTE], True),
    "answered before sent in the request": ({**ANSWERED, **SENT}, True,
                                            ["successfully uploaded", "push_noti_status:"],
                                            [SENT_NOTE, ANSWER_NOTE], True),
    "everything": ({**SENT, **ANSWERED, "TAVRO_COMM_PUSH": "TAVRO_PUSH_NUM_REPLIES", "TAVRO_APP_UPDATE_STATUS": "1"},
                   True, ["community_replies:TAVRO_PUSH_NUM_REPLIES", "unread community replies:", "version_updated:1",
                          "ret value :-1", "upload_status:", "successfully uploaded", "push_noti_status:"],
                   [SENT_NOTE, ANSWER_NOTE], True),
    "sent, nobody there": (SENT, False, ["user_name:(null)", "successfully uploaded"], [], True),
    "failed": (FAILED, True, ["voc_id:", "user_name:anna", "launch error popup"], [FAILED_NOTE], False),
    "failed, nobody there": (FAILED, False, ["user_name:(null)", "push_noti_status"], [], False),
    "answered": (ANSWERED, True, ["upload_status) failed:", "push_noti_status:", "user_name:anna"], [ANSWER_NOTE],
                 False),
    "another status": ({"TAVRO_SERVER_UPLOAD_STATUS": "none"}, True, ["user_name:anna", "push_noti_status"], [],
                       False),
}


@pytest.mark.parametrize("name", MESSAGES)
@pytest.mark.usefixtures("account")
def test_a_message_does_its_work_in_order_and_a_client_started_for_it_ends(world, name):
    extras, is_signed_in, lines, notes, is_log_gone = MESSAGES[name]
    world.phone.end()
    voc_id, log = world.add_report()
    if not is_signed_in:
        world.phone.preference("unset", "tavro_username")
    world.begin()
    world.phone.launch(operation=UPDATE, TAVRO_SERVER_PUSH_NOTI_VOC_ID=str(voc_id), **extras)
    ends = [*notes] != [FAILED_NOTE] and (notes or is_log_gone)
    world.wait_for_log(*lines, *(["app terminate", "total leak = 0"] if ends else []))
    if ends:
        world.wait_for_end()
    elif notes:
        world.screen.wait_for("Support cannot be reached")
    else:
        world.screen.wait_for("Report a problem" if is_signed_in else "Continue")
        assert "launch error popup" not in world.log()
    wait_until(lambda: len(world.notified()) >= len(notes), 30, lambda: f"{notes}, not {world.notified()}")
    assert world.notified() == notes
    assert log.exists() != is_log_gone


@pytest.mark.usefixtures("account")
def test_an_update_that_must_come_first_leaves_the_rest_alone_and_cannot_be_passed_by(world):
    world.phone.launch()
    world.screen.wait_for("Report a problem")
    voc_id, log = world.add_report()
    for key, value in (("result_code", "2"), ("version_change", "major"), ("version", "99.0")):
        world.phone.preference("set", f"tavro_app_{key}", "string", value)
    world.begin()
    world.phone.launch(operation=UPDATE, TAVRO_SERVER_PUSH_NOTI_VOC_ID=str(voc_id), TAVRO_APP_UPDATE_STATUS="any",
                       **SENT, **ANSWERED)
    world.wait_for_log("version_updated:any", "need to update", "ret value :1", "update is mandatory")
    world.screen.activate("Update")
    world.screen.wait_for("No application store")
    assert "upload_status" not in world.log() and log.exists() and not world.notified()
    world.phone.launch(operation="TAVRO_USER_LOGOUT")
    world.screen.wait_for("Continue")
    assert world.screen.look("No application store"), "the next person passes it by no more than the last"
    world.phone.execute("xdotool", "key", "Escape")
    world.wait_for_log("app terminate", "total leak = 0")
    world.wait_for_end()
    # Without a window the popup waits for the first launch request, whichever comes.
    world.phone.launch(operation="TAVRO_GET_BETA_LIST")
    world.screen.activate("Exit")
    world.wait_for_end()
    world.phone.preference("unset", "tavro_app_result_code")


@pytest.mark.usefixtures("account")
def test_log_out_keeps_what_is_being_written_and_goes_back_to_the_account_page(world):
    world.phone.launch()
    world.screen.activate("Report a problem")
    world.screen.type_text("Title", "Half a report")
    world.phone.preference("set", "tavro_cookie_val", "string", "secret")
    world.phone.launch(operation="TAVRO_USER_LOGOUT")
    world.screen.wait_for("You are signed out. What you were writing is kept as a draft under your name.")
    assert not world.screen.look("Title")
    for key in ("tavro_username", "tavro_cookie_val"):
        assert world.phone.preference("get", key, check=False) == ""
    with stored_reports.connect(world.phone) as store, store:
        assert store.execute("SELECT VOC_TITLE_TEXT, VOC_STATE, VOC_USER_NAME FROM TABLE_VOC JOIN TABLE_VOC_EXTENDED "
                             "USING (VOC_ID)").fetchall() == [("Half a report", "6", "anna")]
    world.phone.end()
    world.begin()
    world.phone.launch(operation="TAVRO_USER_LOGOUT")
    check_asked(world)
    world.screen.wait_for("You are signed out. Your reports stay on this phone: choose the same name to see them again.")


@pytest.mark.parametrize("kind, lines", [
    ("TAVRO_NOTIFICATION_NONVOC", ["betaId:4", "app_control_get_extra_data(notiId) failed:"]),
    ("TAVRO_NOTIFICATION_VOC", []),
])
def test_a_touched_notification_that_concerns_no_report_tells_its_ids(world, kind, lines):
    world.begin()
    world.phone.launch(TAVRO_NOTIFICATION_EVENT="TAVRO_NOTIFICATION_CLICKED", TAVRO_NOTIFICATION_TYPE=kind,
                       TAVRO_NOTIFICATION_BETA_ID="4")
    world.phone.launch(operation="TAVRO_GET_BETA_LIST")
    world.wait_for_log("noti_action:TAVRO_NOTIFICATION_CLICKED", *lines, "op:TAVRO_GET_BETA_LIST")
    assert lines or "betaId" not in world.log()
    check_asked(world, *NEWS)


@pytest.mark.usefixtures("account")
def test_a_touched_notification_without_a_report_uncovers_the_history(world):
    click = {"TAVRO_NOTIFICATION_EVENT": "TAVRO_NOTIFICATION_CLICKED",
             "TAVRO_NOTIFICATION_TYPE": "TAVRO_NOTIFICATION_VOC"}
    voc_id, _ = world.add_report()
    world.phone.launch(**click, TAVRO_NOTIFICATION_VOC_ID=str(voc_id))
    world.screen.wait_for("Delete this report")
    world.phone.launch(**click)
    world.screen.wait_gone("Delete this report")
    assert world.screen.look("My Reports")


def test_a_request_of_a_crash_and_values_that_make_no_sense_leave_the_client_in_order(world):
    world.phone.end()
    world.phone.launch()
    world.screen.wait_for("Report a problem")
    client = world.client()
    assert world.phone.command("launch", CLIENT, b"KEY=\xff", check=False).returncode == 2
    for bad in ("424242", "-1", "x", "1" * 100000):
        world.phone.launch(operation=UPDATE, TAVRO_SERVER_PUSH_NOTI_VOC_ID=bad, **SENT, **ANSWERED)
        world.phone.launch(TAVRO_NOTIFICATION_EVENT="TAVRO_NOTIFICATION_CLICKED",
                           TAVRO_NOTIFICATION_TYPE="TAVRO_NOTIFICATION_VOC", TAVRO_NOTIFICATION_VOC_ID=bad)
    world.begin()
    world.phone.command("launch", CLIENT, "--operation", UPDATE, "TAVRO_SERVER_UPLOAD_STATUS=a",
                        "TAVRO_SERVER_UPLOAD_STATUS=b")
    world.wait_for_log("app_control_get_extra_data(upload_status) failed:")
    world.phone.launch(operation="CRASH_PROCESS")
    world.wait_for_log(*(f"key:{name}" for name in NEWS), "op:CRASH_PROCESS\n")
    assert world.client() == client
