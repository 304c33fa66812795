#include "mp4_repair.h"

#include <endian.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstring>

namespace {

constexpr int64_t kHeaderBytes = 8;
constexpr int64_t kLongHeaderBytes = 16;  // of a box whose size has 64 bits

// The size of the box at `offset`, and its type; 0 when there is no whole header.
int64_t read_box(int fd, int64_t offset, char type[4]) {
  unsigned char header[kLongHeaderBytes] = {};
  const ssize_t got = pread(fd, header, sizeof header, offset);
  if (got < kHeaderBytes) return 0;
  uint32_t size = 0;
  std::memcpy(&size, header, sizeof size);
  std::memcpy(type, header + 4, 4);
  if (be32toh(size) != 1) return be32toh(size);
  uint64_t long_size = 0;
  std::memcpy(&long_size, header + kHeaderBytes, sizeof long_size);
  return got == kLongHeaderBytes ? static_cast<int64_t>(be64toh(long_size)) : 0;
}

}  // namespace

bool cut_to_whole_fragments(int fd) {
  struct stat status;
  if (fstat(fd, &status) != 0) return false;
  int64_t offset = 0, whole_until = 0;
  char type[4];
  for (int64_t size = read_box(fd, 0, type); size >= kHeaderBytes && size <= status.st_size - offset;
       size = read_box(fd, offset, type)) {
    offset += size;
    // The writer puts the index of a fragment behind its data; what follows has none yet.
    if (std::memcmp(type, "moov", 4) == 0 || std::memcmp(type, "moof", 4) == 0) whole_until = offset;
  }
  return whole_until > 0 && ftruncate(fd, whole_until) == 0;
}
