// An input that is texts, each ended by a zero byte, and what the targets that take one have in common.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "fuzz_expect.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"

using voc_owner = TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data>;

class texts {
 public:
  texts(const std::uint8_t *data, std::size_t size) {
    const std::string all(reinterpret_cast<const char *>(data), size);
    for (std::size_t start = 0; start < all.size();) {
      const std::size_t end = std::min(all.find('\0', start), all.size());
      texts_.push_back(all.substr(start, end - start));
      start = end + 1;
    }
  }
  // The next text; null when there is none.
  const char *next() { return index_ < texts_.size() ? texts_[index_++].c_str() : nullptr; }
  char *next_copy() { return TAVRO_STRDUP(next()); }
  bool is_at_end() const { return index_ >= texts_.size(); }

 private:
  std::vector<std::string> texts_;
  std::size_t index_ = 0;
};

inline std::size_t separators(const char *history) {
  return history ? static_cast<std::size_t>(std::count(history, history + std::strlen(history), '#')) : 0;
}

inline void expect_nothing_held() {
  for (const tavro_meminfo_s &slot : gMemDb) expect(!slot.slotfree, "a block is still held");
}
