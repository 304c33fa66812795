// Pictures as they are read and changed: upright, within bounds, without what is hidden.
#include <algorithm>

#include "ie_geometry.h"
#include "image_world.h"

namespace {

TEST_F(Image, IsDecodedUprightHoweverTheCameraWasHeld) {
  const std::string jpeg = jpeg_of(quarters(64, 32));
  struct {
    char orientation;
    uint32_t top_left, top_right, bottom_left;
  } const cases[] = {
      {1, kRed, kGreen, kBlue},   {2, kGreen, kRed, kWhite}, {3, kWhite, kBlue, kGreen},
      {4, kBlue, kWhite, kRed},   {5, kRed, kBlue, kGreen},  {6, kBlue, kRed, kWhite},
      {7, kWhite, kGreen, kBlue}, {8, kGreen, kWhite, kRed},
  };
  for (const auto &held : cases) {
    SCOPED_TRACE(int(held.orientation));
    tavro_pixels pixels;
    ASSERT_TRUE(
        decode_image(make_file("held.jpg", with_orientation(jpeg, held.orientation)).c_str(), &pixels));
    EXPECT_EQ(pixels.width, held.orientation < 5 ? 64 : 32);
    EXPECT_EQ(pixels.source_height, held.orientation < 5 ? 32 : 64);
    EXPECT_THAT(at(pixels, 4, 4), IsNear(held.top_left));
    EXPECT_THAT(at(pixels, pixels.width - 4, 4), IsNear(held.top_right));
    EXPECT_THAT(at(pixels, 4, pixels.height - 4), IsNear(held.bottom_left));
  }
}

TEST_F(Image, OfEachKindIsDecodedOrRefusedWithAReasonWithinBounds) {
  const tavro_pixels picture = quarters(64, 64);
  const std::string jpeg = jpeg_of(picture), webp = webp_of(picture);
  std::string huge_png = transparent_png(8), huge_webp = webp;
  huge_png.replace(16, 8, "\0\0\x27\x10\0\0\x27\x10"s);
  huge_webp.replace(21, 4, "\xFF\xFF\xFF\x0F");
  struct {
    const char *what;
    std::string bytes;
    tavro_image_fault fault;
    int width = 0, source_width = 0;
    uint32_t first = 0;
  } const cases[] = {
      {"JPEG", jpeg, TAVRO_IMAGE_GOOD, 64, 64, kRed},
      {"progressive JPEG", jpeg_of(picture, TJPF_BGRX, TJFLAG_PROGRESSIVE), TAVRO_IMAGE_GOOD, 64, 64, kRed},
      {"CMYK JPEG", jpeg_of(picture, TJPF_CMYK), TAVRO_IMAGE_GOOD, 64, 64, kBlue},
      {"JPEG cut off", jpeg.substr(0, jpeg.size() - 100), TAVRO_IMAGE_GOOD, 64, 64, kRed},
      {"JPEG of 100 megapixels", with_claimed_side(jpeg, 0xC0, 0x27, 0x10), TAVRO_IMAGE_GOOD, 2500, 10000,
       kRed},
      {"the same, progressive", with_claimed_side(jpeg, 0xC2, 0x27, 0x10), TAVRO_IMAGE_TOO_LARGE},
      {"JPEG of the largest size", with_claimed_side(jpeg, 0xC0, '\xFF', '\xFF'), TAVRO_IMAGE_TOO_LARGE},
      {"JPEG of no size", with_claimed_side(jpeg, 0xC0, 0, 0), TAVRO_IMAGE_OTHER_KIND},
      {"PNG on white", transparent_png(8), TAVRO_IMAGE_GOOD, 8, 8, kWhite},
      {"PNG of 16 bits", png_of_16_bits(8), TAVRO_IMAGE_GOOD, 8, 8, kWhite},
      {"PNG of 100 megapixels", huge_png, TAVRO_IMAGE_TOO_LARGE},
      {"PNG cut off", transparent_png(8).substr(0, 40), TAVRO_IMAGE_OTHER_KIND},
      {"WebP", webp, TAVRO_IMAGE_GOOD, 64, 64, kRed},
      {"WebP of 268 megapixels", huge_webp, TAVRO_IMAGE_TOO_LARGE},
      {"WebP cut off", webp.substr(0, 30), TAVRO_IMAGE_OTHER_KIND},
      {"nothing", "", TAVRO_IMAGE_OTHER_KIND},
      {"text", "no picture at all, but longer than any header of one", TAVRO_IMAGE_OTHER_KIND},
  };
  for (const auto &given : cases) {
    SCOPED_TRACE(given.what);
    tavro_pixels pixels;
    tavro_image_fault fault = TAVRO_IMAGE_NO_MEMORY;
    tavro_image_decode(make_file("picture", given.bytes).c_str(), {}, &pixels, &fault);
    EXPECT_EQ(fault, given.fault);
    EXPECT_EQ(pixels.width, given.width);
    EXPECT_EQ(pixels.source_width, given.source_width);
    if (given.width > 0) {
      EXPECT_THAT(at(pixels, 1, 1), IsNear(given.first));
    }
  }
  tavro_image_fault fault = TAVRO_IMAGE_GOOD;
  tavro_pixels pixels;
  EXPECT_FALSE(tavro_image_decode(kRoot, {}, &pixels, &fault));
  EXPECT_EQ(fault, TAVRO_IMAGE_UNREADABLE);
}

TEST_F(Image, SaysNothingOfWhatIsHiddenInTheSavedFile) {
  // The same around the areas, letters of a different text with as much ink in them.
  const auto page = [](int text) {
    return pixels_of(400, 300, [text](int x, int y) {
      const bool is_within = x >= 50 && x < 250 && y >= 40 && y < 120;
      return is_within && (x + y + text) % 4 == 0 ? kBlack : is_within ? kWhite : kGreen;
    });
  };
  struct {
    const char *what;
    std::vector<tavro_hidden_area> areas;
    uint32_t seen;
  } const cases[] = {
      {"filled", {{50, 40, 200, 80, TAVRO_HIDE_FILL}}, kBlack},
      {"pixelated", {{50, 40, 200, 80, TAVRO_HIDE_PIXELATE}}, 0xFFBBBBBB},
      {"in two parts, reaching out of the picture, beside empty ones",
       {{-1000, -5, 1150, 200, TAVRO_HIDE_FILL},
        {150, 40, 250, 80, TAVRO_HIDE_FILL},
        {7, 7, 0, 9, TAVRO_HIDE_FILL},
        {9, 9, 5, -5, TAVRO_HIDE_FILL},
        {999, 9, 9, 9, TAVRO_HIDE_PIXELATE}},
       kBlack},
  };
  for (const auto &hidden : cases) {
    SCOPED_TRACE(hidden.what);
    std::string saved[2];
    for (int text : {0, 1}) {
      tavro_pixels pixels = page(text);
      tavro_image_hide(pixels, hidden.areas);
      const std::string path = in_root(text ? "one.jpg" : "other.jpg");
      ASSERT_TRUE(tavro_image_save_jpeg(pixels, 95, path.c_str()));
      saved[text] = file_contents(path);
      tavro_pixels sent;
      ASSERT_TRUE(decode_image(path.c_str(), &sent));
      EXPECT_THAT(at(sent, 150, 80), IsNear(hidden.seen));
      EXPECT_THAT(at(sent, 300, 250), IsNear(kGreen));
      fs::remove(path);
    }
    EXPECT_TRUE(saved[0] == saved[1]);
  }
}

TEST_F(Image, OfAnySizeIsCroppedToItsRowsBelowTheStatusBar) {
  for (const auto &[width, height] : {std::pair(1080, 1920), {480, 800}, {1, 147}}) {
    const tavro_pixels screen = pixels_of(width, height, [h = height](int, int y) {
      return y < 146 ? kRed : y < (h + 146) / 2 ? kGreen : kBlue;
    });
    const std::string path = in_root("out.jpg");
    ASSERT_TRUE(tavro_crop_image(screen.bytes.get(), width, height, path.c_str()));
    tavro_pixels cropped;
    ASSERT_TRUE(decode_image(path.c_str(), &cropped));
    EXPECT_EQ(std::pair(cropped.width, cropped.height), std::pair(720, 1200));
    EXPECT_THAT(at(cropped, 360, 0), IsNear(height > 147 ? kGreen : kBlue));
    EXPECT_THAT(at(cropped, 360, 1199), IsNear(kBlue));
    struct stat info {};
    ASSERT_EQ(stat(path.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 0777, 0600u);
    fs::remove(path);
  }
}

TEST_F(Image, IsNotWrittenWhereItCannotBeOrOverAnotherFile) {
  const tavro_pixels screen = quarters(100, 200);
  const std::string taken = make_file("taken.jpg", "mine");
  EXPECT_FALSE(tavro_crop_image(screen.bytes.get(), 100, 146, in_root("short.jpg").c_str()));
  EXPECT_FALSE(tavro_crop_image(screen.bytes.get(), 100, 200, taken.c_str()));
  EXPECT_FALSE(tavro_image_save_jpeg(screen, 90, taken.c_str()));
  EXPECT_FALSE(tavro_image_save_jpeg(screen, 90, in_root("no/folder.jpg").c_str()));
  EXPECT_EQ(file_contents(taken), "mine");
  EXPECT_EQ(std::distance(fs::directory_iterator(kRoot), {}), 1);
}

TEST(ImageUtil, CountsTheBytesOfPicturesThatCanBe) {
  constexpr auto kColours = IMAGE_UTIL_COLORSPACE_BGRA8888;
  unsigned int size = 7;
  EXPECT_EQ(image_util_calculate_buffer_size(1 << 15, 1 << 15, kColours, &size),
            IMAGE_UTIL_ERROR_INVALID_PARAMETER);
  EXPECT_EQ(image_util_calculate_buffer_size(3, 5, static_cast<image_util_colorspace_e>(1), &size),
            IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT);
  EXPECT_EQ(image_util_calculate_buffer_size(3, 5, kColours, &size), IMAGE_UTIL_ERROR_NONE);
  EXPECT_EQ(size, 60u);
}

TEST(Rect, MovesGrowsAndHoldsPointsStrictlyInside) {
  ie::CRect rect(10, 20, 30, 60);
  rect.MoveTo(0, 5);
  EXPECT_EQ(std::pair(rect.Width(), rect.Height()), std::pair(20, 40));
  rect.Deflate(-2, -3, 4, 5);
  EXPECT_EQ(std::tuple(rect.Left(), rect.Top(), rect.Right(), rect.Bottom()), std::tuple(-2, 2, 24, 50));
  EXPECT_TRUE(rect.PtInRect(-1, 3));
  EXPECT_FALSE(rect.PtInRect(-2, 3) || rect.PtInRect(24, 3) || rect.PtInRect(0, 2) || rect.PtInRect(0, 50));
}

}  // namespace
