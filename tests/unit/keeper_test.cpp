// A compose screen that ends without its content being stored or discarded, and the next start; files that
// other applications share. Widgets are real and painted into memory.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <filesystem>

#include "files.h"
#include "screens_world.h"
#include "store_access.h"
#include "tavro_app_control_handle.h"
#include "tavro_appdata.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts.h"
#include "tavro_handles.h"
#include "tavro_lifecycle.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_share.h"

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using Voc = TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data>;

constexpr char kPicture[] = "/opt/usr/media/kept.jpg";
constexpr char kGoOn[] = "IDS_OB_BUTTON_GO_ON";
constexpr char kKeep[] = "IDS_OB_BUTTON_KEEP_AS_DRAFT";
constexpr char kDiscard[] = "IDS_OB_BUTTON_DISCARD";

// A plain file of a kind that support can open, except for its content.
std::string make_picture(const std::string &path, const std::string &head = "\xFF\xD8\xFF") {
  return write_file(path, head + "and some more bytes");
}

class Keeper : public Screens {
 protected:
  void SetUp() override {
    preference_set_string(TAVRO_PREF_USERNAME, "anna");
    make_picture(kPicture);
    start();
  }
  void TearDown() override {
    end();
    tavro_dbmgr_destroy_vocs();
    for (const std::string &file : kept_files()) fs::remove_all(TAVRO_DBMGR_FOLDER "/" + file);
  }

  void start() {
    Screens::start();
    tavro_compose_keeper_offer(&ad_);
  }
  static void keep() {
    tavro_compose_keeper_note();
    tavro_compose_keeper_flush();
  }
  void start_again(const char *user = "anna") {
    end();
    preference_set_string(TAVRO_PREF_USERNAME, user);
    start();
  }
  void die_and_start(const char *user = "anna") {
    keep();
    start_again(user);
  }
  void write(const char *title, const char *text, bool has_picture = false) {
    compose_view_win *view = tavro_compose_view(&ad_);
    elm_entry_entry_set(view->title_entry, title);
    elm_entry_entry_set(view->entry, text);
    if (has_picture) tavro_compose_attach(view, kPicture);
  }
  void write_problem(const char *title, const char *text = "") {
    tavro_create_problem_page(&ad_, nullptr);
    write(title, text);
  }

  // Touch the button of the question that is shown: the topmost of that name.
  void answer(const char *name) {
    ASSERT_TRUE(ad_.cancel_popup);
    Evas_Object *button = find_top_button(ad_.win, tavro_text(name));
    ASSERT_TRUE(button) << name;
    tap(button);
  }
  std::string question() { return body(ad_.cancel_popup); }

  static std::vector<std::string> kept_files() {
    std::vector<std::string> names;
    for (const auto &entry : fs::directory_iterator(TAVRO_DBMGR_FOLDER))
      if (entry.path().filename().string().find(".tavro.compose") == 0)
        names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }
  // "status title|text|number of attachments" of every report, newest first.
  static std::vector<std::string> reports(const char *user = "anna") {
    std::vector<std::string> lines;
    GSList *vocs = tavro_dbmgr_get_vocs_for_history(user);
    for (GSList *link = vocs; link; link = link->next) {
      const Voc voc(static_cast<svc_voc_data *>(link->data));
      const auto text = [](const char *value) { return std::string(value ? value : ""); };
      lines.push_back(text(voc->submitted) + " " + text(voc->title_description) + "|" +
                      text(voc->description) + "|" + std::to_string(g_slist_length(voc->attachments)));
    }
    g_slist_free(vocs);
    return lines;
  }
  // Opens a stored draft, as from the history; its id.
  int open_stored_draft(const char *title) {
    write_problem(title);
    const int id = tavro_save_compose_draft(&ad_);
    tavro_create_problem_page(&ad_, Voc(tavro_dbmgr_get_voc_by_id(id)).get());
    return id;
  }
  void battery(int percent) {
    __tavro_app_battery_capacity_changed_cb(DEVICE_CALLBACK_BATTERY_CAPACITY,
                                            reinterpret_cast<void *>(static_cast<intptr_t>(percent)), &ad_);
  }
};

