#include "tavro_memcheck.h"

#include <cstdint>

#include "tavro_log.h"

tavro_meminfo_s gMemDb[kMemorySlotCount];

namespace {

// Values of slotfree. A slot is claimed by whoever turns kFree into kFilling, so two threads never share one,
// and is compared and reported only once its fields are written.
constexpr int kFree = 0;
constexpr int kInUse = 1;
constexpr int kFilling = 2;

// The table is plain data; these give its fields the ordering that threads need.
template <typename T>
T _load(const T &field) {
  return __atomic_load_n(&field, __ATOMIC_RELAXED);
}

template <typename T>
void _store(T &field, T value) {
  __atomic_store_n(&field, value, __ATOMIC_RELAXED);
}

bool _is_in_use(const tavro_meminfo_s &slot) {
  return __atomic_load_n(&slot.slotfree, __ATOMIC_ACQUIRE) == kInUse;
}

bool _change_state(tavro_meminfo_s &slot, int from, int to) {
  return __atomic_compare_exchange_n(&slot.slotfree, &from, to, false, __ATOMIC_ACQ_REL, __ATOMIC_RELAXED);
}

// Where the search for a free slot starts: every slot below was found in use. It spares a client that holds
// thousands of blocks the walk over all of them; a wrong guess only costs the walk.
int gFirstCandidate = 0;

int _first_candidate() {
  const int candidate = _load(gFirstCandidate);
  const bool is_plausible = candidate > 0 && _load(gMemDb[candidate - 1].slotfree) != kFree;
  return is_plausible ? candidate : 0;
}

void _lower_first_candidate(int slot) {
  int candidate = _load(gFirstCandidate);
  while (slot < candidate && !__atomic_compare_exchange_n(&gFirstCandidate, &candidate, slot, false,
                                                          __ATOMIC_RELAXED, __ATOMIC_RELAXED)) {
  }
}

// The claimed slot, kFilling; -1 when there is none from `start` on.
int _claim_from(int start) {
  for (int i = start; i < kMemorySlotCount; i++) {
    if (_load(gMemDb[i].slotfree) != kFree || !_change_state(gMemDb[i], kFree, kFilling)) continue;
    // Only if no lower slot was freed meanwhile.
    __atomic_compare_exchange_n(&gFirstCandidate, &start, i + 1, false, __ATOMIC_RELAXED, __ATOMIC_RELAXED);
    return i;
  }
  return -1;
}

// What "%x" shows of an address.
unsigned _short_address(const void *ptr) {
  return static_cast<unsigned>(reinterpret_cast<std::uintptr_t>(ptr));
}

}  // namespace

void tavro_mem_check_init() {
  for (tavro_meminfo_s &slot : gMemDb) slot = {};
  gFirstCandidate = 0;
}

void tavro_mem_insert(void *ptr, int line, const char *file) {
  int index = _claim_from(_first_candidate());
  if (index == -1) index = _claim_from(0);
  if (index == -1) {
    TAVRO_LOGE("All slot full at insertion");
    return;
  }
  tavro_meminfo_s &slot = gMemDb[index];
  _store(slot.fileName, file);
  _store(slot.lineNo, line);
  _store(slot.ptr, ptr);
  __atomic_store_n(&slot.slotfree, kInUse, __ATOMIC_RELEASE);
}

void tavro_mem_remove(void *ptr, int line, const char *file) {
  for (int i = 0; i < kMemorySlotCount; i++) {
    // A block is removed by its one owner, so no other thread can free this slot between the two steps.
    if (_load(gMemDb[i].ptr) != ptr || !_is_in_use(gMemDb[i])) continue;
    if (!_change_state(gMemDb[i], kInUse, kFree)) continue;
    _lower_first_candidate(i);
    return;
  }
  TAVRO_LOGE("No match found in remove for %x file: %s line %d", _short_address(ptr), file, line);
}

void tavro_mem_report() {
  int total = 0;
  for (const tavro_meminfo_s &slot : gMemDb) {
    if (!_is_in_use(slot)) continue;
    TAVRO_LOGE("MemoryLeakReport location = %s line = %d", _load(slot.fileName), _load(slot.lineNo));
    total++;
  }
  TAVRO_LOGE("MemoryLeakReport total leak = %d", total);
}
