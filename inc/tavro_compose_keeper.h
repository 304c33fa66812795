// Keeps what is being written on a compose screen in a small file beside the store, so that a killed client,
// a crash or a reboot loses none of it: text, target, attachments, log and dump.
//
// The screen calls start when it is built, note after every change, and forget when its content is stored or
// discarded. Main loop only. On disk: TAVRO_COMPOSE_KEEPER_FILE, readable by the owner alone, written whole
// under another name and then renamed.
#pragma once

#include "tavro_dbmgr.h"

#define TAVRO_COMPOSE_KEEPER_FILE TAVRO_DBMGR_FOLDER "/.tavro.compose"

struct appdata;

// The open compose screen is the one to be kept from now on. Closes a question that came up before it.
void tavro_compose_keeper_start(appdata *ad);

// Nothing of what the open screen showed when it came up is stored anywhere: all of it is to be kept.
void tavro_compose_keeper_keep_all();

// Something changed: it is written within two seconds, and at most once in two seconds.
void tavro_compose_keeper_note();

// Write now what is not written yet, safe from a power cut at once: the application pauses, or another one
// comes to the front.
void tavro_compose_keeper_flush();

// The content is stored or discarded: forget it, here and on disk.
void tavro_compose_keeper_forget();
