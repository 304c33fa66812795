// The compose screens with real widgets, painted into memory, on a real store and bus.
#define EFL_BETA_API_SUPPORT  // reading what a screen reader is told
#include <Elementary.h>
#include <app_preference.h>
#include <elm_atspi.h>
#include <gmock/gmock.h>
#include <unistd.h>

#include <climits>

#include <filesystem>
#include <fstream>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_crash_service.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_system_log.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

using Voc = TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data>;

constexpr char kMedia[] = "/opt/usr/media/compose-test/";

std::string make_file(const std::string &name, std::string content, off_t size = 0) {
  const std::string path = kMedia + name;
  std::filesystem::create_directories(kMedia);
  std::ofstream(path) << content;
  if (size > 0) std::filesystem::resize_file(path, static_cast<uintmax_t>(size));
  return path;
}

std::string make_picture(const std::string &name, off_t size = 1000) {
  return make_file(name, "\xFF\xD8\xFF\xE0 JFIF", size);
}

// Once for all suites: the toolkit forgets the client's look when it is shut down.
class Toolkit : public testing::Environment {
  void SetUp() override {
    setenv("ELM_ENGINE", "buffer", 1);
    char name[] = "compose_test", *arguments[] = {name, nullptr};
    elm_init(1, arguments);
    tavro_bind_locale();
    tavro_dbmgr_init_semaphore();
    tavro_dbmgr_ensure_schema();
  }
  void TearDown() override { elm_shutdown(); }
};
const testing::Environment *const toolkit = testing::AddGlobalTestEnvironment(new Toolkit);

class Compose : public testing::Test {
 protected:
  void SetUp() override {
    tavro_initialize_application_data(&ad_);
    ASSERT_TRUE(tavro_create_base_window(&ad_));
    tavro_create_landing_page(&ad_);
    preference_set_boolean(TAVRO_PREF_SENT_PAGE_SEEN, true);
    preference_set_boolean(TAVRO_PREF_ATTACH_LOGS, false);
    preference_remove(TAVRO_PREF_MAX_SIZE_ATTACHMENT);
  }
  void TearDown() override {
    evas_object_del(ad_.win);
    ecore_main_loop_iterate();
    tavro_dealloc_memory(&ad_);
  }

  template <typename Condition>
  static bool wait_for(Condition condition, double seconds = 5.0) {
    const double end = ecore_time_get() + seconds;
    while (!condition() && ecore_time_get() < end) {
      ecore_main_loop_iterate();
      g_main_context_iteration(nullptr, FALSE);
      usleep(2000);
    }
    return condition();
  }
  // Until the page that was pushed last has come to rest and what was put off is done.
  static void settle() {
    wait_for([] { return false; }, 0.6);
  }

  compose_view_win *view() { return tavro_compose_view(&ad_); }

  // A problem that could be sent.
  void write_problem(const char *target = "Hardware Store") {
    tavro_create_problem_page(&ad_, nullptr);
    view()->app_name = TAVRO_STRDUP(target);
    elm_entry_entry_set(view()->title_entry, "It broke");
    settle();
  }

  static void tap(Evas_Object *button) { evas_object_smart_callback_call(button, "clicked", nullptr); }
  void tap_send() { tap(elm_object_part_content_get(view()->bottom, "tavro.swallow.button")); }

