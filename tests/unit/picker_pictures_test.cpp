// The gallery's files and their thumbnails: what is listed, how it is shrunk, what is refused, what is
// cached.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <utime.h>

#include <cmath>
#include <filesystem>
#include <fstream>

#include "picture_files.h"
#include "tavro_gallery.h"
#include "tavro_picture_info.h"
#include "tavro_thumbnail_maker.h"
#include "tavro_thumbnails.h"

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kRoot[] = "/opt/usr/media/pictures-test";
constexpr uint32_t kRed = 0xFFFF0000, kBlue = 0xFF0000FF, kWhite = 0xFFFFFFFF;

std::string make_file(const std::string &path, const std::string &bytes, time_t changed = 1000) {
  write_file(path, bytes);
  const utimbuf times{changed, changed};
  utime(path.c_str(), &times);
  return path;
}

class Pictures : public testing::Test {
 protected:
  void SetUp() override {
    fs::remove_all(kRoot);
    fs::remove_all(TAVRO_THUMBNAIL_FOLDER);
    fs::create_directories(TAVRO_THUMBNAIL_FOLDER);
  }
  static std::string in_root(const char *name) { return std::string(kRoot) + "/" + name; }
  static std::vector<std::string> list(const std::vector<std::string> &folders, int *unreadable = nullptr) {
    std::vector<std::string> paths;
    const int count = tavro_gallery_walk(folders, [&paths](const std::vector<tavro_gallery_file> &files) {
      for (const tavro_gallery_file &file : files) paths.push_back(file.path);
      return true;
    });
    if (unreadable) *unreadable = count;
    return paths;
  }
};

TEST_F(Pictures, AreListedNewestFirstWithVideosAndWithoutHiddenAndLinkedOnes) {
  const std::string old_picture = make_file(in_root("old.jpg"), "x", 100);
  const std::string new_picture = make_file(in_root("deep/er/new.PNG"), "x", 300);
  const std::string video = make_file(in_root("deep/clip.mp4"), "x", 200);
  make_file(in_root("notes.txt"), "x");
  make_file(in_root(".hidden/secret.jpg"), "x");
  make_file(in_root("deep/er/and/too/far.jpg"), "x");
  fs::create_directory_symlink("/", in_root("loop"));
  EXPECT_THAT(list({in_root("deep"), kRoot, kRoot}), ElementsAre(new_picture, video, old_picture));
}

TEST_F(Pictures, AFolderThatCannotBeReadIsToldApartFromOneThatIsNotThere) {
  int unreadable = -1;
  EXPECT_THAT(list({in_root("none")}, &unreadable), IsEmpty());
  EXPECT_EQ(unreadable, 0);
  make_file(in_root("file"), "x");
  EXPECT_THAT(list({in_root("file")}, &unreadable), IsEmpty());
  EXPECT_EQ(unreadable, 1);
}

TEST_F(Pictures, ThumbnailIsTheUprightMiddleOfThePicture) {
  const std::string wide = jpeg_bytes(320, 160, kRed, kBlue);
  struct {
    char orientation;
    uint32_t top_left, top_right, bottom_left;
  } const cases[] = {
      {1, kRed, kBlue, kRed}, {2, kBlue, kRed, kBlue}, {3, kBlue, kRed, kBlue}, {4, kRed, kBlue, kRed},
      {5, kRed, kRed, kBlue}, {6, kRed, kRed, kBlue},  {7, kBlue, kBlue, kRed}, {8, kBlue, kBlue, kRed},
  };
  for (const auto &expected : cases) {
    const std::string path =
        make_file(in_root("held.jpg"), with_orientation(wide, expected.orientation), expected.orientation);
    const tavro_thumbnail_pixels pixels = tavro_thumbnail_make(path, 16);
    ASSERT_EQ(pixels.size(), 256u);
    EXPECT_THAT(pixels[0], IsNear(expected.top_left)) << int(expected.orientation);
    EXPECT_THAT(pixels[15], IsNear(expected.top_right)) << int(expected.orientation);
    EXPECT_THAT(pixels[240], IsNear(expected.bottom_left)) << int(expected.orientation);
  }
}

