// The catalogue's list of 500 beta programmes, received for the first time and received again. Runs in a
// phone of its own. That what is received again writes nothing is counted here too, through SQLite's trace;
// the counter proves itself on a list in which one name is another.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <deque>
#include <string>

#include "statement_watch.h"
#include "tavro_dbmgr.h"
#include "tavro_dbmgr_catalogue.h"
#include "tavro_memory.h"

namespace {

constexpr int kProgrammes = 500;

class Catalogue {
 public:
  Catalogue() {
    for (int i = kProgrammes; i > 0; i--) {
      const std::string id = std::to_string(i);
      tavro_dbmgr_beta_info &info = infos_.emplace_back();
      info.betaId = i;
      info.betaType = own("app");
      info.betaName = own("Gallery's beta " + id);
      info.betaVersion = own("2.4." + id);
      info.betaDate = 1600000000000ULL + static_cast<unsigned long long>(i);
      info.discussionUrl = own("https://community.example.org/board/" + id);
      info.user_name = own("bench@example.org");
      info.userStatus = i % 5 + 1;
      list_ = g_slist_prepend(list_, &info);
    }
  }
  ~Catalogue() { g_slist_free(list_); }
  Catalogue(const Catalogue &) = delete;
  Catalogue &operator=(const Catalogue &) = delete;

  bool receive() const { return tavro_dbmgr_update_beta_list(list_) == 0; }
  void rename_one(const char *name) { infos_.front().betaName = own(name); }

 private:
  char *own(const std::string &text) { return texts_.emplace_back(text).data(); }

  std::deque<std::string> texts_;  // a deque's elements stay where they are
  std::deque<tavro_dbmgr_beta_info> infos_;
  GSList *list_ = nullptr;
};

// No connection lasts longer than an operation, so each one is watched.
StatementWatch *gWatch = nullptr;

void ReceiveCatalogue_First(benchmark::State &state) {
  const Catalogue catalogue;
  for (auto _ : state) {
    state.PauseTiming();
    _tavro_dbmgr_clear_db(TAVRO_DBMGR_TABLE_BETA);
    gWatch->take("");
    state.ResumeTiming();
    if (!catalogue.receive() || gWatch->take("INSERT") != kProgrammes) state.SkipWithError("not stored");
  }
}

void ReceiveCatalogue_Again(benchmark::State &state) {
  const Catalogue catalogue;
  catalogue.receive();
  gWatch->take("");
  for (auto _ : state)
    if (!catalogue.receive() || gWatch->take("UPDATE") != 0) state.SkipWithError("written again");
}

BENCHMARK(ReceiveCatalogue_First)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(ReceiveCatalogue_Again)->Unit(benchmark::kMillisecond)->UseRealTime();

bool _is_one_change_one_update() {
  Catalogue catalogue;
  catalogue.receive();
  catalogue.rename_one("Another name");
  gWatch->take("");
  catalogue.receive();
  const int updates = gWatch->take("UPDATE");
  if (updates != 1) std::fprintf(stderr, "a changed name issued %d UPDATEs instead of 1\n", updates);
  return updates == 1;
}

}  // namespace

int main(int argc, char **argv) {
  tavro_mem_check_init();
  if (tavro_dbmgr_init_semaphore() != 0 || tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 1;
  StatementWatch watch;
  gWatch = &watch;
  if (!_is_one_change_one_update()) return 1;
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