TEST_F(Keeper, GivesBackAllThatAScreenHeldWhateverItsKind) {
  const std::string text = "It's \"loud\"\n\\n <b>&amp; \U0001F600 \u05E9\u05DC\u05D5\u05DD\n";
  for (const reportType type : {PROBLEM, CRASH, IDEA}) {
    if (type == IDEA)
      tavro_create_idea_page(&ad_, nullptr);
    else
      tavro_create_problem_page(&ad_, nullptr);
    ad_.type = type;
    compose_view_win *view = tavro_compose_view(&ad_);
    const TavroHandle<char, free> markup(elm_entry_utf8_to_markup(text.c_str()));
    const std::string title = "title=[" + std::to_string(type) + "]";
    write(title.c_str(), markup.get(), true);
    view->attachments = g_slist_append(view->attachments, TAVRO_STRDUP("/gone/\xff.png"));
    view->app_name = TAVRO_STRDUP("O'Neil's App");
    view->app_icon = TAVRO_STRDUP("/icon.png");
    if (ad_.problem_view) {
      ad_.problem_view->dump_filepath = TAVRO_STRDUP("/dump.zip");
      ad_.problem_view->dump_filename = TAVRO_STRDUP("dump.zip");
      ad_.problem_view->syslog_filepath = TAVRO_STRDUP("/log.zip");
      ad_.problem_view->is_device_status_removed = true;
    }
    die_and_start();
    EXPECT_THAT(question(), HasSubstr(title));
    answer(kGoOn);
    view = tavro_compose_view(&ad_);
    ASSERT_TRUE(view);
    EXPECT_EQ(ad_.type, type);
    const TavroHandle<char, free> given(elm_entry_markup_to_utf8(elm_entry_entry_get(view->entry)));
    EXPECT_EQ(given.get(), text);
    EXPECT_EQ(elm_entry_entry_get(view->title_entry), title);
    ASSERT_EQ(g_slist_length(view->attachments), 2u);
    EXPECT_STREQ(static_cast<char *>(view->attachments->data), kPicture);
    EXPECT_STREQ(static_cast<char *>(view->attachments->next->data), "/gone/\xff.png");
    EXPECT_THAT(question(), HasSubstr("\u2022 \xff.png")) << "a file that is gone is named";
    EXPECT_STREQ(view->app_name, "O'Neil's App");
    EXPECT_STREQ(view->app_icon, "/icon.png");
    if (ad_.problem_view) {
      EXPECT_STREQ(ad_.problem_view->dump_filepath, "/dump.zip");
      EXPECT_STREQ(ad_.problem_view->syslog_filepath, "/log.zip");
      EXPECT_TRUE(ad_.problem_view->is_device_status_removed);
    }
    EXPECT_EQ(tavro_save_compose_draft(&ad_) >= 1, true);
    EXPECT_THAT(kept_files(), IsEmpty());
  }
}

TEST_F(Keeper, IsReadableByTheOwnerAloneAndHoldsNothingWhileNothingIsUnsaved) {
  write_problem("private");
  tavro_compose_keeper_note();
  EXPECT_THAT(kept_files(), IsEmpty()) << "written at once";
  fs::create_symlink("/opt/usr/media/elsewhere", TAVRO_COMPOSE_KEEPER_FILE ".new");
  app_pause(&ad_);
  struct stat info = {};
  ASSERT_EQ(lstat(TAVRO_COMPOSE_KEEPER_FILE, &info), 0);
  EXPECT_EQ(info.st_mode, S_IFREG | 0600u);
  EXPECT_FALSE(fs::exists("/opt/usr/media/elsewhere"));
  for (const char *title : {"", "again"}) {
    write(title, "");
    tavro_compose_keeper_note();
    app_pause(&ad_);
    EXPECT_EQ(kept_files().size(), *title ? 1u : 0u);
  }
  tavro_save_compose_draft(&ad_);
  open_stored_draft("unchanged");
  tavro_compose_keeper_note();
  app_pause(&ad_);
  EXPECT_THAT(kept_files(), IsEmpty());
}

