// What the upload service must not forget: who it is to the desk, how far it has read the desk's news, what
// was asked of it, and what the client has not been told yet.
//
// One SQLite file in the service's own data folder. Every writer returns only when its change is durable.
// Main loop only.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "database.h"

// What a message to the client is about. Stored: the values are append-only.
enum SvcMessageKind {
  SVC_MESSAGE_SENT = 1,      // the report arrived at the desk
  SVC_MESSAGE_FAILED = 2,    // it did not: no desk, or refused
  SVC_MESSAGE_ANSWERED = 3,  // support staff set a status or replied
};

// Why a launch request names a report.
enum class SvcRequestKind {
  kFirst,  // it was just stored, or found waiting; the service may have tried it already on its own
  kAgain,  // the person saw it fail and asked again: another failure is news
};

struct SvcMessage {
  int64_t id = 0;
  SvcMessageKind kind = SVC_MESSAGE_SENT;
  int voc_id = 0;
  std::string reply;  // empty: none
};

// An answer of the desk on its way into the store: how many statuses the report had before.
struct SvcIntent {
  int64_t cursor = 0;
  int statuses_before = 0;
};

class SvcState {
 public:
  bool open(const std::string &folder);

  // A random name of this phone, made once. It proves to the desk that a new registration is the same phone.
  std::string phone();
  std::string token();
  // Another device id than before means another desk: reading begins anew.
  bool set_device(const std::string &device, const std::string &token);
  bool forget_token();

  int64_t cursor();
  std::optional<SvcIntent> intent();
  bool set_intent(const SvcIntent &intent);
  // An event is dealt with: the cursor moves on and the client is to be told (unless there is nothing to
  // tell), both or neither.
  bool finish_event(int64_t cursor, const std::optional<SvcMessage> &message);

  // Reports that a launch request named and that are not sent yet. Drafts are known only here: the store
  // shows them as drafts until they have arrived.
  std::vector<int> requested();
  bool add_requested(int voc_id, SvcRequestKind kind);
  bool remove_requested(int voc_id);

  // Reports whose failure the client was told of in this outage.
  bool is_announced(int voc_id);
  bool announce_failure(int voc_id);

  bool add_message(const SvcMessage &message);
  std::optional<SvcMessage> first_message();
  bool remove_message(int64_t id);

 private:
  std::string value(const char *name);
  bool set_value(const char *name, const std::string &value);

  Database database_;
};