TEST_F(Pictures, WhatIsTransparentIsShownOnWhite) {
  const tavro_thumbnail_pixels pixels =
      tavro_thumbnail_make(make_file(in_root("glass.png"), transparent_png(64)), 8);
  ASSERT_EQ(pixels.size(), 64u);
  EXPECT_THAT(pixels[0], IsNear(kWhite));
}

TEST_F(Pictures, WhatIsNoPictureOrWouldCostTooMuchHasNoThumbnail) {
  const std::string jpeg = jpeg_bytes(64, 64, kRed, kBlue);
  std::string huge_png = transparent_png(8);
  huge_png.replace(16, 8, std::string("\0\0\x80\0\0\0\x80\0", 8));
  struct {
    const char *name;
    std::string bytes;
  } const cases[] = {
      {"empty.jpg", ""},
      {"text.jpg", "no picture at all"},
      {"short.jpg", jpeg.substr(0, 3)},
      {"headless.png", huge_png.substr(0, 20)},
      {"endless_segments.jpg", "\xFF\xD8" + std::string(4000, '\xFF')},
      {"claims_65535.jpg", with_claimed_side(jpeg, 0xC0, '\xFF', '\xFF')},
      {"progressive_claims_10000.jpg", with_claimed_side(jpeg, 0xC2, '\x27', '\x10')},
      {"claims_32768.png", huge_png},
  };
  for (const auto &refused : cases)
    EXPECT_THAT(tavro_thumbnail_make(make_file(in_root(refused.name), refused.bytes), 16), IsEmpty())
        << refused.name;
  mkfifo(in_root("pipe.jpg").c_str(), 0600);
  EXPECT_THAT(tavro_thumbnail_make(in_root("pipe.jpg"), 16), IsEmpty());
  EXPECT_THAT(tavro_thumbnail_make(in_root("gone.jpg"), 16), IsEmpty());
}

TEST_F(Pictures, AThumbnailIsKeptForThisUserUntilItsFileChanges) {
  const std::string red = jpeg_bytes(64, 64, kRed, kRed), blue = jpeg_bytes(64, 64, kBlue, kBlue);
  const std::string path = make_file(in_root("photo.jpg"), red);
  tavro_thumbnail_make(path, 16);
  const std::string entry = tavro_thumbnail_cache_path(path, 16);
  struct stat info {};
  ASSERT_EQ(stat(entry.c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0600u);
  // The thumbnail of another picture in its place shows where it is taken from.
  const std::string other = make_file(in_root("other.jpg"), blue);
  tavro_thumbnail_make(other, 16);
  make_file(entry, file_contents(tavro_thumbnail_cache_path(other, 16)));
  EXPECT_THAT(tavro_thumbnail_make(path, 16)[0], IsNear(kBlue));
  make_file(path, red, 2000);
  EXPECT_THAT(tavro_thumbnail_make(path, 16)[0], IsNear(kRed));
}

TEST_F(Pictures, ADamagedEntryOfTheCacheIsMadeAnew) {
  const std::string path = make_file(in_root("photo.jpg"), jpeg_bytes(64, 64, kRed, kRed));
  tavro_thumbnail_make(path, 16);
  const std::string entry = tavro_thumbnail_cache_path(path, 16), whole = file_contents(entry);
  for (const std::string &damaged : {std::string(), whole.substr(0, whole.size() / 2),
                                     std::string(500, '\xD9'), jpeg_bytes(64, 64, kBlue, kBlue)}) {
    make_file(entry, damaged);
    EXPECT_THAT(tavro_thumbnail_make(path, 16)[0], IsNear(kRed));
    EXPECT_TRUE(file_contents(entry) == whole);
  }
}

TEST_F(Pictures, TheCacheLosesItsOldestEntriesAndWhatWasLeftHalfMade) {
  for (int i = 1; i <= 5; ++i) make_file(in_root(std::to_string(i).c_str()) + ".jpg", "x", 1000 - i);
  make_file(in_root(".unfinished.abc"), "x");
  EXPECT_EQ(tavro_thumbnail_cache_trim(kRoot, 2), 2u);
  std::vector<std::string> left;
  for (const auto &entry : fs::directory_iterator(kRoot)) left.push_back(entry.path().filename());
  EXPECT_THAT(left, testing::UnorderedElementsAre("1.jpg", "2.jpg"));
}

}  // namespace