TEST_F(Keeper, WhatWasNotDecidedStaysBesideWhatIsWrittenNext) {
  write_problem("first");
  die_and_start();
  evas_object_del(ad_.cancel_popup);  // back
  tavro_compose_keeper_offer(&ad_);
  EXPECT_FALSE(ad_.cancel_popup) << "asked twice";
  write_problem("", "<br/> second");
  die_and_start();
  EXPECT_THAT(question(), HasSubstr("first"));
  answer(kKeep);
  EXPECT_THAT(question(), HasSubstr("\n\nsecond"));
  answer(kKeep);
  EXPECT_THAT(reports(), testing::UnorderedElementsAre("6 first||0", "6 |\n second|0"));
}

TEST_F(Keeper, IsOfferedToThePersonWhoWroteItOnly) {
  write_problem("Anna's");
  die_and_start("berta");
  EXPECT_FALSE(ad_.cancel_popup);
  write_problem("Berta's");
  die_and_start("berta");
  EXPECT_THAT(question(), HasSubstr("Berta's"));
  answer(kDiscard);
  EXPECT_FALSE(ad_.cancel_popup);
  start_again();
  EXPECT_THAT(question(), HasSubstr("Anna's"));
}

TEST_F(Keeper, TakesThePlaceOfItsAutomaticCopyAndOfTheDraftItCameFrom) {
  for (const char *decision : {kKeep, kDiscard}) {
    open_stored_draft("before");
    write("after", "more");
    battery(5);
    ASSERT_EQ(reports().size(), 2u);
    die_and_start();
    EXPECT_EQ(reports().size(), 2u) << "the copy is not taken for the stored report";
    answer(decision);
    EXPECT_THAT(reports(), ElementsAre(decision == kKeep ? "6 after|more|0" : "6 before||0"));
    tavro_dbmgr_destroy_vocs();
  }
}

TEST_F(Keeper, SurvivesThatTheDraftItCameFromIsGoneOrWasSentMeanwhile) {
  for (const bool is_sent : {false, true}) {
    const int id = open_stored_draft("before");
    write("after", "");
    keep();
    if (is_sent)
      tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_SENDING);
    else
      tavro_dbmgr_destroy_vocs_by_id(id);
    die_and_start();
    answer(kKeep);
    if (is_sent)
      EXPECT_THAT(reports(), testing::UnorderedElementsAre("6 after||0", "10 before||0"));
    else
      EXPECT_THAT(reports(), ElementsAre("6 after||0"));
    tavro_dbmgr_destroy_vocs();
  }
}

TEST_F(Keeper, OfAReportThatWasStoredJustBeforeTheEndIsNotOfferedAgain) {
  open_stored_draft("before");
  write("after", "all of it", true);
  keep();
  // The saver alone, without what follows it.
  ASSERT_GE(tavro_save_problem_compose_data(&ad_, TAVRO_STATUS_SENDING), 1);
  start_again();
  EXPECT_FALSE(ad_.cancel_popup);
  EXPECT_THAT(kept_files(), IsEmpty());
  EXPECT_THAT(reports(), ElementsAre("10 after|all of it|1"));
}

TEST_F(Keeper, StaysWhenTheStoreRefusesTheDraftAtTheEnd) {
  write_problem("the last word");
  tavro_compose_keeper_note();
  run("CREATE TRIGGER refusal BEFORE INSERT ON TABLE_VOC BEGIN SELECT RAISE(FAIL, 'full'); END");
  app_terminate(&ad_);
  run("DROP TRIGGER refusal");
  start();
  EXPECT_THAT(question(), HasSubstr("the last word"));
  answer(kGoOn);
  elm_naviframe_item_pop(ad_.nf);
  EXPECT_TRUE(tavro_compose_view(&ad_)) << "leaving what is not stored asks";
  app_terminate(&ad_);
  start();
  EXPECT_FALSE(ad_.cancel_popup);
  EXPECT_THAT(reports(), ElementsAre("6 the last word||0"));
}

