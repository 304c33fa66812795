#include "screen_reader_keys.h"

#include <Ecore_Input.h>
#include <Ecore_Input_Evas.h>
#include <Ecore_X.h>
#include <Elementary.h>
#include <dlog.h>

#include <algorithm>
#include <cstdint>
#include <deque>
#include <set>
#include <utility>

#include "bus.h"
#include "hardware_keys.h"

namespace platform {
namespace {

constexpr const char *kA11yName = "org.a11y.Bus";
constexpr const char *kA11yPath = "/org/a11y/bus";
constexpr const char *kRegistryName = "org.a11y.atspi.Registry";
constexpr const char *kControllerPath = "/org/a11y/atspi/registry/deviceeventcontroller";
constexpr const char *kControllerInterface = "org.a11y.atspi.DeviceEventController";

enum class Answer { kAwaited, kFree, kConsumed };

// A copy that outlives ecore's own event, which goes with its texts when the filter returns.
struct HeldKey {
  uintptr_t number;
  bool is_down;
  Ecore_Event_Key event;
  ScopedGText texts[4];
  std::unique_ptr<Eo, FreeWith<efl_unref>> device;
  Answer answer;
};

struct Sharing {
  Ecore_Event_Filter *filter = nullptr;
  ScopedObject<GCancellable> cancellable;
  ScopedBus registry_bus;
  std::deque<HeldKey> held;                 // as they came
  std::set<unsigned int> consumed_presses;  // key codes whose release belongs to the screen reader too
  uintptr_t last_number = 0;
  int key_down = 0, key_up = 0;  // ecore's event types
};

Sharing &sharing() {
  static Sharing &instance = *new Sharing;
  return instance;
}

void deliver(HeldKey *key) {
  Ecore_Event_Key *event = &key->event;
  if (key->is_down) {
    if (!take_key_down(*event)) ecore_event_evas_key_down(nullptr, ECORE_EVENT_KEY_DOWN, event);
  } else {
    ecore_event_evas_key_up(nullptr, ECORE_EVENT_KEY_UP, event);
    serve_key_up(*event);
  }
}

// A screen reader may answer otherwise for a release than for its press; the application gets both or
// neither.
bool is_for_application(const HeldKey &key) {
  std::set<unsigned int> &consumed = sharing().consumed_presses;
  if (!key.is_down) return consumed.erase(key.event.keycode) == 0;
  if (key.answer == Answer::kFree) return consumed.erase(key.event.keycode), true;
  consumed.insert(key.event.keycode);
  return false;
}

// The callbacks that a key reaches may bring further keys, or the end.
void deliver_answered() {
  std::deque<HeldKey> &held = sharing().held;
  while (!held.empty() && held.front().answer != Answer::kAwaited) {
    HeldKey key = std::move(held.front());
    held.pop_front();
    if (is_for_application(key)) deliver(&key);
  }
}

void answer_cb(GObject *source, GAsyncResult *result, gpointer number) {
  ErrorSlot error;
  const ScopedVariant reply(g_dbus_connection_call_finish(G_DBUS_CONNECTION(source), result, error.out()));
  if (error.is(G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;
  gboolean is_consumed = FALSE;
  if (reply) g_variant_get(reply.get(), "(b)", &is_consumed);
  for (HeldKey &key : sharing().held) {
    if (key.number == reinterpret_cast<uintptr_t>(number))
      key.answer = is_consumed ? Answer::kConsumed : Answer::kFree;
  }
  deliver_answered();
}

// The modifiers as X numbers them.
gint16 x_modifiers(unsigned int modifiers) {
  constexpr std::pair<unsigned int, int> kBits[] = {
      {ECORE_EVENT_MODIFIER_SHIFT, 1 << 0}, {ECORE_EVENT_MODIFIER_CAPS, 1 << 1},
      {ECORE_EVENT_MODIFIER_CTRL, 1 << 2},  {ECORE_EVENT_MODIFIER_ALT, 1 << 3},
      {ECORE_EVENT_MODIFIER_NUM, 1 << 4},   {ECORE_EVENT_MODIFIER_WIN, 1 << 6},
      {ECORE_EVENT_MODIFIER_ALTGR, 1 << 7},
  };
  int bits = 0;
  for (const auto &[modifier, bit] : kBits) bits |= modifiers & modifier ? bit : 0;
  return static_cast<gint16>(bits);
}

bool is_printable(const char *text) {
  constexpr unsigned char kDelete = 0x7f;
  const unsigned char first = text ? static_cast<unsigned char>(*text) : 0;
  return first >= ' ' && first != kDelete && g_utf8_validate(text, -1, nullptr);
}

GVariant *description_of(const HeldKey &key) {
  const Ecore_Event_Key &event = key.event;
  const bool is_text = is_printable(event.string);
  return g_variant_new("((uinnisb))", key.is_down ? 0u : 1u,
                       static_cast<gint32>(ecore_x_keysym_get(event.key)), static_cast<gint16>(event.keycode),
                       x_modifiers(event.modifiers), static_cast<gint32>(event.timestamp),
                       is_text ? event.string : event.keyname, static_cast<gboolean>(is_text));
}

void ask(const HeldKey &key) {
  g_dbus_connection_call(sharing().registry_bus.get(), kRegistryName, kControllerPath, kControllerInterface,
                         "NotifyListenersSync", description_of(key), G_VARIANT_TYPE("(b)"),
                         G_DBUS_CALL_FLAGS_NO_AUTO_START, kServiceTimeoutMs, sharing().cancellable.get(),
                         answer_cb, reinterpret_cast<gpointer>(key.number));
}

void hold(bool is_down, const Ecore_Event_Key &event) {
  Sharing &self = sharing();
  HeldKey key{++self.last_number, is_down, event, {}, nullptr, Answer::kAwaited};
  int i = 0;
  for (const char **text : {&key.event.keyname, &key.event.key, &key.event.string, &key.event.compose}) {
    key.texts[i].reset(g_strdup(*text));
    *text = key.texts[i++].get();
  }
  key.event.data = nullptr;
  if (event.dev) key.device.reset(efl_ref(event.dev));
  if (self.registry_bus) {
    ask(key);
  } else {
    key.answer = Answer::kFree;
  }
  self.held.push_back(std::move(key));
}

// Ecore shows the bridge also the keys that were taken here, and the bridge would tell a screen reader of
// each a second time, while the main loop waits. It knows keys by these two numbers, which nobody else needs
// while ecore's filters run.
Eina_Bool filter_cb(void *, void *, int type, void *event) {
  constexpr Eina_Bool kPass = EINA_TRUE, kTake = EINA_FALSE;
  const Sharing &self = sharing();
  if (type != self.key_down && type != self.key_up) return kPass;
  hold(type == self.key_down, *static_cast<Ecore_Event_Key *>(event));
  ECORE_EVENT_KEY_DOWN = ECORE_EVENT_KEY_UP = ECORE_EVENT_NONE;
  return kTake;
}

void pass_ends_cb(void *, void *) {
  const Sharing &self = sharing();
  ECORE_EVENT_KEY_DOWN = self.key_down;
  ECORE_EVENT_KEY_UP = self.key_up;
  deliver_answered();
}

void connected_cb(GObject *, GAsyncResult *result, gpointer) {
  ErrorSlot error;
  ScopedBus bus(g_dbus_connection_new_for_address_finish(result, error.out()));
  if (error.is(G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;
  if (!bus) return dlog_print(DLOG_ERROR, "PLATFORM", "no accessibility bus: %s", error.text()), void();
  g_dbus_connection_set_exit_on_close(bus.get(), FALSE);
  sharing().registry_bus = std::move(bus);
}

void address_cb(GObject *source, GAsyncResult *result, gpointer) {
  ErrorSlot error;
  const ScopedVariant reply(g_dbus_connection_call_finish(G_DBUS_CONNECTION(source), result, error.out()));
  if (error.is(G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;
  if (!reply) return dlog_print(DLOG_ERROR, "PLATFORM", "no accessibility bus: %s", error.text()), void();
  const char *address = nullptr;
  g_variant_get(reply.get(), "(&s)", &address);
  const auto flags = static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                       G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
  g_dbus_connection_new_for_address(address, flags, nullptr, sharing().cancellable.get(), connected_cb,
                                    nullptr);
}

}  // namespace

void share_keys_with_screen_reader() {
  Sharing &self = sharing();
  if (!elm_config_atspi_mode_get() || !phone_bus()) return;
  self.key_down = ECORE_EVENT_KEY_DOWN;
  self.key_up = ECORE_EVENT_KEY_UP;
  self.filter = ecore_event_filter_add(nullptr, filter_cb, pass_ends_cb, nullptr);
  self.cancellable.reset(g_cancellable_new());
  g_dbus_connection_call(phone_bus(), kA11yName, kA11yPath, kA11yName, "GetAddress", nullptr,
                         G_VARIANT_TYPE("(s)"), G_DBUS_CALL_FLAGS_NONE, kServiceTimeoutMs,
                         self.cancellable.get(), address_cb, nullptr);
}

void stop_sharing_keys() {
  Sharing &self = sharing();
  if (self.filter) ecore_event_filter_del(std::exchange(self.filter, nullptr));
  if (self.cancellable) g_cancellable_cancel(self.cancellable.get());
  self = Sharing();
}

}  // namespace platform
