#include <gio/gio.h>
#include <image_util.h>
#include <turbojpeg.h>

#include "recorder_log.h"
#include "screen_picture.h"
#include "tavro_handles.h"

namespace {

constexpr char kPortal[] = "org.freedesktop.portal.Desktop";
constexpr char kPortalPath[] = "/org/freedesktop/portal/desktop";
constexpr guint kPatienceSeconds = 30;

Picture decode(const char *path) {
  using Decoder = TavroHandle<std::remove_pointer_t<image_util_decode_h>, image_util_decode_destroy>;
  Decoder decoder;
  unsigned char *pixels = nullptr;
  unsigned long width = 0, height = 0;
  if (image_util_decode_create(tavro_out(decoder)) != IMAGE_UTIL_ERROR_NONE) return {};
  image_util_decode_set_input_path(decoder.get(), path);
  image_util_decode_set_colorspace(decoder.get(), IMAGE_UTIL_COLORSPACE_BGRA8888);
  image_util_decode_set_output_buffer(decoder.get(), &pixels);
  if (image_util_decode_run(decoder.get(), &width, &height, nullptr) != IMAGE_UTIL_ERROR_NONE) return {};
  Picture picture;
  picture.pixels.reset(pixels, free);
  picture.width = static_cast<int>(width);
  picture.height = static_cast<int>(height);
  picture.stride = picture.width * 4;
  picture.format = TJPF_BGRX;
  return picture;
}

// One question to the portal: the answer comes as a signal on an object that is named beforehand.
class PortalCall {
 public:
  explicit PortalCall(std::function<void(const Picture &)> then) : then_(std::move(then)) {}

  void start() {
    const char *address = g_getenv("TAVRO_HOST_SESSION_BUS");
    if (!address || !*address)
      return fail("no X display holds the whole of it, and the machine has no session bus");
    timer_ = g_timeout_add_seconds(kPatienceSeconds, late_cb, this);
    const auto flags = static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                         G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    g_dbus_connection_new_for_address(address, flags, nullptr, stop_.get(), connected_cb, this);
  }

 private:
  ~PortalCall() {
    if (timer_) g_source_remove(timer_);
    if (subscription_) g_dbus_connection_signal_unsubscribe(bus_.get(), subscription_);
  }

  // Whoever asks is told, and the call is gone.
  void end(const Picture &picture) {
    g_cancellable_cancel(stop_.get());
    const auto then = std::move(then_);
    delete this;
    then(picture);
  }

  void fail(const char *reason) {
    RECORDER_LOGE("the screen cannot be taken: %s", reason);
    end({});
  }

  void ask() {
    std::string sender = g_dbus_connection_get_unique_name(bus_.get()) + 1;
    for (char &byte : sender)
      if (byte == '.') byte = '_';
    const std::string token = "tavro" + std::to_string(g_random_int());
    const std::string request = std::string(kPortalPath) + "/request/" + sender + "/" + token;
    subscription_ = g_dbus_connection_signal_subscribe(bus_.get(), kPortal, "org.freedesktop.portal.Request",
                                                       "Response", request.c_str(), nullptr,
                                                       G_DBUS_SIGNAL_FLAGS_NONE, response_cb, this, nullptr);
    GVariantBuilder options;
    g_variant_builder_init(&options, G_VARIANT_TYPE_VARDICT);
    g_variant_builder_add(&options, "{sv}", "handle_token", g_variant_new_string(token.c_str()));
    g_variant_builder_add(&options, "{sv}", "interactive", g_variant_new_boolean(FALSE));
    g_dbus_connection_call(bus_.get(), kPortal, kPortalPath, "org.freedesktop.portal.Screenshot",
                           "Screenshot", g_variant_new("(sa{sv})", "", &options), nullptr,
                           G_DBUS_CALL_FLAGS_NONE, -1, stop_.get(), called_cb, this);
  }

  static void connected_cb(GObject *, GAsyncResult *result, gpointer data) {
    TavroError error;
    TavroObject<GDBusConnection> bus(g_dbus_connection_new_for_address_finish(result, tavro_out(error)));
    if (g_error_matches(error.get(), G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;  // and `data` is gone
    auto *self = static_cast<PortalCall *>(data);
    if (!bus)
      return self->fail("no X display holds the whole of it, and the machine's session bus does not answer");
    self->bus_ = std::move(bus);
    self->ask();
  }

  static void called_cb(GObject *bus, GAsyncResult *result, gpointer data) {
    TavroError error;
    const TavroVariant reply(
        g_dbus_connection_call_finish(reinterpret_cast<GDBusConnection *>(bus), result, tavro_out(error)));
    if (reply || g_error_matches(error.get(), G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;
    const std::string reason =
        std::string("no X display holds the whole of it, and the portal: ") + error->message;
    static_cast<PortalCall *>(data)->fail(reason.c_str());
  }

  static void response_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                          GVariant *arguments, gpointer data) {
    auto *self = static_cast<PortalCall *>(data);
    if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(ua{sv})")))
      return self->fail("an answer of no sense");
    guint32 response = 0;
    GVariant *raw = nullptr;
    g_variant_get(arguments, "(u@a{sv})", &response, &raw);
    const TavroVariant results(raw);
    const char *uri = nullptr;
    if (response != 0 || !g_variant_lookup(results.get(), "uri", "&s", &uri))
      return self->fail("the portal gave no picture");
    const TavroGText path(g_filename_from_uri(uri, nullptr, nullptr));
    const Picture picture = path ? decode(path.get()) : Picture();
    if (path) unlink(path.get());  // it was made for us, and nobody else would remove it
    if (!picture.pixels) return self->fail("the portal's picture cannot be read");
    self->end(picture);
  }

  static gboolean late_cb(gpointer data) {
    auto *self = static_cast<PortalCall *>(data);
    self->timer_ = 0;
    self->fail("the portal does not answer");
    return G_SOURCE_REMOVE;
  }

  std::function<void(const Picture &)> then_;
  TavroObject<GCancellable> stop_{g_cancellable_new()};
  TavroObject<GDBusConnection> bus_;
  guint subscription_ = 0, timer_ = 0;
};

}  // namespace

void take_portal_picture(std::function<void(const Picture &)> then) {
  (new PortalCall(std::move(then)))->start();
}