TEST_F(Keeper, OnAFullDiskTriesAgainAtTheNextChange) {
  // What cannot be opened for writing stands in for the disk.
  fs::create_directory(TAVRO_COMPOSE_KEEPER_FILE ".new");
  write_problem("one");
  keep();
  EXPECT_THAT(kept_files(), ElementsAre(".tavro.compose.new"));
  fs::remove(TAVRO_COMPOSE_KEEPER_FILE ".new");
  die_and_start();
  EXPECT_THAT(question(), HasSubstr("one"));
}

TEST_F(Keeper, SetsADamagedFileAsideAndReadsOneOfALaterVersion) {
  const std::string whole = "[writing]\nkind=problem\ntitle=\"later\"\nuser_name=\"anna\"\n";
  struct {
    std::string content;
    bool is_good;
  } const cases[] = {
      {"", false},
      {"no key file at all", false},
      {std::string(5000, '\0'), false},
      {"[writing]\nkind=poem\ntitle=\"x\"\nuser_name=\"anna\"\n", false},
      {"[writing]\nkind=problem\ntitle=\"\\377\"\nuser_name=\"anna\"\n", false},
      {"[writing]\nkind=problem\nuser_name=\"anna\"\nattachments=1\n[attachment 0]\ntype=\"x\"\n", false},
      {whole + "attachments=2000000000\nopened_from=junk\nbegun=99999999999999999999\n[attachment 0]\n",
       true},
      {whole + "mood=\"new\"\n[colours]\nsky=blue\n", true},
  };
  for (const auto &given : cases) {
    std::ofstream(TAVRO_COMPOSE_KEEPER_FILE) << given.content;
    start_again();
    EXPECT_EQ(ad_.cancel_popup != nullptr, given.is_good) << given.content;
    if (!given.is_good) {
      EXPECT_THAT(kept_files(), ElementsAre(".tavro.compose.damaged"));
      fs::remove_all(TAVRO_COMPOSE_KEEPER_FILE ".damaged");
    } else {
      answer(kDiscard);
    }
    fs::remove(TAVRO_COMPOSE_KEEPER_FILE);
  }
  std::ofstream(TAVRO_COMPOSE_KEEPER_FILE ".damaged") << "an earlier one";
  fs::create_directory(TAVRO_COMPOSE_KEEPER_FILE);
  start_again();
  EXPECT_THAT(kept_files(), ElementsAre(".tavro.compose.damaged", ".tavro.compose.damaged.2"));
}

TEST_F(Keeper, LeavesAFileThatCannotBeReadJustNowWhereItIs) {
  std::ofstream(TAVRO_COMPOSE_KEEPER_FILE) << "[writing]\n";
  rlimit usual = {};
  getrlimit(RLIMIT_NOFILE, &usual);
  const rlimit none = {0, usual.rlim_max};
  setrlimit(RLIMIT_NOFILE, &none);
  EXPECT_FALSE(tavro_note_load(TAVRO_COMPOSE_KEEPER_FILE, TAVRO_COMPOSE_KEEPER_FILE ".damaged"));
  setrlimit(RLIMIT_NOFILE, &usual);
  EXPECT_THAT(kept_files(), ElementsAre(".tavro.compose"));
  EXPECT_TRUE(tavro_note_load(TAVRO_COMPOSE_KEEPER_FILE, TAVRO_COMPOSE_KEEPER_FILE ".damaged"));
}

// ---- Sharing ----

class Share : public Keeper {
 protected:
  void share(std::vector<const char *> paths, const char *uri = nullptr, const char *text = nullptr) {
    int error = 0;
    const TavroRequest request = tavro_request_create(&error);
    if (paths.size() == 1) app_control_add_extra_data(request.get(), APP_CONTROL_DATA_PATH, paths[0]);
    if (paths.size() > 1)
      app_control_add_extra_data_array(request.get(), APP_CONTROL_DATA_PATH, paths.data(),
                                       static_cast<int>(paths.size()));
    app_control_set_uri(request.get(), uri);
    if (text) app_control_add_extra_data(request.get(), APP_CONTROL_DATA_TEXT, text);
    tavro_attach_shared_files(request.get(), &ad_);
  }
  std::vector<std::string> attached() {
    std::vector<std::string> paths;
    for (const GSList *link = tavro_compose_view(&ad_)->attachments; link; link = link->next)
      paths.emplace_back(static_cast<const char *>(link->data));
    return paths;
  }
};

