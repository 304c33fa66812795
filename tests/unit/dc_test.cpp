#include <minizip/unzip.h>
#include <sys/resource.h>
#include <sys/wait.h>

#include <csignal>
#include <random>

#include "dc_world.h"
#include "tavro_handles.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace fs = std::filesystem;

const std::string kDumps = TAVRO_CRASH_DUMP_FOLDER;
const std::string kArchives = kTavroDcArchiveFolder;

class Collection : public DcWorld {
 protected:
  using Zip = TavroHandle<std::remove_pointer_t<unzFile>, unzClose>;

  // The names of the archive's files, each of which was unpacked and its checksum compared.
  static std::vector<std::string> entries_of(const std::string &archive) {
    std::vector<std::string> names;
    const Zip zip(unzOpen((kArchives + archive).c_str()));
    unz_global_info total = {};
    if (!zip || unzGetGlobalInfo(zip.get(), &total) != UNZ_OK) return {"no archive"};
    for (int error = unzGoToFirstFile(zip.get()); error == UNZ_OK; error = unzGoToNextFile(zip.get())) {
      char name[300];
      std::string block(1 << 16, '\0');
      unzGetCurrentFileInfo64(zip.get(), nullptr, name, sizeof(name), nullptr, 0, nullptr, 0);
      int count = unzOpenCurrentFile(zip.get()) == UNZ_OK ? 1 : -1;
      while (count > 0) count = unzReadCurrentFile(zip.get(), block.data(), 1 << 16);
      if (count < 0 || unzCloseCurrentFile(zip.get()) != UNZ_OK) return {"broken"};
      names.push_back(name);
    }
    return names.size() == total.number_entry ? names : std::vector<std::string>{"broken"};
  }

  static int collect(std::string *folder = nullptr) {
    TavroGText name;
    const int result = _tavro_dc_get_crash_dump_and_zip(tavro_out(name));
    if (folder) *folder = name ? name.get() : "";
    return result;
  }

  static std::string noise(size_t size) {
    std::minstd_rand random(1);
    std::string bytes(size, '\0');
    for (char &byte : bytes) byte = static_cast<char>(random() >> 8);
    return bytes;
  }