  static Evas_Object *find_button(Evas_Object *below, const char *label) {
    if (elm_object_widget_check(below) && strstr(elm_object_widget_type_get(below), "Button") &&
        g_strcmp0(elm_object_text_get(below), label) == 0)
      return below;
    const TavroHandle<Eina_List, eina_list_free> members(evas_object_smart_members_get(below));
    Evas_Object *found = nullptr;
    for (Eina_List *link = members.get(); link && !found; link = eina_list_next(link))
      found = find_button(static_cast<Evas_Object *>(eina_list_data_get(link)), label);
    return found;
  }
  // Tap a popup's button; false when it has none of this text.
  static bool answer(Evas_Object *popup, const char *text) {
    Evas_Object *found = find_button(popup, tavro_text(text));
    if (found) tap(found);
    return found;
  }
  static std::string text(const Evas_Object *widget, const char *part) {
    const char *shown = widget ? elm_object_part_text_get(widget, part) : nullptr;
    return shown ? shown : "";
  }
  static std::string body(Evas_Object *popup) {
    const char *told = popup ? efl_access_object_description_get(popup) : nullptr;
    return told ? told : "";
  }
  std::string size_text() { return text(view()->bottom, "elm.text"); }

  std::vector<std::string> attached() {
    std::vector<std::string> names;
    for (const GSList *link = view()->attachments; link; link = link->next)
      names.push_back(tavro_file_name(static_cast<const char *>(link->data)));
    return names;
  }

  static std::string query(const std::string &sql) {
    TavroDb db;
    sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
    sqlite3_stmt *raw = nullptr;
    EXPECT_EQ(sqlite3_prepare_v2(db.get(), sql.c_str(), -1, &raw, nullptr), SQLITE_OK) << sql;
    const TavroStmt statement(raw);
    const bool has_row = sqlite3_step(raw) == SQLITE_ROW && sqlite3_column_text(raw, 0);
    return has_row ? reinterpret_cast<const char *>(sqlite3_column_text(raw, 0)) : "";
  }
  static int reports() { return std::stoi(query("SELECT count(*) FROM TABLE_VOC")); }
  static std::string newest(const std::string &column) {
    return query("SELECT " + column + " FROM TABLE_VOC_EXTENDED ORDER BY VOC_ID DESC LIMIT 1");
  }

  svc_voc_data *store_draft(const char *log = nullptr) {
    tavro_dbmgr_bug_report_info report{};
    report.submitted = TAVRO_STATUS_DRAFT_SAVED;
    report.title_description = TAVRO_STRDUP("kept");
    report.syslog_file = TAVRO_STRDUP(log);
    const int id = tavro_dbmgr_update_bug_report(&report);
    TAVRO_FREE(report.title_description);
    TAVRO_FREE(report.type);
    TAVRO_FREE(report.syslog_file);
    return tavro_dbmgr_get_voc_by_id(id);
  }

  appdata ad_{};
};

TEST_F(Compose, AttachesAFileOnceAndAddsUpWhatIsThere) {
  tavro_create_problem_page(&ad_, nullptr);
  const std::string small = make_picture("small.jpg", 10240), large = make_picture("large.jpg", 1048576);
  for (const std::string &path : {small, small, large})
    EXPECT_TRUE(tavro_compose_attach(view(), path.c_str()));
  EXPECT_EQ(view()->buffer, 10240 + 1048576);
  view()->app_name = TAVRO_STRDUP("Hardware");
  EXPECT_EQ(tavro_compose_check(&ad_, view()->buffer), TAVRO_COMPOSE_COMPLETE);
  EXPECT_EQ(tavro_compose_check(&ad_, view()->buffer - 1), TAVRO_COMPOSE_TOO_LARGE);
  unlink(small.c_str());
  tavro_compose_detach(view(), large.c_str());
  EXPECT_EQ(view()->buffer, 0);
}

TEST_F(Compose, NamesEachFileThatItRefusesWithTheReason) {
  tavro_create_problem_page(&ad_, nullptr);
  std::string paths[] = {make_picture("good.jpg"),
                         make_file("empty.jpg", ""),
                         make_file("text.jpg", "no picture at all"),
                         make_picture("huge.jpg", off_t{4} << 30),
                         std::string(kMedia) + "gone.jpg",
                         kMedia};
  GSList *list = nullptr;
  for (std::string &path : paths) list = g_slist_append(list, path.data());
  tavro_compose_attach_files(&ad_, list);
  g_slist_free(list);
  EXPECT_THAT(attached(), ElementsAre("good.jpg"));
  const std::string told = body(ad_.cancel_popup);
  for (const char *part : {"empty.jpg: the file is empty", "text.jpg: not a picture",
                           "huge.jpg: larger than the limit of 30.0 MB", "gone.jpg: cannot be read"})
    EXPECT_THAT(told, HasSubstr(part));
}

