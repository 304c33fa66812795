#include <gmock/gmock.h>

#include "applications.h"
#include "display.h"
#include "environment.h"
#include "folder.h"
#include "sandbox.h"

namespace phone {
namespace {

using testing::Contains;
using testing::Not;

TEST(ScreenSizeTest, OnlyTwoSensibleNumbersAreASize) {
  ScreenSize size;
  ASSERT_TRUE(parse_size("480x800", &size));
  EXPECT_EQ(size.width, 480);
  EXPECT_EQ(size.height, 800);
  for (const char *text :
       {"", "480", "480x", "480x800x24", "-480x800", "99x800", "480x99999", "axb", "480 x800 "}) {
    EXPECT_FALSE(parse_size(text, &size)) << text;
  }
  EXPECT_EQ(size.width, 480);
}

TEST(ApplicationIdTest, ABusNameThatAnApplicationCanHaveIsAnId) {
  EXPECT_TRUE(is_application_id("corvane.tavro-lite"));
  for (const char *text : {"", "tavro", "a..b", "a.b c", ":1.2", "a.1", "a/b.c", "ä.ö"}) {
    EXPECT_FALSE(is_application_id(text)) << text;
  }
}

class PhoneFolderTest : public testing::Test {
 protected:
  PhoneFolderTest() : path_(g_dir_make_tmp("phone.XXXXXX", nullptr)), folder_{path_.get()} {
    create_folder(folder_);
  }
  ~PhoneFolderTest() override { remove_tree(folder_.dir); }

  TavroGText path_;
  Folder folder_;
};

TEST_F(PhoneFolderTest, OnePhoneIsOneFolderByWhateverNameItIsReached) {
  const std::string link = folder_.dir + "/link";
  ASSERT_EQ(symlink(folder_.dir.c_str(), link.c_str()), 0);
  Folder found;
  ASSERT_TRUE(find_folder(link + "/../link", &found));
  EXPECT_EQ(found.dir, folder_.dir);
  EXPECT_FALSE(find_folder("/tmp/two\nlines", &found));
}

TEST_F(PhoneFolderTest, AStateWithoutItsLockIsOnlyAMemory) {
  ASSERT_TRUE(write_state(folder_, {{"dir", folder_.dir}, {"bus", "unix:path=/a,guid=b"}, {"pid", "1"}}));
  EXPECT_EQ(read_state(folder_)["bus"], "unix:path=/a,guid=b");
  EXPECT_EQ(public_lines(read_state(folder_)), "dir=" + folder_.dir + "\nbus=unix:path=/a,guid=b\n");
  EXPECT_FALSE(is_running(folder_));
  const auto lock = lock_folder(folder_);
  ASSERT_TRUE(lock && *lock);
  EXPECT_TRUE(is_running(folder_));
  const auto second = lock_folder(folder_);
  EXPECT_TRUE(second && !*second);
  EXPECT_FALSE(lock_folder({folder_.dir + "/none"}));
}

TEST_F(PhoneFolderTest, SocketPathsStayShortAndThoseOfAKilledPhoneAreGone) {
  const std::string path = make_socket_folder(folder_);
  ASSERT_TRUE(write_private_file(path + "/bus", ""));
  EXPECT_EQ(make_socket_folder(folder_), path);
  EXPECT_FALSE(g_file_test((path + "/bus").c_str(), G_FILE_TEST_EXISTS));
  const Folder deep = {"/" + std::string(300, 'x')};
  EXPECT_LT(make_socket_folder(deep).size(), 90u);
  remove_tree(make_socket_folder(deep));
  remove_tree(path);
}

TEST_F(PhoneFolderTest, ProgramsSeeThePhoneAndOnlyThoseHostBusesThatAreThere) {
  g_setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/no/such/bus", TRUE);
  g_setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/tmp,guid=1", TRUE);
  g_setenv("WAYLAND_DISPLAY", "wayland-0", TRUE);
  const Environment environment = phone_environment(folder_, "/a b", true);
  EXPECT_EQ(environment.get("DBUS_SESSION_BUS_ADDRESS"), "unix:path=/a%20b/bus");
  EXPECT_EQ(environment.get("DBUS_SYSTEM_BUS_ADDRESS"), environment.get("DBUS_SESSION_BUS_ADDRESS"));
  EXPECT_FALSE(environment.has("TAVRO_HOST_SESSION_BUS"));
  EXPECT_EQ(environment.get("TAVRO_HOST_SYSTEM_BUS"), "unix:path=/tmp,guid=1");
  EXPECT_FALSE(environment.has("WAYLAND_DISPLAY"));
}

TEST(SandboxTest, AFolderBelowOptStaysVisibleInside) {
  const Folder below{"/opt/phones/one"}, elsewhere{"/home/one"};
  EXPECT_THAT(sandboxed(Mode::kSandbox, below, {"true"}), Contains(below.dir));
  EXPECT_THAT(sandboxed(Mode::kSandbox, elsewhere, {"true"}), Not(Contains(elsewhere.dir)));
  EXPECT_THAT(sandboxed(Mode::kDirect, below, {"true"}), testing::ElementsAre("true"));
}

}  // namespace
}  // namespace phone
