#include "secret.h"

#include <fcntl.h>
#include <glib/gstdio.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <vector>

#include "handles.h"

namespace {

constexpr size_t kTokenBytes = 32;
constexpr size_t kLargestSecretFile = 4096;
constexpr size_t kReadBlockBytes = 256 * 1024;

}  // namespace

std::string random_token() {
  std::array<unsigned char, kTokenBytes> random{};
  // For 256 bytes or less the kernel gives all or nothing, and nothing only before its generator is seeded.
  while (getrandom(random.data(), random.size(), 0) != static_cast<ssize_t>(random.size())) {
  }
  static const char kDigits[] = "0123456789abcdef";
  std::string token;
  for (unsigned char byte : random) {
    token += kDigits[byte >> 4];
    token += kDigits[byte & 15];
  }
  return token;
}

std::string sha256_of(const std::string &text) {
  GCharPtr digest(g_compute_checksum_for_data(G_CHECKSUM_SHA256,
                                              reinterpret_cast<const guchar *>(text.data()), text.size()));
  return digest.get();
}

std::optional<std::string> sha256_of_file(int fd, int64_t bytes) {
  GChecksumPtr checksum(g_checksum_new(G_CHECKSUM_SHA256));
  std::vector<guchar> block(kReadBlockBytes);
  int64_t done = 0;
  while (done < bytes) {
    const auto want = static_cast<size_t>(std::min<int64_t>(bytes - done, kReadBlockBytes));
    const ssize_t got = pread(fd, block.data(), want, done);
    if (got <= 0) return std::nullopt;
    g_checksum_update(checksum.get(), block.data(), got);
    done += got;
  }
  return g_checksum_get_string(checksum.get());
}

bool is_sha256(const std::string &text) {
  return text.size() == 64 && text.find_first_not_of("0123456789abcdef") == std::string::npos;
}

bool same_secret(const std::string &a, const std::string &b) {
  // Hashes have one length, so that not even the length of the secret shows.
  const std::string left = sha256_of(a), right = sha256_of(b);
  unsigned difference = 0;
  for (size_t i = 0; i < left.size(); ++i)
    difference |= static_cast<unsigned>(left[i]) ^ static_cast<unsigned>(right[i]);
  return difference == 0;
}

std::optional<std::string> read_secret_file(const std::string &path) {
  UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  std::array<char, kLargestSecretFile + 1> content{};
  const ssize_t got = file ? read(file.get(), content.data(), content.size()) : -1;
  if (got <= 0 || static_cast<size_t>(got) > kLargestSecretFile) return std::nullopt;
  std::string text(content.data(), static_cast<size_t>(got));
  while (!text.empty() && g_ascii_isspace(text.back())) text.pop_back();
  if (text.empty()) return std::nullopt;
  return text;
}

bool write_secret_file(const std::string &path, const std::string &text) {
  GError *error = nullptr;
  const std::string line = text + "\n";
  const auto flags =
      static_cast<GFileSetContentsFlags>(G_FILE_SET_CONTENTS_CONSISTENT | G_FILE_SET_CONTENTS_DURABLE);
  if (g_file_set_contents_full(path.c_str(), line.data(), static_cast<gssize>(line.size()), flags, 0600,
                               &error))
    return true;
  GErrorPtr owned(error);
  g_warning("%s", owned->message);
  return false;
}

std::optional<std::string> keep_secret_file(const std::string &path) {
  if (auto kept = read_secret_file(path)) return kept;
  const std::string made = random_token();
  if (!write_secret_file(path, made)) return std::nullopt;
  return made;
}

bool sync_folder(const std::string &path) {
  UniqueFd folder(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0;
}
