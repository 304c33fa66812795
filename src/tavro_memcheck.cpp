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

// The numbers of the slots in use whose addresses fall here, in no order. All slots that hold one address are
// in one bucket, so looking through it finds what a scan of the table would find.
//
// Why there is an index at all: a release looks for its block. A history of 100 reports holds some two
// thousand blocks, which are released one by one while the person waits for the next screen; by the table
// alone that is millions of comparisons.
struct address_bucket {
  std::uint16_t entries[7];  // number of the slot plus one; 0 for none
  std::uint16_t unlisted;    // slots that found no place here: while there are any, the table is scanned
};

constexpr std::uint64_t kBucketCount = 2048;  // two or three slots each when the table is full
address_bucket gBuckets[kBucketCount];

address_bucket &_bucket_of(const void *ptr) {
  // Spreads addresses that differ in any bit: 2^64 divided by the golden ratio, upper half of the product.
  const std::uint64_t mixed = reinterpret_cast<std::uintptr_t>(ptr) * 0x9E3779B97F4A7C15u;
  return gBuckets[(mixed >> 40) % kBucketCount];
}

bool _replace_entry(address_bucket &bucket, std::uint16_t from, std::uint16_t to) {
  for (std::uint16_t &entry : bucket.entries) {
    std::uint16_t expected = from;
    if (_load(entry) == from &&
        __atomic_compare_exchange_n(&entry, &expected, to, false, __ATOMIC_ACQ_REL, __ATOMIC_RELAXED))
      return true;
  }
  return false;
}

std::uint16_t _entry_for(int slot) {
  return static_cast<std::uint16_t>(slot + 1);
}

// A slot that another thread claims and lists between these two has the same number, so it does not matter
// whose entry is taken out.
void _list(address_bucket &bucket, int slot) {
  if (!_replace_entry(bucket, 0, _entry_for(slot))) __atomic_fetch_add(&bucket.unlisted, 1, __ATOMIC_ACQ_REL);
}

void _unlist(address_bucket &bucket, int slot) {
  if (!_replace_entry(bucket, _entry_for(slot), 0)) __atomic_fetch_sub(&bucket.unlisted, 1, __ATOMIC_ACQ_REL);
}

bool _holds(int slot, const void *ptr) {
  return _load(gMemDb[slot].ptr) == ptr && _is_in_use(gMemDb[slot]);
}

constexpr int kNoSlot = kMemorySlotCount;

int _find_in(const address_bucket &bucket, const void *ptr) {
  int first = kNoSlot;
  for (const std::uint16_t &entry : bucket.entries) {
    const int slot = _load(entry) - 1;
    if (slot >= 0 && slot < first && _holds(slot, ptr)) first = slot;
  }
  return first;
}

int _find_in_table(const void *ptr) {
  for (int slot = 0; slot < kMemorySlotCount; slot++)
    if (_holds(slot, ptr)) return slot;
  return kNoSlot;
}

// What "%x" shows of an address.
unsigned _short_address(const void *ptr) {
  return static_cast<unsigned>(reinterpret_cast<std::uintptr_t>(ptr));
}

}  // namespace

void tavro_mem_check_init() {
  for (tavro_meminfo_s &slot : gMemDb) slot = {};
  for (address_bucket &bucket : gBuckets) bucket = {};
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
  _list(_bucket_of(ptr), index);
}

void tavro_mem_remove(void *ptr, int line, const char *file) {
  address_bucket &bucket = _bucket_of(ptr);
  const int index = _load(bucket.unlisted) == 0 ? _find_in(bucket, ptr) : _find_in_table(ptr);
  // A block is removed by its one owner, so no other thread can free this slot between the two steps.
  if (index == kNoSlot || !_change_state(gMemDb[index], kInUse, kFree)) {
    TAVRO_LOGE("No match found in remove for %x file: %s line %d", _short_address(ptr), file, line);
    return;
  }
  _unlist(bucket, index);
  _lower_first_candidate(index);
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