TEST_F(Compose, AttachmentsAreReorderedAndTheMenuOffersOnlyWhatIsPossible) {
  tavro_create_problem_page(&ad_, nullptr);
  const std::string a = make_picture("a.jpg"), b = make_picture("b.jpg"), c = make_picture("c.jpg");
  for (const std::string &path : {a, b, c}) tavro_compose_attach(view(), path.c_str());
  tavro_compose_show_attachment_menu(&ad_, a.c_str());
  EXPECT_FALSE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_LEFT"));
  EXPECT_TRUE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_RIGHT"));
  EXPECT_THAT(attached(), ElementsAre("b.jpg", "a.jpg", "c.jpg"));
  tavro_compose_move(view(), c.c_str(), -9);
  EXPECT_THAT(attached(), ElementsAre("c.jpg", "b.jpg", "a.jpg"));
  tavro_compose_show_attachment_menu(&ad_, a.c_str());
  EXPECT_FALSE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_RIGHT"));
  EXPECT_TRUE(answer(view()->menu_popup, "IDS_OB_BUTTON_REMOVE"));
  EXPECT_THAT(attached(), ElementsAre("c.jpg", "b.jpg"));
}

TEST_F(Compose, SizeIsShownAgainstASaneLimit) {
  tavro_create_problem_page(&ad_, nullptr);
  preference_set_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, INT_MAX);
  tavro_compose_size_refresh(&ad_);
  EXPECT_EQ(size_text(), "0.0 of 1024.0 MB");
}

TEST_F(Compose, FilesLostSinceTheyWereChosenAreNamedBeforeSending) {
  write_problem();
  const std::string kept = make_picture("kept.jpg"), gone = make_picture("gone.jpg"),
                    cut = make_picture("cut.jpg");
  for (const std::string &path : {kept, gone, cut}) tavro_compose_attach(view(), path.c_str());
  unlink(gone.c_str());
  make_file("cut.jpg", "");
  const int before = reports();
  tap_send();
  EXPECT_THAT(body(ad_.cancel_popup), testing::AllOf(HasSubstr("gone.jpg"), HasSubstr("cut.jpg")));
  EXPECT_THAT(body(ad_.cancel_popup), testing::Not(HasSubstr("kept.jpg")));
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  EXPECT_THAT(attached(), testing::SizeIs(3));
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_FILES"));
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_EQ(reports(), before + 1);
}

TEST_F(Compose, DeviceStatusGoesAlongUnlessThePersonTookItOff) {
  write_problem();
  tap_send();
  EXPECT_NE(newest("REF_3"), "");
  write_problem();
  ad_.problem_view->is_device_status_removed = true;
  tap_send();
  EXPECT_EQ(newest("REF_3"), "");
}

// Stored, it does not know whether the person had taken the device status off.
TEST_F(Compose, DraftOfAProblemIsShownOnceMoreBeforeItGoes) {
  write_problem();
  tavro_compose_save_draft(&ad_);
  const Voc draft(tavro_dbmgr_get_voc_by_id(std::stoi(newest("VOC_ID"))));
  tavro_create_problem_page(&ad_, draft.get());
  settle();
  tap_send();
  ASSERT_TRUE(view()) << newest("VOC_ID");
  EXPECT_FALSE(ad_.cancel_popup) << body(ad_.cancel_popup);
  EXPECT_NE(elm_naviframe_top_item_get(ad_.nf), view()->nf_it);
  tavro_compose_send_from_review(&ad_);
  EXPECT_FALSE(view());
}

