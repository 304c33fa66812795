"""Reports put into a phone's store from outside, as if the person had written them earlier."""

import contextlib
import sqlite3
import time

DRAFT, SENDING, FAILED, SUBMITTED, IN_PROCESS, COMPLETED, DROPPED = "6", "10", "11", "1", "1#2", "1#2#4", "1#5"
PROBLEM, IDEA = "TAVRO_DBMGR_BUG_REPORT", "TAVRO_DBMGR_SUGGESTION"


def connect(phone):
    return contextlib.closing(sqlite3.connect(phone.data() / ".tavro.db", timeout=10))


def column(phone, statement):
    """What a query of one column finds."""
    with connect(phone) as store:
        return [value for value, in store.execute(statement)]


def titles(phone):
    return column(phone, "SELECT VOC_TITLE_TEXT FROM TABLE_VOC_EXTENDED")


def add_report(phone, title, status=SUBMITTED, target="Hardware", text="", kind=PROBLEM, age=0, reply=None, dump=None):
    """Store one report, changed `age` seconds ago; returns its id. A reply is one that was not seen yet."""
    user = phone.preference("get", "tavro_username")
    changed = "#".join(str(int((time.time() - age - step) * 1000)) for step in range(status.count("#") + 1))
    with connect(phone) as store, store:
        added = store.execute(
            "INSERT INTO TABLE_VOC (VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_STATE, VOC_PUSH_COMMENTS, VOC_PUSH_READ, "
            "VOC_USER_NAME, VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION, VOC_DUMP_PATH) VALUES (?,?,?,?,?,?,?,?,?,?)",
            (kind, text, target, status, reply, 0 if reply else None, user, changed, changed, dump))
        store.execute("INSERT INTO TABLE_VOC_EXTENDED (VOC_ID, VOC_TITLE_TEXT) VALUES (?, ?)", (added.lastrowid, title))
    return added.lastrowid


def change_report(phone, voc_id, status, moves=True):
    """What the upload service stores when it hears of the report, which so comes first in the list."""
    now = str(int(time.time() * 1000)) if moves else None
    with connect(phone) as store, store:
        store.execute("UPDATE TABLE_VOC SET VOC_STATE = ?, VOC_DATE_OF_UPDATION = ifnull(?, VOC_DATE_OF_UPDATION) "
                      "WHERE VOC_ID = ?", (status, now, voc_id))


def remove_all_reports(phone):
    with connect(phone) as store, store:
        for table in ("TABLE_VOC", "TABLE_VOC_EXTENDED", "ATTACHMENT"):
            store.execute(f"DELETE FROM {table}")


def refresh_history(phone):
    """The service's word that the store has changed."""
    phone.launch(operation="TAVRO_UPDATE_HISTORY", TAVRO_SERVER_PUSH_NOTI_STATUS="TAVRO_SERVER_PUSH_NOTI_UPDATED")
