// Allocation tracker: a fixed table of the heap blocks that the client's own code holds, with the place where
// each was obtained, so that what is still held at the end can be listed in the log.
//
// Emptied by tavro_mem_check_init before the application loop, reported by tavro_mem_report at terminate.
// Insert and remove may be called on any thread. Code does not call them by hand: see tavro_memory.h.
#pragma once

constexpr int kMemorySlotCount = 5000;

// One slot. `slotfree` is 1 while the slot is in use and 0 while it is free: the name says the opposite, and
// is kept. For the moment in which a thread fills a claimed slot it is neither.
struct tavro_meminfo_s {
  const char *fileName;  // constant text of the caller, not owned
  void *ptr;
  int lineNo;
  int slotfree;
};

extern tavro_meminfo_s gMemDb[kMemorySlotCount];

// Not safe beside other threads that insert or remove.
void tavro_mem_check_init();

// Record a block in the first free slot. With no slot left the record is dropped with a log line.
void tavro_mem_insert(void *ptr, int line, const char *file);

// Give back the first slot that holds a block. Never reads the block itself.
void tavro_mem_remove(void *ptr, int line, const char *file);

// Log every block that is still held, then their number.
void tavro_mem_report();
