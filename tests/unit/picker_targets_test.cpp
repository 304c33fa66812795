// What a report can be about: search, order, and the store's table of applications.
#include <Ecore.h>
#include <gmock/gmock.h>

#include "tavro_app_list.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts.h"
#include "tavro_target_rows.h"
#include "tavro_targets.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(TargetSearch, FindsPartsOfNamesWithoutRegardToCaseAndAccents) {
  struct {
    const char *name, *sought;
    bool is_found;
  } const cases[] = {
      {"Music player", "PLAY", true},
      {"Éditeur", "edit", true},
      {"Editor", "édi", true},
      {"Ångström", "angstrom", true},
      {"Straße", "STRASSE", true},
      {"İstanbul", "istanbul", true},
      {"Music", "", true},
      {"Music player", " player ", true},
      {"設定", "設", true},
      {"Music player", "mp", false},
      {"\xFF\xFE", "a", false},
      {"100% %s", "%s", true},
  };
  for (const auto &expected : cases) {
    const std::vector<tavro_target_row> rows{
        {expected.name, expected.name, tavro_search_key(expected.name), "", "app", false}};
    EXPECT_EQ(tavro_target_rows_matching(rows, tavro_search_key(expected.sought)).size(),
              expected.is_found ? 1u : 0u)
        << expected.name << " / " << expected.sought;
  }
}

TEST(Targets, EveryPerformanceTargetCarriesTheLogAndAnApplicationKeepsItsName) {
  for (size_t i = 0; i < kPerformanceTargetCount; ++i)
    EXPECT_TRUE(isLogMandatory(kPerformanceTargets[i].name)) << kPerformanceTargets[i].name;
  EXPECT_STREQ(tavro_target_tile("Gallery", false), "app");
  EXPECT_STREQ(tavro_target_text("Gallery"), "Gallery");
}

tavro_application application(const char *id, const char *name, bool is_downloaded = false) {
  return {id, id, name, "", is_downloaded};
}

std::vector<std::string> names_of(const std::vector<tavro_application> &applications) {
  std::vector<std::string> names;
  for (const tavro_application &one : applications) names.push_back(one.name);
  return names;
}

TEST(Applications, AreInTheOrderOfTheirNamesAlsoWithoutALanguage) {
  std::vector<tavro_application> applications{application("1", "zebra"), application("2", "Éditeur"),
                                              application("3", "editor"), application("4", "Banana"),
                                              application("5", "Fax")};
  tavro_app_list_sort(applications);
  EXPECT_THAT(names_of(applications), ElementsAre("Banana", "Éditeur", "editor", "Fax", "zebra"));
}

TEST(Applications, AChangedOneLeavesTheTableAndComesBackAsItIs) {
  const std::vector<tavro_application> stored{application("kept", "Kept"), application("renamed", "Old name"),
                                              application("gone", "Gone")};
  const std::vector<tavro_application> installed{
      application("kept", "Kept"), application("renamed", "New name"), application("new", "New")};
  const tavro_app_list_changes changes = tavro_app_list_compare(stored, installed);
  EXPECT_THAT(changes.gone_packages, ElementsAre("renamed", "gone"));
  EXPECT_THAT(names_of(changes.added), ElementsAre("New name", "New"));
  EXPECT_THAT(tavro_app_list_compare(installed, installed).added, IsEmpty());
  EXPECT_THAT(tavro_app_list_compare({}, installed).added.size(), installed.size());
}

std::vector<std::string> stored_names(GSList *stored) {
  std::vector<std::string> names;
  for (GSList *link = stored; link; link = link->next) {
    auto *app = static_cast<tavro_pkg_info *>(link->data);
    names.push_back(app->pkg_name);
    tavro_db_free_app_info(app);
  }
  g_slist_free(stored);
  return names;
}

TEST(Applications, TheStoresTableFollowsWhatIsInstalled) {
  ecore_init();
  tavro_dbmgr_init_semaphore();
  tavro_dbmgr_ensure_schema();
  char id[] = "stale", name[] = "Stale", icon[] = "";
  const tavro_pkg_info stale{1, id, id, name, icon};
  tavro_dbmgr_update_app_list(&stale);
  tavro_app_list_store({application("a", "It's mine", true), application("b", "Built in")});
  const double latest = ecore_time_get() + 20.0;
  while (stored_names(tavro_dbmgr_get_native_app_list()).empty() && ecore_time_get() < latest)
    ecore_main_loop_iterate();
  EXPECT_THAT(stored_names(tavro_dbmgr_get_downloaded_app_list()), ElementsAre("It's mine"));
  EXPECT_THAT(stored_names(tavro_dbmgr_get_native_app_list()), ElementsAre("Built in"));
  ecore_shutdown();
}

}  // namespace
