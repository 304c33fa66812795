#include "tavro_memcheck.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstdint>
#include <fstream>
#include <random>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "tavro_memory.h"

namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr char kLog[] = "/opt/usr/share/log/platform.log";

// Every test starts with an empty table and sees only the log lines that it caused.
class MemoryTracker : public ::testing::Test {
 protected:
  void SetUp() override {
    tavro_mem_check_init();
    new_lines();
  }

  std::vector<std::string> new_lines() {
    std::vector<std::string> lines;
    std::string line;
    for (std::ifstream log(kLog); std::getline(log, line);) lines.push_back(line);
    lines.erase(lines.begin(), lines.begin() + static_cast<long>(seen_));
    seen_ += lines.size();
    return lines;
  }

  std::vector<std::string> report() {
    new_lines();
    tavro_mem_report();
    return new_lines();
  }

 private:
  std::size_t seen_ = 0;
};

TEST_F(MemoryTracker, FullTableDropsTheNextBlockWithOneLine) {
  std::vector<char> blocks(kMemorySlotCount + 1);
  for (char &block : blocks) tavro_mem_insert(&block, 7, "file.cpp");
  const auto lines = new_lines();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_THAT(lines[0], EndsWith("All slot full at insertion"));
  const auto reported = report();
  ASSERT_EQ(reported.size(), kMemorySlotCount + 1u);
  EXPECT_THAT(reported.front(), EndsWith("MemoryLeakReport location = file.cpp line = 7"));
  EXPECT_THAT(reported.back(), EndsWith("MemoryLeakReport total leak = 5000"));
}

TEST_F(MemoryTracker, RemovingAnUnknownBlockIsLoggedAndChangesNothing) {
  char known, unknown;
  tavro_mem_insert(&known, 1, "a.cpp");
  tavro_mem_remove(&unknown, 9, "b.cpp");
  EXPECT_THAT(new_lines().at(0), HasSubstr("No match found in remove for "));
  EXPECT_THAT(report().back(), EndsWith("total leak = 1"));
}

TEST_F(MemoryTracker, EveryStepChangesTheSlotThatAScanWouldFind) {
  struct expected_slot {
    char *ptr;
    int in_use;
  };
  std::vector<expected_slot> expected(kMemorySlotCount, {nullptr, 0});
  std::vector<char> blocks(600);
  std::minstd_rand random(1);
  for (int step = 0; step < 30000; step++) {
    // Few addresses at first, so that many slots hold the same one; then enough to fill the table.
    char *block = &blocks[random() % (step < 3000 ? 40 : blocks.size())];
    const bool inserts = random() % 3 != 0;
    const auto found = std::find_if(expected.begin(), expected.end(), [&](const expected_slot &slot) {
      return inserts ? !slot.in_use : slot.in_use && slot.ptr == block;
    });
    if (found == expected.end()) continue;
    *found = {block, inserts ? 1 : 0};
    (inserts ? tavro_mem_insert : tavro_mem_remove)(block, step, "a.cpp");
    const tavro_meminfo_s &slot = gMemDb[found - expected.begin()];
    ASSERT_EQ(slot.ptr, found->ptr) << "step " << step;
    ASSERT_EQ(slot.slotfree, found->in_use) << "step " << step;
    ASSERT_TRUE(!inserts || slot.lineNo == step) << "step " << step;
  }
  EXPECT_THAT(new_lines(), IsEmpty());
}

TEST_F(MemoryTracker, HelpersPairEveryBlockWithItsRelease) {
  struct record {
    char *name;
  };
  auto *held = TAVRO_ZALLOC(record);
  held->name = TAVRO_STRDUP("name");
  {
    TavroText adopted(TAVRO_ADOPT(g_strdup("from the platform")));
    EXPECT_THAT(report().back(), EndsWith("total leak = 3"));
  }
  TAVRO_FREE(held->name);
  EXPECT_EQ(held->name, nullptr);
  TAVRO_FREE(held->name);
  TAVRO_FREE(held);
  EXPECT_EQ(TAVRO_STRDUP(nullptr), nullptr);
  EXPECT_THAT(report().front(), EndsWith("total leak = 0"));
}

TEST_F(MemoryTracker, ThreadsNeverShareASlot) {
  constexpr std::uint64_t kThreads = 2, kBlocks = 400, kRounds = 5;
  std::vector<std::vector<void *>> blocks(kThreads);
  // Every other one differs in its highest bits alone, which puts these into one place of any index, and far
  // more than fit there.
  for (std::uint64_t i = 1; i <= kThreads * kBlocks; i++)
    blocks[i % kThreads].push_back(reinterpret_cast<void *>(i << (i / kThreads % 2 ? 51 : 4)));
  const auto on_all_threads = [&](auto work) {
    std::vector<std::thread> threads;
    for (auto &own : blocks)
      threads.emplace_back([&own, work] {
        for (void *block : own) work(block);
      });
    for (auto &thread : threads) thread.join();
  };
  const auto insert = [](void *block) { tavro_mem_insert(block, 1, "a.cpp"); };
  for (std::uint64_t round = 0; round < kRounds; round++) {
    on_all_threads(insert);
    ASSERT_THAT(report().back(), EndsWith("total leak = 800"));
    on_all_threads([insert](void *block) {
      tavro_mem_remove(block, 2, "a.cpp");
      insert(block);
      tavro_mem_remove(block, 3, "a.cpp");
    });
    ASSERT_THAT(report().back(), EndsWith("total leak = 0"));
  }
}

}  // namespace
