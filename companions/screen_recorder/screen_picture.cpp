#include "screen_picture.h"

#include <sys/mman.h>
#include <turbojpeg.h>
#include <xcb/randr.h>
#include <xcb/shm.h>
#include <xcb/xcb.h>

#include <cstring>
#include <optional>

#include "recorder_log.h"
#include "tavro_handles.h"

namespace {

using Connection = TavroHandle<xcb_connection_t, xcb_disconnect>;
template <typename T>
using Reply = TavroHandle<T, free>;

struct Screen {
  Connection connection;
  const xcb_screen_t *screen = nullptr;  // the connection's
};

std::optional<Screen> open_screen() {
  int number = 0;
  Screen opened{Connection(xcb_connect(nullptr, &number)), nullptr};
  if (xcb_connection_has_error(opened.connection.get())) return std::nullopt;
  auto screens = xcb_setup_roots_iterator(xcb_get_setup(opened.connection.get()));
  for (; screens.rem && number > 0; --number) xcb_screen_next(&screens);
  if (!screens.rem) return std::nullopt;
  opened.screen = screens.data;
  return opened;
}

uint32_t red_mask_of_root(const xcb_screen_t *screen) {
  for (auto depth = xcb_screen_allowed_depths_iterator(screen); depth.rem; xcb_depth_next(&depth)) {
    for (auto visual = xcb_depth_visuals_iterator(depth.data); visual.rem; xcb_visualtype_next(&visual)) {
      if (visual.data->visual_id == screen->root_visual) return visual.data->red_mask;
    }
  }
  return 0;
}

struct PixelLayout {
  uint8_t bits;
  uint8_t order;
  uint32_t red_mask;
  int format;
};

constexpr PixelLayout kLayouts[] = {
    {32, XCB_IMAGE_ORDER_LSB_FIRST, 0xff0000, TJPF_BGRX}, {32, XCB_IMAGE_ORDER_LSB_FIRST, 0xff, TJPF_RGBX},
    {32, XCB_IMAGE_ORDER_MSB_FIRST, 0xff0000, TJPF_XRGB}, {32, XCB_IMAGE_ORDER_MSB_FIRST, 0xff, TJPF_XBGR},
    {24, XCB_IMAGE_ORDER_LSB_FIRST, 0xff0000, TJPF_BGR},  {24, XCB_IMAGE_ORDER_LSB_FIRST, 0xff, TJPF_RGB},
    {24, XCB_IMAGE_ORDER_MSB_FIRST, 0xff0000, TJPF_RGB},  {24, XCB_IMAGE_ORDER_MSB_FIRST, 0xff, TJPF_BGR},
};

// Size and layout of a picture of the root window, without its pixels. False when the layout is a strange
// one.
bool describe_picture(const Screen &screen, Picture *picture) {
  const xcb_setup_t *setup = xcb_get_setup(screen.connection.get());
  const uint32_t red_mask = red_mask_of_root(screen.screen);
  for (auto format = xcb_setup_pixmap_formats_iterator(setup); format.rem; xcb_format_next(&format)) {
    if (format.data->depth != screen.screen->root_depth) continue;
    for (const PixelLayout &layout : kLayouts) {
      if (layout.bits != format.data->bits_per_pixel || layout.order != setup->image_byte_order ||
          layout.red_mask != red_mask)
        continue;
      const int pad = format.data->scanline_pad;
      picture->width = screen.screen->width_in_pixels;
      picture->height = screen.screen->height_in_pixels;
      picture->stride = (picture->width * layout.bits + pad - 1) / pad * pad / 8;
      picture->format = layout.format;
      return true;
    }
  }
  RECORDER_LOGE("screens of %d bits and red in %#x cannot be taken", screen.screen->root_depth, red_mask);
  return false;
}

// The server gets the memory as a descriptor, not as a System V segment: those of a phone in a sandbox are
// not the server's, and its number for one of them may mean another program's memory there.
std::shared_ptr<const uint8_t> fetch_shared(const Screen &screen, const Picture &picture) {
  const size_t size = static_cast<size_t>(picture.stride) * static_cast<size_t>(picture.height);
  TavroFd memory(memfd_create("screen", MFD_CLOEXEC));
  if (!memory || ftruncate(memory.get(), static_cast<off_t>(size)) != 0) return nullptr;
  void *address = mmap(nullptr, size, PROT_READ, MAP_SHARED, memory.get(), 0);
  if (address == MAP_FAILED) return nullptr;
  std::shared_ptr<const uint8_t> pixels(static_cast<const uint8_t *>(address),
                                        [address, size](const uint8_t *) { munmap(address, size); });
  xcb_connection_t *connection = screen.connection.get();
  const xcb_shm_seg_t segment = xcb_generate_id(connection);
  xcb_shm_attach_fd(connection, segment, memory.release(), 0);  // takes the descriptor
  const Reply<xcb_shm_get_image_reply_t> reply(xcb_shm_get_image_reply(
      connection,
      xcb_shm_get_image(connection, screen.screen->root, 0, 0, screen.screen->width_in_pixels,
                        screen.screen->height_in_pixels, ~0u, XCB_IMAGE_FORMAT_Z_PIXMAP, segment, 0),
      nullptr));
  return reply && reply->size == size ? pixels : nullptr;
}

std::shared_ptr<const uint8_t> fetch_copied(const Screen &screen, const Picture &picture) {
  xcb_connection_t *connection = screen.connection.get();
  const auto cookie = xcb_get_image(connection, XCB_IMAGE_FORMAT_Z_PIXMAP, screen.screen->root, 0, 0,
                                    screen.screen->width_in_pixels, screen.screen->height_in_pixels, ~0u);
  const std::shared_ptr<xcb_get_image_reply_t> reply(xcb_get_image_reply(connection, cookie, nullptr), free);
  if (!reply || xcb_get_image_data_length(reply.get()) < picture.stride * picture.height) return nullptr;
  return {reply, xcb_get_image_data(reply.get())};
}

using Fetch = std::shared_ptr<const uint8_t> (*)(const Screen &screen, const Picture &picture);

bool can_share_memory(const Screen &screen) {
  const auto *extension = xcb_get_extension_data(screen.connection.get(), &xcb_shm_id);
  return extension && extension->present;
}

// On a Wayland desktop the server of X programs knows their windows alone; its outputs tell what it is.
bool serves_wayland(const Screen &screen) {
  xcb_connection_t *connection = screen.connection.get();
  const auto *extension = xcb_get_extension_data(connection, &xcb_randr_id);
  if (!extension || !extension->present) return false;
  const Reply<xcb_randr_get_screen_resources_current_reply_t> resources(
      xcb_randr_get_screen_resources_current_reply(
          connection, xcb_randr_get_screen_resources_current(connection, screen.screen->root), nullptr));
  if (!resources || resources->num_outputs == 0) return false;
  const auto *outputs = xcb_randr_get_screen_resources_current_outputs(resources.get());
  const Reply<xcb_randr_get_output_info_reply_t> info(xcb_randr_get_output_info_reply(
      connection, xcb_randr_get_output_info(connection, outputs[0], XCB_CURRENT_TIME), nullptr));
  constexpr char kPrefix[] = "XWAYLAND";
  return info && info->name_len >= std::strlen(kPrefix) &&
         std::memcmp(xcb_randr_get_output_info_name(info.get()), kPrefix, std::strlen(kPrefix)) == 0;
}

}  // namespace

bool has_x_screen() {
  const auto screen = open_screen();
  return screen && !serves_wayland(*screen);
}

Picture take_screen_picture() {
  for (const Fetch fetch : {fetch_shared, fetch_copied}) {
    // A connection each: a server that cannot take the memory may end the one that offered it.
    const auto screen = open_screen();
    if (!screen) break;
    if (fetch == fetch_shared && !can_share_memory(*screen)) continue;
    Picture picture;
    if (!describe_picture(*screen, &picture)) return {};
    picture.pixels = fetch(*screen, picture);
    if (picture.pixels) return picture;
  }
  RECORDER_LOGE("the X display gives no picture");
  return {};
}
