"""Nothing that was typed is lost, whatever ends the client; and what other applications share with it."""

import pytest

import stored_reports
from phone_driver import CLIENT, wait_until
from road import Road

HINT = "What happened? What did you expect?"
SHARE = "http://tizen.org/appcontrol/operation/share"
PATH = "http://tizen.org/appcontrol/data/path"


@pytest.fixture(scope="module")
def road():
    with Road.started("morning.png", "banner.jpg") as road:
        yield road


@pytest.fixture(autouse=True)
def landing_page(road):
    """Each test begins and ends with a client on its landing page and nothing kept."""
    road.phone.launch()
    road.screen.wait_for("Report a problem")
    yield
    road.phone.end()
    for path in road.kept_files():
        path.unlink()


def drafts(road):
    return stored_reports.column(road.phone, "SELECT VOC_TITLE_TEXT FROM TABLE_VOC JOIN TABLE_VOC_EXTENDED "
                                             "USING (VOC_ID) WHERE VOC_STATE = '6'")


def share(road, *words, uri=None):
    options = ["--uri", uri] if uri else []
    road.phone.command("launch", CLIENT, "--operation", SHARE, *options, *words)


@pytest.mark.parametrize("how", ["KILL", "SEGV"])
def test_killed_while_writing_goes_on_where_it_was(road, how):
    text = "It's <b>loud</b> &amp;\nsince \U0001F600"
    road.write_problem("Hardware", f"Kept after {how}", text)
    road.attach("banner.jpg", "morning.png")
    road.wait_until_kept("morning.png")
    road.phone.end(how=how)
    road.phone.launch()
    road.screen.wait_for("Go on writing?")
    road.screen.activate("Go on")
    road.screen.wait_for("About: Hardware")
    assert road.screen.text("Title") == f"Kept after {how}"
    assert road.screen.text(HINT) == text
    for name in ("banner.jpg", "morning.png"):
        assert [shown for shown in road.screen.names() if name in shown], name
    assert drafts(road) == []


def test_kept_as_a_draft_it_waits_in_the_history_once(road):
    road.write_idea("Something else", "An idea that waits", "to be told")
    road.wait_until_kept("to be told")
    road.phone.end()
    # A message wakes the client, which ends again without having shown or lost anything.
    road.phone.launch(operation="TAVRO_UPDATE_HISTORY", TAVRO_SERVER_UPLOAD_STATUS="none")
    assert road.kept_files()
    road.phone.launch()
    road.screen.activate("Keep as draft")
    road.screen.wait_gone("Go on writing?")
    assert drafts(road) == ["An idea that waits"]
    assert not road.kept_files()
    road.open_history()
    road.wait_for_row("An idea that waits", "Draft saved")


def test_an_orderly_end_stores_a_draft_and_asks_nothing(road):
    road.write_problem("Battery", "Phone switched off", "while writing")
    road.wait_until_kept("while writing")
    road.phone.end(how="TERM")  # off the bus before it has stored
    wait_until(lambda: not road.kept_files(), 10, "nothing being kept")
    assert "Phone switched off" in drafts(road)
    road.phone.launch()
    road.screen.wait_for("Report a problem")
    assert not road.screen.look("Go on writing?")


def test_shared_files_wait_for_an_account_and_bad_ones_are_named(road):
    road.phone.end()
    road.phone.preference("unset", "tavro_username")
    media = road.phone.storage() / "media"
    (media / "notes.txt").write_text("no picture")
    share(road, f"{PATH}=/opt/usr/media/Images/banner.jpg")  # starts the client
    road.choose_account()
    road.screen.wait_for("Remove banner.jpg")
    share(road, f"{PATH}=/opt/usr/media/Images/banner.jpg", f"{PATH}=/opt/usr/media/notes.txt",
          f"{PATH}=/opt/usr/media/$(touch gone).jpg", "http://tizen.org/appcontrol/data/text=Look at <b>this</b>",
          uri="file:///opt/usr/media/Images/morning%2Epng")
    shown = road.screen.description("These could not be attached")
    assert "notes.txt" in shown and "$(touch gone).jpg" in shown and "banner.jpg" not in shown
    road.screen.activate("OK")
    for name in ("banner.jpg", "morning.png"):
        assert len([label for label in road.screen.names() if label == "Remove " + name]) == 1, name
    assert road.screen.text(HINT) == "Look at <b>this</b>"