TEST_F(Share, OpensTheProblemScreenWithTheFilesAndAddsLaterOnesToIt) {
  const std::string odd = make_picture("/opt/usr/media/50% of '#1'; \u00e4.jpg");
  const std::string clip = make_picture("/opt/usr/media/clip.mp4", std::string("\0\0\0\x18", 4) + "ftypisom");
  share({kPicture});
  ASSERT_TRUE(ad_.problem_view);
  write("mine", "so far");
  tavro_create_history_page(&ad_);
  settle();
  share({kPicture, clip.c_str()}, "file:///opt/usr/media/50%25%20of%20'%231';%20%C3%A4.jpg", "<b>&amp; more");
  settle();
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.problem_view->nf_it);
  EXPECT_THAT(attached(), ElementsAre(kPicture, clip, odd));
  const TavroHandle<char, free> text(elm_entry_markup_to_utf8(elm_entry_entry_get(ad_.problem_view->entry)));
  EXPECT_STREQ(text.get(), "so far\n<b>&amp; more");
  EXPECT_FALSE(ad_.cancel_popup);
  die_and_start();
  EXPECT_THAT(question(), HasSubstr("mine"));
}

TEST_F(Share, NamesWhatCannotBeAttachedInOnePopupAndTakesTheRest) {
  make_picture(TAVRO_DBMGR_FOLDER "/own.jpg");
  fs::create_symlink(TAVRO_DBMGR_FOLDER "/own.jpg", "/opt/usr/media/link.jpg");
  make_picture("/opt/usr/media/notes.jpg", "text");
  fs::current_path("/opt/usr/media");
  const std::vector<std::string> bad = {"gone.jpg", "notes.jpg", "media", ".tavro.db",
                                        "link.jpg", "kept.jpg2", "x.png", "far.jpg"};
  fs::create_symlink(kPicture, "/opt/usr/media/kept.jpg2");
  share({"/opt/usr/media/gone.jpg", "/opt/usr/media/notes.jpg", "/opt/usr/media", TAVRO_DBMGR_FILE,
         "/opt/usr/media/link.jpg", kPicture, "kept.jpg2", "file://elsewhere/opt/usr/media/far.jpg"},
        "https://example.org/x.png");
  EXPECT_THAT(attached(), ElementsAre(kPicture));
  for (const std::string &name : bad) EXPECT_THAT(question(), HasSubstr(name + ":"));
  fs::current_path("/");
}

TEST_F(Share, UnderTheQuestionTakesItsPlaceAndLeavesWhatIsKeptForLater) {
  write_problem("kept");
  die_and_start();
  share({kPicture});
  settle();
  EXPECT_EQ(question(), "");
  write("shared", "");
  ASSERT_GE(tavro_save_compose_draft(&ad_), 1);
  settle();
  tavro_compose_keeper_offer(&ad_);
  EXPECT_THAT(question(), HasSubstr("kept"));
  answer(kKeep);
  EXPECT_THAT(reports(), testing::UnorderedElementsAre("6 shared||1", "6 kept||0"));
}

TEST_F(Share, NamesFilesAndTextBeyondTheLimits) {
  std::string lines;
  while (lines.size() < 1024 * 1024 - 60) lines += std::string(59, 'a') + "\n";
  lines += std::string(1024 * 1024 - 1 - lines.size(), 'b') + "\u00e4";
  share(std::vector<const char *>(102, kPicture), nullptr, lines.c_str());
  EXPECT_EQ(question(), "Further files (2): too many at once\nThe end of the text: it is too long");
  const TavroHandle<char, free> text(elm_entry_markup_to_utf8(elm_entry_entry_get(ad_.problem_view->entry)));
  lines.resize(1024 * 1024 - 1);
  EXPECT_TRUE(lines == text.get());
}

TEST_F(Share, WithoutAnythingOpensNothing) {
  share({});
  share({""}, "", "");
  EXPECT_FALSE(tavro_compose_view(&ad_));
}

}  // namespace
