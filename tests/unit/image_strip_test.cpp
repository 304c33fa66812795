// What a picture file says beside its pixels, and the copies that are attached.
#include "image_world.h"
#include "tavro_image_strip.h"

namespace {

std::string jpeg_segment(unsigned char marker, const std::string &body) {
  const size_t length = body.size() + 2;
  return "\xFF"s + static_cast<char>(marker) + static_cast<char>(length >> 8) + static_cast<char>(length) +
         body;
}

std::string png_chunk(const std::string &type, const std::string &body) {
  return "\0\0\0"s + static_cast<char>(body.size()) + type + body + "csum";
}

std::string webp_chunk(const std::string &type, const std::string &body) {
  return type + static_cast<char>(body.size()) + "\0\0\0"s + body;
}

std::string box(const std::string &type, const std::string &body) {
  return "\0\0\0"s + static_cast<char>(8 + body.size()) + type + body;
}

tavro_strip_result strip(const std::string &bytes, std::string *stripped) {
  std::vector<unsigned char> left;
  const tavro_strip_result result = tavro_image_strip({bytes.begin(), bytes.end()}, &left);
  stripped->assign(left.begin(), left.end());
  return result;
}

TEST_F(Image, LosesItsMetadataButNoPixel) {
  const tavro_pixels picture = quarters(64, 64);
  const std::string plain_jpeg = jpeg_of(picture), png = transparent_png(8), webp = webp_of(picture);
  const std::string turned = with_orientation(plain_jpeg, 6);
  const size_t end_of_exif = turned.find("\xFF\xE0");
  ASSERT_NE(end_of_exif, turned.npos);
  const std::string secret = "SECRET";
  const std::string jpeg =
      turned.substr(0, end_of_exif) + jpeg_segment(0xE1, "Exif\0\0II*\0 GPS "s + secret) +
      jpeg_segment(0xE1, "http://ns.adobe.com/xap/1.0/\0"s + secret) + jpeg_segment(0xE2, "MPF\0"s + secret) +
      jpeg_segment(0xE0, "JFXX\0"s + secret) + jpeg_segment(0xED, secret) + jpeg_segment(0xFE, secret) +
      secret + jpeg_segment(0xE2, "ICC_PROFILE\0colours"s) + turned.substr(end_of_exif) + secret + plain_jpeg;
  const std::string texted_png = png.substr(0, 33) + png_chunk("tEXt", secret) + png_chunk("eXIf", secret) +
                                 png_chunk("tIME", secret) + png_chunk("prVt", secret) + png.substr(33) +
                                 secret;
  std::string extended_webp = "RIFF\0\0\0\0WEBP"s + webp_chunk("VP8X", "\x0C\0\0\0\x3F\0\0\x3F\0\0"s) +
                              webp_chunk("EXIF", secret) + webp.substr(12) + webp_chunk("XMP ", secret);
  extended_webp[4] = static_cast<char>(extended_webp.size() - 8);
  extended_webp[5] = static_cast<char>((extended_webp.size() - 8) >> 8);
  struct {
    const char *what;
    std::string bytes, kept;
  } const cases[] = {{"JPEG", jpeg, "colours"}, {"PNG", texted_png, "IDAT"}, {"WebP", extended_webp, "VP8L"}};
  for (const auto &given : cases) {
    SCOPED_TRACE(given.what);
    std::string stripped;
    ASSERT_EQ(strip(given.bytes, &stripped), TAVRO_STRIP_DONE);
    for (const std::string &gone : {secret, "GPS"s, "http"s, "MPF"s})
      EXPECT_EQ(stripped.find(gone), stripped.npos) << gone;
    EXPECT_NE(stripped.find(given.kept), stripped.npos);
    tavro_pixels before, after;
    ASSERT_TRUE(decode_image(make_file("given", given.bytes).c_str(), &before));
    ASSERT_TRUE(decode_image(make_file("stripped", stripped).c_str(), &after));
    EXPECT_TRUE(before.width == after.width &&
                std::equal(before.bytes.get(), before.bytes.get() + before.size(), after.bytes.get()));
  }
}

TEST(ImageStrip, RefusesAPictureWhoseMetadataCannotBeToldApart) {
  struct {
    std::string bytes;
    tavro_strip_result result;
  } const cases[] = {
      {"\xFF\xD8\xFF\xE1\xFF\xFF"s + "Exif", TAVRO_STRIP_BROKEN},
      {"\x89PNG\r\n\x1A\n\0\0\0\x08XXXX"s, TAVRO_STRIP_BROKEN},
      {"RIFF\x20\0\0\0WEBPVP8X\xFF\xFF\xFF\xFF"s, TAVRO_STRIP_BROKEN},
      {box("ftyp", "heic"), TAVRO_STRIP_BROKEN},
      {box("ftyp", "hevm\0\0\0\0"s), TAVRO_STRIP_BROKEN},
      {box("ftyp", "crx \0\0\0\1crx isom"s) + box("moov", "CNTH"), TAVRO_STRIP_BROKEN},
      {box("ftyp", "isom\0\0\0\0mp42avif"s), TAVRO_STRIP_BROKEN},
      {box("ftyp", "isom\0\0\2\0isomiso2avc1mp41"s) + box("free", "avif"), TAVRO_STRIP_NO_PICTURE},
      {"text", TAVRO_STRIP_NO_PICTURE}};
  for (const auto &given : cases) {
    std::string stripped;
    EXPECT_EQ(strip(given.bytes, &stripped), given.result) << given.bytes;
    EXPECT_EQ(stripped, "");
  }
}

TEST_F(Image, IsCopiedUnderItsOwnNameToBeAttached) {
  const std::string path = make_file("picture", webp_of(quarters(32, 32)));
  const std::string copies[] = {tavro_image_attachable_copy(path.c_str()),
                                tavro_image_attachable_copy(path.c_str())};
  EXPECT_NE(copies[0], copies[1]);
  EXPECT_NE(tavro_image_unused_path("jpg"), tavro_image_unused_path("jpg")) << "of two workers at once";
  for (const std::string &copy : copies) {
    EXPECT_THAT(copy, testing::StartsWith("/opt/usr/media/VantorCommunity/"));
    EXPECT_THAT(file_contents(copy), testing::StartsWith("\xFF\xD8"));
  }
  tavro_image_fault fault = TAVRO_IMAGE_GOOD;
  EXPECT_EQ(tavro_image_attachable_copy(make_file("text", "no picture").c_str(), &fault), "");
  EXPECT_EQ(fault, TAVRO_IMAGE_OTHER_KIND);
}

}  // namespace