TEST_F(Compose, DamagedDraftOpensWithWhatIsThere) {
  const std::string text = make_file("text.jpg", "no picture", 2097152);
  const Voc draft(store_draft());
  for (const char *path : {static_cast<const char *>(nullptr), text.c_str()}) {
    auto *file = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    file->file_path = TAVRO_STRDUP(path);
    draft->attachments = g_slist_append(draft->attachments, file);
  }
  ad_.type = CRASH;
  tavro_create_problem_page(&ad_, draft.get());
  EXPECT_EQ(ad_.type, CRASH);
  EXPECT_THAT(attached(), ElementsAre("text.jpg"));
  EXPECT_EQ(size_text(), "2.0 of 30.0 MB");
  tavro_create_problem_page(&ad_, nullptr);
  EXPECT_EQ(ad_.type, PROBLEM) << "a new report is of no crash";
}

TEST_F(Compose, StoreThatRefusesTheReportLeavesTheScreenAsItIs) {
  write_problem();
  const std::string picture = make_picture("kept.jpg");
  tavro_compose_attach(view(), picture.c_str());
  query("CREATE TRIGGER full BEFORE INSERT ON TABLE_VOC BEGIN SELECT RAISE(FAIL, 'full'); END");
  tap_send();
  query("DROP TRIGGER full");
  ASSERT_TRUE(view());
  EXPECT_STREQ(elm_entry_entry_get(view()->title_entry), "It broke");
  EXPECT_THAT(attached(), ElementsAre("kept.jpg"));
  EXPECT_THAT(body(ad_.cancel_popup), HasSubstr("could not store"));
  tap_send();
  EXPECT_FALSE(view());
}

TEST_F(Compose, BlanksAreNothingToSendAndAReportTakesNoMoreFilesThanSupportDoes) {
  write_problem();
  elm_entry_entry_set(view()->title_entry, "  \xE2\x80\x8B<br/>");
  EXPECT_FALSE(tavro_compose_has_content(&ad_));
  for (unsigned i = 0; i < kMostAttachments; i++)
    EXPECT_TRUE(tavro_compose_attach(view(), make_picture(std::to_string(i) + ".jpg").c_str()));
  const std::string beyond = make_picture("beyond.jpg");
  EXPECT_EQ(tavro_attachment_check(view(), beyond.c_str()), TAVRO_ATTACHMENT_TOO_MANY);
  EXPECT_FALSE(tavro_compose_attach(view(), beyond.c_str()));
}

TEST_F(Compose, SecondScreenDoesNotThrowAwayWhatTheFirstHolds) {
  tavro_create_problem_page(&ad_, nullptr);
  elm_entry_entry_set(view()->entry, "hours of work");
  tavro_create_history_page(&ad_);
  settle();
  tavro_create_idea_page(&ad_, nullptr);
  settle();
  ASSERT_TRUE(ad_.problem_view);
  EXPECT_FALSE(ad_.idea_view);
  EXPECT_TRUE(ad_.cancel_popup);
  EXPECT_STREQ(elm_entry_entry_get(ad_.problem_view->entry), "hours of work");
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.problem_view->nf_it);
  tavro_pop_naviframe_middle_items(&ad_);
  EXPECT_TRUE(ad_.problem_view);
}

TEST_F(Compose, EmptyScreenMakesRoomForAnotherAndItsMenuGoesWithIt) {
  tavro_create_problem_page(&ad_, nullptr);
  tavro_compose_show_sources(&ad_);
  tavro_create_idea_page(&ad_, nullptr);
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_TRUE(ad_.idea_view);
}