  // What the work gives in a process that can write no more than this into one file.
  static int on_a_full_disk(rlim_t size, int (*work)()) {
    const pid_t child = fork();
    if (child == 0) {
      signal(SIGXFSZ, SIG_IGN);
      const rlimit limit = {size, size};
      setrlimit(RLIMIT_FSIZE, &limit);
      _exit(work());
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
};

TEST_F(Collection, TheNewestFolderWithFilesIsArchivedUnderTheLastPartOfItsName) {
  struct Case {
    std::string folder;
    std::vector<std::string> files;
    std::string archive;
    std::vector<std::string> entries;
  };
  const Case cases[] = {
      {"a_b_c",
       {"1.coredump.gz", "1.log.gz", "1.cs", "note"},
       "tavro_c.zip",
       {"1.coredump.gz", "1.cs", "1.log.gz"}},
      {"plain", {"x.cs.txt"}, "tavro_plain.zip", {"x.cs.txt"}},
      {"__", {"x.cs"}, "tavro_.zip", {"x.cs"}},
      {"two\n_lines\n", {"x\n.cs"}, "tavro_lines\n.zip", {"x\n.cs"}},
      {"kinds_1",
       {"x.cs.log.gz.coredump.gz", "y.cs.log.gz"},
       "tavro_1.zip",
       {"x.cs.log.gz.coredump.gz", "y.cs.log.gz"}},
      {std::string(200, 'n') + "_" + std::string(54, 'm'),
       {std::string(252, 'f') + ".cs"},
       "tavro_" + std::string(54, 'm') + ".zip",
       {std::string(252, 'f') + ".cs"}},
  };
  for (const Case &each : cases) {
    SetUp();
    make_folder(each.folder, 2000, each.files);
    make_folder("newer_empty", 3000, {"readme", "core.gz"});
    make_folder("older_full", 1000, {"old.coredump.gz"});
    std::string folder;
    ASSERT_EQ(collect(&folder), 0) << each.folder;
    EXPECT_EQ(folder, each.folder);
    EXPECT_THAT(names_in(kArchives), ElementsAre(each.archive));
    EXPECT_EQ(entries_of(each.archive), each.entries);
  }
}

TEST_F(Collection, WhatCannotBeArchivedGivesTheRightResultAndNoArchive) {
  fs::remove_all(kDumps);
  EXPECT_EQ(collect(), -1) << "no dump folder";
  fs::create_directories(kDumps);
  EXPECT_EQ(collect(), 1);
  write_file(kDumps + "a file.cs", "is no folder");
  EXPECT_EQ(collect(), 1);
  make_folder("a_1", 1000, {});
  EXPECT_EQ(collect(), -1) << "no files";
  make_folder(std::string(255, 'n'), 2000, {"x.cs"});
  EXPECT_EQ(collect(), -1) << "the archive's name would be too long";
  fs::remove(kDumps + std::string(255, 'n') + "/x.cs");
  EXPECT_THAT(names_in(kArchives), IsEmpty());
  make_folder("a_1", 1000, {"x.cs"});
  EXPECT_EQ(_tavro_dc_zip_files((kDumps + "a_1/x.cs").c_str(), nullptr, nullptr, "a_/../../x"), -1);
  fs::remove_all(kArchives);
  write_file(kArchives.substr(0, kArchives.size() - 1), "the archive folder is a file");
  EXPECT_EQ(collect(), -1);
  fs::remove(kArchives.substr(0, kArchives.size() - 1));
}

TEST_F(Collection, LinksAndPipesAreLeftOutWhereverTheyStand) {
  write_file("/opt/usr/secret/x.cs", "secret");
  fs::create_directory_symlink("/opt/usr/secret", kDumps + "linked_9");
  make_folder("pipes_8", 4000, {});
  ASSERT_EQ(mkfifo((kDumps + "pipes_8/x.coredump.gz").c_str(), 0600), 0);
  fs::create_symlink("/opt/usr/secret/x.cs", kDumps + "pipes_8/x.cs");
  make_folder("real_7", 1000, {"x.log.gz"});
  fs::create_symlink("/opt/usr/secret/x.cs", kDumps + "real_7/y.cs");
  // Nor are they written to where the unfinished archive belongs.
  fs::create_directories(kArchives);
  fs::create_symlink("/opt/usr/secret/x.cs", kArchives + ".tavro_dc.0.part");
  ASSERT_EQ(mkfifo((kArchives + ".tavro_dc.1.part").c_str(), 0600), 0);
  ASSERT_EQ(collect(), 0);
  EXPECT_EQ(fs::file_size("/opt/usr/secret/x.cs"), 6u);
  for (const char *planted : {".tavro_dc.0.part", ".tavro_dc.1.part"}) fs::remove(kArchives + planted);
  EXPECT_THAT(entries_of("tavro_7.zip"), ElementsAre("x.log.gz"));
  // One that takes the place of a file after it was chosen.
  for (const char *path : {"pipes_8/x.cs", "pipes_8/x.coredump.gz", "linked_9/x.cs"})
    EXPECT_EQ(_tavro_dc_zip_files((kDumps + path).c_str(), nullptr, nullptr, "a_1"), -1) << path;
  EXPECT_THAT(names_in(kArchives), ElementsAre("tavro_7.zip"));
}

TEST_F(Collection, AFileThatCannotBeAddedLeavesAWholeArchiveOfTheOthers) {
  make_folder("a_1", 1000, {"x.cs", "x.log.gz"});
  write_file(kDumps + "a_1/x.coredump.gz", noise(300000));
  EXPECT_EQ(on_a_full_disk(100000, [] { return collect(); }), 0);
  EXPECT_THAT(entries_of("tavro_1.zip"), ElementsAre("x.cs", "x.log.gz"));
  EXPECT_EQ(
      _tavro_dc_zip_files("/opt/usr/vanished.coredump.gz", (kDumps + "a_1/x.cs").c_str(), nullptr, "b_2"), 0);
  EXPECT_THAT(entries_of("tavro_2.zip"), ElementsAre("x.cs"));
  // The last one is the one that does not fit.
  EXPECT_EQ(on_a_full_disk(100000,
                           [] {
                             return _tavro_dc_zip_files((kDumps + "a_1/x.cs").c_str(), nullptr,
                                                        (kDumps + "a_1/x.coredump.gz").c_str(), "c_3");
                           }),
            0);
  EXPECT_THAT(entries_of("tavro_3.zip"), ElementsAre("x.cs"));
  EXPECT_EQ(names_in(kArchives).size(), 3u);
  EXPECT_EQ(std::system(("unzip -tqq " + kArchives + "tavro_3.zip").c_str()), 0);
}

TEST_F(Collection, AFullDiskLeavesNothingAndTheArchiveOfEarlierAsItWas) {
  make_folder("a_1", 1000, {"x.cs"});
  ASSERT_EQ(collect(), 0);
  write_file(kDumps + "a_1/x.cs", noise(50000));
  // At every step of writing: an entry's head, its content, its end, the archive's end.
  for (const rlim_t size : {0u, 20u, 9000u, 50010u, 50080u})
    EXPECT_NE(on_a_full_disk(size, [] { return collect(); }), 0) << size;
  EXPECT_THAT(names_in(kArchives), ElementsAre("tavro_1.zip"));
  EXPECT_LT(fs::file_size(kArchives + "tavro_1.zip"), 1000u);
  EXPECT_EQ(collect(), 0);
  EXPECT_GT(fs::file_size(kArchives + "tavro_1.zip"), 50000u);
  // However many files it does not take, one line says so.
  for (const char *name : {"x.coredump.gz", "x.log.gz"}) write_file(kDumps + "a_1/" + name, noise(50000));
  fs::remove("/opt/usr/share/log/platform.log");
  EXPECT_NE(on_a_full_disk(9000, [] { return collect(); }), 0);
  std::ifstream log("/opt/usr/share/log/platform.log");
  int lines = 0;
  for (std::string line; std::getline(log, line);) lines += line.find(" E/") != std::string::npos;
  EXPECT_EQ(lines, 1);
}

TEST_F(Collection, TheArchiveIsPrivateDatedAndReplacesAnEarlierOneAndWhatAKilledRunLeft) {
  write_file(kArchives + "tavro_1.zip", "an earlier one");
  write_file(kArchives + ".tavro_dc.0.part", std::string(5000, 'x'));
  fs::permissions(kArchives + ".tavro_dc.0.part", fs::perms::owner_read | fs::perms::owner_write);
  make_folder("a_1", 1000, {"x.cs"});
  const timespec times[] = {{1700000000, 0}, {1700000000, 0}};
  utimensat(AT_FDCWD, (kDumps + "a_1/x.cs").c_str(), times, 0);
  ASSERT_EQ(collect(), 0);
  EXPECT_THAT(names_in(kArchives), ElementsAre("tavro_1.zip"));
  EXPECT_EQ(fs::status(kArchives + "tavro_1.zip").permissions(),
            fs::perms::owner_read | fs::perms::owner_write);
  const Zip zip(unzOpen((kArchives + "tavro_1.zip").c_str()));
  unz_file_info info = {};
  unzGoToFirstFile(zip.get());
  unzGetCurrentFileInfo(zip.get(), &info, nullptr, 0, nullptr, 0, nullptr, 0);
  EXPECT_EQ(info.tmu_date.tm_year, 2023u);
  EXPECT_EQ(info.tmu_date.tm_mon, 10u);
}

TEST_F(Collection, AFileIsTakenOnlyAsLongAsItWasWhenItWasOpened) {
  // Files of the kernel have no length, but give some kilobytes to whoever reads on.
  const std::string longer_than_it_says = "/proc/" + std::to_string(getpid()) + "/maps";
  EXPECT_EQ(_tavro_dc_zip_files(longer_than_it_says.c_str(), nullptr, nullptr, "a_1"), 0);
  EXPECT_THAT(entries_of("tavro_1.zip"), ElementsAre("maps"));
  EXPECT_LT(fs::file_size(kArchives + "tavro_1.zip"), 300u);
}

TEST_F(Collection, ThousandsOfFoldersAreLookedThrough) {
  for (int i = 0; i < 5000; ++i) make_folder("f_" + std::to_string(i), 1000 + i * 7919 % 5000, {});
  make_folder("found_x", 10, {"x.cs"});
  std::string folder;
  EXPECT_EQ(collect(&folder), 0);
  EXPECT_EQ(folder, "found_x");
}

TEST(CrashFolderList, IsSortedNewestFirstWithItsRuleForEqualTimes) {
  struct Case {
    std::vector<std::pair<long, std::string>> found;
    std::string sorted;
  };
  // A list takes what is found at its front, and is sorted from there.
  const Case cases[] = {
      {{{1, "a"}, {3, "b"}, {2, "c"}}, "bca"},
      {{{5, "a"}, {5, "b"}, {5, "c"}}, "abc"},             // each meets the head
      {{{5, "a"}, {5, "b"}, {9, "c"}}, "cba"},             // each is placed further down
      {{{5, "a"}, {9, "b"}, {5, "c"}, {5, "d"}}, "bcda"},  // two met it, one did not
      {{{4, "a"}, {7, "b"}, {4, "c"}, {7, "d"}, {2, "e"}}, "bdcae"},
  };
  for (const Case &each : cases) {
    tavro_dc_folder *list = nullptr;
    for (const auto &[time, name] : each.found)
      list = _tavro_dc_insert_crash_folder_list(list, time, name.c_str());
    _tavro_dc_sort_crash_folder_list(&list);
    std::string sorted;
    for (const tavro_dc_folder *node = list; node; node = node->next) sorted += node->folder_path;
    EXPECT_EQ(sorted, each.sorted);
    _tavro_dc_free_folder_list(list);
  }
}

}  // namespace
