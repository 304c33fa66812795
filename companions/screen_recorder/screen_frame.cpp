#include "screen_frame.h"

#include <xcb/xcb.h>

#include <cstring>

#include "tavro_handles.h"

namespace {

constexpr char kTopOfFrame[] = "Flash_top";  // the client's name for that window
constexpr int kFramePixels = 5;              // from the edge of the screen
constexpr int kDeepest = 3;                  // a window manager puts windows into its own

using Connection = TavroHandle<xcb_connection_t, xcb_disconnect>;
template <typename T>
using Reply = TavroHandle<T, free>;

bool is_frame(xcb_connection_t *connection, xcb_window_t window) {
  const auto cookie = xcb_get_property(connection, 0, window, XCB_ATOM_WM_NAME, XCB_GET_PROPERTY_TYPE_ANY, 0,
                                       sizeof kTopOfFrame);
  const Reply<xcb_get_property_reply_t> name(xcb_get_property_reply(connection, cookie, nullptr));
  constexpr size_t kLength = sizeof kTopOfFrame - 1;
  return name && xcb_get_property_value_length(name.get()) == static_cast<int>(kLength) &&
         std::memcmp(xcb_get_property_value(name.get()), kTopOfFrame, kLength) == 0;
}

bool has_frame_below(xcb_connection_t *connection, xcb_window_t window, int depth) {
  if (is_frame(connection, window)) return true;
  if (depth == kDeepest) return false;
  const Reply<xcb_query_tree_reply_t> tree(
      xcb_query_tree_reply(connection, xcb_query_tree(connection, window), nullptr));
  if (!tree) return false;
  const xcb_window_t *children = xcb_query_tree_children(tree.get());
  for (int i = 0; i < xcb_query_tree_children_length(tree.get()); ++i)
    if (has_frame_below(connection, children[i], depth + 1)) return true;
  return false;
}

}  // namespace

std::optional<ScreenArea> area_within_frame() {
  int number = 0;
  const Connection connection(xcb_connect(nullptr, &number));
  if (xcb_connection_has_error(connection.get())) return std::nullopt;
  auto screens = xcb_setup_roots_iterator(xcb_get_setup(connection.get()));
  for (; screens.rem && number > 0; --number) xcb_screen_next(&screens);
  if (!screens.rem || !has_frame_below(connection.get(), screens.data->root, 0)) return std::nullopt;
  return ScreenArea{kFramePixels, kFramePixels, screens.data->width_in_pixels - kFramePixels - 1,
                    screens.data->height_in_pixels - kFramePixels - 1};
}