TEST_F(Compose, UnchangedDraftStaysAndItsAutomaticCopyGoesWhenThePageOrTheApplicationEnds) {
  for (const bool is_end_of_all : {false, true}) {
    const Voc copy(store_draft()), draft(store_draft());
    tavro_create_problem_page(&ad_, draft.get());
    ad_.auto_saved_id = copy->id;
    const int before = reports();
    settle();
    if (is_end_of_all)
      tavro_autosave_at_end(&ad_);
    else
      elm_naviframe_item_pop(ad_.nf);
    EXPECT_FALSE(ad_.problem_view);
    EXPECT_EQ(ad_.auto_saved_id, 0);
    EXPECT_EQ(reports(), before - 1);
    EXPECT_EQ(query("SELECT count(*) FROM TABLE_VOC WHERE VOC_ID=" + std::to_string(draft->id)), "1");
  }
}

TEST_F(Compose, DraftIsNotDiscardedWithoutAQuestionAndItsLogGoesWithIt) {
  const std::string log = make_file("draft.zip", "log");
  const Voc draft(store_draft(log.c_str()));
  tavro_create_problem_page(&ad_, draft.get());
  const int before = reports();
  tavro_compose_discard(&ad_);
  ASSERT_TRUE(view());
  EXPECT_EQ(reports(), before);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_DISCARD"));
  EXPECT_FALSE(view());
  EXPECT_EQ(reports(), before - 1);
  EXPECT_FALSE(std::filesystem::exists(log));
}

TEST_F(Compose, DraftThatIsStoredAnewKeepsItsLogAndLosesOneThatWasReplaced) {
  for (const bool is_replaced : {false, true}) {
    const std::string log = make_file("draft.zip", "log"), other = make_file("other.zip", "log");
    tavro_create_problem_page(&ad_, Voc(store_draft(log.c_str())).get());
    if (is_replaced) {
      TAVRO_FREE(ad_.problem_view->syslog_filepath);
      ad_.problem_view->syslog_filepath = TAVRO_STRDUP(other.c_str());
    }
    tavro_compose_save_draft(&ad_);
    EXPECT_EQ(std::filesystem::exists(log), !is_replaced);
    EXPECT_EQ(newest("REF_2"), is_replaced ? other : log);
  }
}

// ---- The system log ----

class ComposeLog : public Compose {
 protected:
  void SetUp() override {
    std::filesystem::create_directories(TAVRO_LOG_DUMP_FOLDER);
    Compose::SetUp();
  }

