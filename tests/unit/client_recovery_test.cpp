// The client's start on a store that is no database and behind a save that was cut off. A program of its own,
// since the store is prepared once per process.
#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>

#include "client_support.h"
#include "tavro_dbmgr.h"
#include "tavro_lifecycle.h"
#include "tavro_memory.h"
#include "tavro_save_journal.h"

using ::testing::Contains;
using ::testing::HasSubstr;

namespace {

class Recovery : public ClientTest {};

TEST_F(Recovery, ADamagedStoreIsSetAsideAndAReportUnderWayIsSent) {
  sign_in();
  tavro_dbmgr_bug_report_info *report = TAVRO_ZALLOC(tavro_dbmgr_bug_report_info);
  report->description = TAVRO_STRDUP("cut off");
  report->app_name = TAVRO_STRDUP("Hardware");
  report->user_name = TAVRO_STRDUP("anna");
  report->submitted = TAVRO_STATUS_SENDING;
  ASSERT_EQ(tavro_journal_write(report), 0);
  tavro_dbmgr_free_bug_report_data(report);
  std::filesystem::remove(TAVRO_DBMGR_FILE);
  std::ofstream(TAVRO_DBMGR_FILE) << "this is no database, but somebody may want it back";

  ASSERT_TRUE(app_create(&ad));
  EXPECT_EQ(column(1, "VOC_TEXT || VOC_STATE"), "cut off10");
  EXPECT_THAT(Listener::get().take(), Contains(HasSubstr("TAVRO_OPERATION_TYPE_UI TAVRO_VOC_ID=1")));
  launch(nullptr);
  launch(nullptr);
  EXPECT_THAT(ui_calls,
              ::testing::ElementsAre("window", "landing", "popup IDS_OB_HEADER_REPORTS_NOT_READABLE"));
  int set_aside = 0;
  for (const auto &entry : std::filesystem::directory_iterator(TAVRO_DBMGR_FOLDER)) {
    set_aside += entry.path().string().find(".tavro.db.damaged-") != std::string::npos;
  }
  EXPECT_EQ(set_aside, 1);
}

}  // namespace
