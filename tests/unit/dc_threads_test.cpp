// The collector's life: whoever starts, cancels and ends it, on whatever thread.
#include <random>

#include "dc_world.h"
#include "tavro_memcheck.h"

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr char kLog[] = "/opt/usr/share/log/platform.log";

std::string content_of(const std::string &path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), {}};
}

class Collector : public DcWorld {
 protected:
  void SetUp() override {
    DcWorld::SetUp();
    tavro_mem_check_init();
  }
  // Whatever a case did, no worker is left, and nothing of theirs.
  void TearDown() override {
    tavro_dc_end_all();
    std::filesystem::remove(kLog);
    tavro_mem_report();
    EXPECT_THAT(content_of(kLog), HasSubstr("total leak = 0"));
  }

  // A core that takes far longer than any case, without taking room.
  static void make_endless_folder() {
    make_folder("endless_1", 1000, {"x.coredump.gz"});
    std::filesystem::resize_file(std::string(TAVRO_CRASH_DUMP_FOLDER) + "endless_1/x.coredump.gz",
                                 1ull << 40);
  }
  static bool is_archiving() {
    return DcReports::wait_for([] { return !names_in(kTavroDcArchiveFolder).empty(); });
  }
};

TEST_F(Collector, DoneTellsTheArchiveAndThePhoneAndEndsTheCollector) {
  make_folder("a_b_c", 1000, {"x.coredump.gz"});
  DcReports reports;
  reports.ends_itself = true;
  tavro_dc_context *handle = reports.create();
  EXPECT_EQ(tavro_dc_start(handle, nullptr), 0);
  ASSERT_TRUE(DcReports::wait_for([&] { return reports.ended > 0; }));
  EXPECT_EQ(reports.done, 1);
  EXPECT_EQ(reports.path, "/opt/usr/media/Orbel/tavro_c.zip");
  EXPECT_THAT(reports.build_date, ::testing::MatchesRegex("[0-9.]+ [0-9:]+"));
  EXPECT_THAT(reports.model, Not(IsEmpty()));
}

TEST_F(Collector, WithoutCrashFoldersItIsDoneWithoutAFileAndWithoutFilesItIsAnError) {
  DcReports reports;
  reports.collect();
  EXPECT_EQ(reports.done, 1);
  EXPECT_EQ(reports.path, "");
  make_folder("a_1", 1000, {});
  DcReports failed;
  failed.collect();
  EXPECT_EQ(failed.done, 0);
  EXPECT_EQ(failed.error, 1);
}

TEST_F(Collector, ACancelBreaksACollectionOffAndLeavesNoFile) {
  make_endless_folder();
  DcReports reports;
  tavro_dc_context *handle = reports.create();
  tavro_dc_start(handle, nullptr);
  tavro_dc_start(handle, nullptr);
  ASSERT_TRUE(is_archiving());
  EXPECT_EQ(tavro_dc_cancel(handle), 0);
  ASSERT_TRUE(DcReports::wait_for([&] { return reports.ended > 0; }));
  EXPECT_EQ(reports.done + reports.error, 0);
  EXPECT_THAT(names_in(kTavroDcArchiveFolder), IsEmpty());
}

TEST_F(Collector, TheEndOfTheProcessBreaksOffEvenWhatWasToEndByItself) {
  make_endless_folder();
  DcReports reports[3];
  for (DcReports &each : reports) {
    tavro_dc_context *handle = each.create();
    tavro_dc_start(handle, nullptr);
    tavro_dc_deinit(handle);
  }
  ASSERT_TRUE(is_archiving());
  tavro_dc_end_all();
  for (const DcReports &each : reports) {
    EXPECT_EQ(each.ended, 1);
    EXPECT_EQ(each.done + each.error, 0);
  }
  EXPECT_THAT(names_in(kTavroDcArchiveFolder), IsEmpty());
}

TEST_F(Collector, AnAbsentOrEndedHandleIsRefusedWithALogLine) {
  DcReports reports;
  tavro_dc_context *ended = reports.create();
  EXPECT_EQ(tavro_dc_deinit(ended), 0);
  for (tavro_dc_context *handle : {ended, static_cast<tavro_dc_context *>(nullptr)}) {
    std::filesystem::remove(kLog);
    EXPECT_EQ(tavro_dc_start(handle, nullptr), -1);
    EXPECT_EQ(tavro_dc_cancel(handle), -1);
    EXPECT_EQ(tavro_dc_deinit(handle), -1);
    for (const char *line : {"  tavro_dc_start : handle is null \n", "> tavro_dc_cancel invalid handle \n",
                             "> tavro_dc_deinit invalid handle\n"})
      EXPECT_THAT(content_of(kLog), HasSubstr(line));
  }
}

TEST_F(Collector, WithoutAThreadThereIsNoHandleButStillTheInitCallback) {
  pthread_attr_t usual, absurd;
  pthread_getattr_default_np(&usual);
  pthread_attr_init(&absurd);
  pthread_attr_setstacksize(&absurd, size_t{1} << 46);
  pthread_setattr_default_np(&absurd);
  DcReports reports;
  tavro_dc_report_info info = reports.info();
  info.listener.dc_init_cb = [](tavro_dc_context *handle, auto *, void *data) {
    DcReports::of(data).ended += handle ? 10 : 1;
  };
  tavro_dc_context *handle = nullptr;
  EXPECT_EQ(tavro_dc_init(&handle, &info, &reports), 0);
  pthread_setattr_default_np(&usual);
  EXPECT_EQ(handle, nullptr);
  EXPECT_EQ(reports.ended, 1);
  EXPECT_EQ(tavro_dc_start(handle, nullptr), -1);
}

TEST_F(Collector, TwoThreadsMayStartCancelAndEndItInAnyOrder) {
  make_folder("a_1", 1000, {"x.cs"});
  constexpr int kSequences = 1000;
  for (unsigned seed = 0; seed < kSequences; ++seed) {
    DcReports reports;
    reports.ends_itself = seed % 3 == 0;
    tavro_dc_context *handle = reports.create();
    std::atomic<int> accepted_ends{0};
    const auto play = [&](unsigned own_seed) {
      std::minstd_rand random(own_seed);
      for (int step = 0; step < 4; ++step) {
        const auto kind = random() % 4;
        if (kind == 0) accepted_ends += tavro_dc_cancel(handle) == 0;
        if (kind == 1) accepted_ends += tavro_dc_deinit(handle) == 0;
        if (kind > 1) tavro_dc_start(handle, nullptr);
      }
    };
    std::thread other([&] { play(2 * seed + 1); });
    play(2 * seed + 2);
    other.join();
    ASSERT_LE(accepted_ends, 1);
    tavro_dc_cancel(handle);
    ASSERT_TRUE(DcReports::wait_for([&] { return reports.ended == 1; })) << "seed " << seed;
  }
  tavro_dc_end_all();
  for (const std::string &name : names_in(kTavroDcArchiveFolder)) EXPECT_EQ(name, "tavro_1.zip");
}

}  // namespace