  // A crash service that takes its time: the test answers for it.
  static void start_service() {
    static TavroObject<GDBusConnection> bus(g_dbus_connection_new_for_address_sync(
        getenv("DBUS_SYSTEM_BUS_ADDRESS"),
        GDBusConnectionFlags(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                             G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
        nullptr, nullptr, nullptr));
    const TavroVariant reply(
        g_dbus_connection_call_sync(bus.get(), "org.freedesktop.DBus", "/", "org.freedesktop.DBus",
                                    "RequestName", g_variant_new("(su)", TAVRO_CRASH_SERVICE, 0u), nullptr,
                                    G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr));
  }
  std::string service_answers(const char *name) {
    const std::string path = std::string(TAVRO_LOG_DUMP_FOLDER) + name;
    std::ofstream(path) << std::string(2048, 'l');
    TavroAppControl request;
    app_control_create(tavro_out(request));
    app_control_set_operation(request.get(), TAVRO_DUMP_LOG_OPERATION);
    app_control_add_extra_data(request.get(), TAVRO_DUMP_LOG_FILE, name);
    tavro_take_dump_log(request.get(), &ad_);
    return path;
  }
  std::string row() { return text(view()->log_row, "elm.text.sub"); }
  void turn_switch(bool is_on) {
    elm_check_state_set(view()->log_row, is_on);
    evas_object_smart_callback_call(view()->log_row, "changed", nullptr);
  }
};

// Before any service runs: the phone has none.
TEST_F(ComposeLog, PhoneThatMakesNoLogDoesNotKeepAReportBack) {
  write_problem("IDS_OB_MBODY_BATTERY");
  const int before = reports();
  ASSERT_TRUE(wait_for([this] { return tavro_system_log_current(&ad_) == TAVRO_SYSTEM_LOG_FAILED; }));
  EXPECT_FALSE(elm_object_disabled_get(view()->log_row)) << "it can be tried again";
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_LOG"));
  EXPECT_EQ(reports(), before + 1);
}

TEST_F(ComposeLog, TargetThatNeedsALogGetsItAndAnotherGivesItUp) {
  start_service();
  write_problem("IDS_OB_MBODY_BATTERY");
  EXPECT_EQ(tavro_system_log_current(&ad_), TAVRO_SYSTEM_LOG_COLLECTING);
  EXPECT_TRUE(elm_check_state_get(view()->log_row));
  EXPECT_TRUE(elm_object_disabled_get(view()->log_row));
  const std::string path = service_answers("needed.zip");
  EXPECT_THAT(row(), HasSubstr("2 kB"));
  // The person chooses another target.
  TAVRO_FREE(view()->app_name);
  view()->app_name = TAVRO_STRDUP("Calculator");
  tavro_compose_log_update(&ad_);
  EXPECT_FALSE(elm_check_state_get(view()->log_row));
  EXPECT_FALSE(std::filesystem::exists(path)) << "the person never asked for it";
}

TEST_F(ComposeLog, SettingSwitchesTheLogOnButDoesNotMakeAnEmptyScreenWorthKeeping) {
  start_service();
  preference_set_boolean(TAVRO_PREF_ATTACH_LOGS, true);
  const int before = reports();
  for (const bool is_end_of_all : {false, true}) {
    tavro_create_problem_page(&ad_, nullptr);
    settle();
    const std::string path = service_answers("default.zip");
    ASSERT_TRUE(ad_.problem_view->syslog_filepath);
    EXPECT_TRUE(elm_check_state_get(view()->log_row));
    if (is_end_of_all)
      tavro_autosave_at_end(&ad_);
    else
      elm_naviframe_item_pop(ad_.nf);
    EXPECT_FALSE(view());
    EXPECT_EQ(reports(), before);
    EXPECT_FALSE(std::filesystem::exists(path)) << "nobody would ever delete it";
  }
}

TEST_F(ComposeLog, SendingWithoutTheLogIsForgottenWhenThePersonGoesBackAndSwitchesItOn) {
  start_service();
  preference_set_boolean(TAVRO_PREF_SENT_PAGE_SEEN, false);
  write_problem();
  turn_switch(true);
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_LOG"));
  settle();
  ASSERT_NE(elm_naviframe_top_item_get(ad_.nf), view()->nf_it);
  elm_naviframe_item_pop(ad_.nf);
  settle();
  turn_switch(true);
  tavro_compose_review(&ad_);
  settle();
  tavro_compose_send_from_review(&ad_);
  ASSERT_TRUE(view()) << "it waits for the log";
  service_answers("given-up.zip");
  const std::string path = service_answers("wanted.zip");
  EXPECT_FALSE(view());
  EXPECT_EQ(newest("REF_2"), path);
}

TEST_F(ComposeLog, ReportWaitsForItsLogAndThenGoesByItself) {
  start_service();
  write_problem();
  turn_switch(true);
  const int before = reports();
  tap_send();
  EXPECT_EQ(reports(), before);
  const std::string path = service_answers("awaited.zip");
  EXPECT_EQ(reports(), before + 1);
  EXPECT_EQ(newest("REF_2"), path);
  EXPECT_FALSE(ad_.cancel_popup);
}

TEST_F(ComposeLog, PersonWhoKeepsWritingIsNotSentAwayByALateLog) {
  start_service();
  write_problem();
  turn_switch(true);
  tap_send();
  const int before = reports();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  service_answers("late.zip");
  EXPECT_TRUE(view());
  EXPECT_EQ(reports(), before);
  EXPECT_EQ(size_text(), "0.0 of 30.0 MB");
  turn_switch(false);
  EXPECT_FALSE(ad_.problem_view->syslog_filepath);
}

}  // namespace
