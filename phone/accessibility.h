// Screen readers and the phone: the desktop's accessibility bus is handed on to the phone's programs, so that
// the desktop's own screen reader reads them. Without a desktop the phone's bus starts one itself.
#pragma once

#include <memory>
#include <string>

#include "tavro_handles.h"

namespace phone {

// Owns the name org.a11y.Bus on the phone's bus and answers for the desktop's: its address, and whether
// assistive technology is on, changes included. Main loop only.
class AccessibilityForwarder {
 public:
  // Null when the desktop has no accessibility bus.
  static std::unique_ptr<AccessibilityForwarder> create(const std::string &host_address);
  ~AccessibilityForwarder();

  bool is_screen_reader_on() const;
  // False with the reason.
  bool serve(GDBusConnection *phone_bus, std::string *reason);

 private:
  AccessibilityForwarder() = default;
  static void method_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *,
                        GDBusMethodInvocation *invocation, gpointer self);
  static GVariant *property_cb(GDBusConnection *, const char *, const char *, const char *, const char *name,
                               GError **, gpointer self);
  static void changed_cb(GDBusProxy *proxy, GVariant *changed, char **gone, gpointer self);

  std::string address_;
  TavroObject<GDBusConnection> host_;
  TavroObject<GDBusProxy> status_;
  TavroObject<GDBusConnection> phone_bus_;
  guint name_ = 0;
};

// Start the accessibility bus of a phone that has no desktop, its registry, and tell its programs that a
// screen reader is on. False with the reason.
bool switch_on_accessibility(GDBusConnection *phone_bus, std::string *reason);

}  // namespace phone
