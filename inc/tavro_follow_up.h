// Follow-ups: after support closed a report, the person says whether it still happens or works now. That is a
// stored report of its own, sent as any other, which names the first by the desk's id for it.
//
// Main loop only. On disk: a row of the store; and what was typed and not sent, in a file beside it.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"

struct appdata;

using TavroVoc = TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data>;

struct tavro_follow_up {
  TavroVoc voc;
  std::string verdict;  // as stored
};

// The stored follow-ups to a report, oldest first; those whose deletion waits are left out.
std::vector<tavro_follow_up> tavro_follow_ups_of(const svc_voc_data *first);

// The stored report that this one is a follow-up to; null when it is none, or that one is gone or about to
// go.
TavroVoc tavro_follow_up_first(int voc_id);

// Whether the report is a follow-up itself.
bool tavro_is_follow_up(int voc_id);

// Store a follow-up to the report and have it sent. `verdict` is TAVRO_DBMGR_STILL_HAPPENS or
// TAVRO_DBMGR_WORKS_NOW, `text` plain and may be empty. Returns its record id; below 1: it could not be
// stored.
int tavro_follow_up_send(appdata *ad, const svc_voc_data *first, const char *verdict,
                         const std::string &text);

// What the person typed for a follow-up to the report and did not send, as valid UTF-8; empty for none.
std::string tavro_follow_up_kept(const svc_voc_data *first);

// Keep that for the report with this server id, safe from a power cut; an empty text forgets it. A text that
// the disk refuses (with a log line) is kept until the client ends.
void tavro_follow_up_keep(int server_id, const std::string &text);
