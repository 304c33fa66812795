// Secrets and checksums: tokens, their hashes, and files that hold them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

// A new secret of 256 random bits, 64 hexadecimal digits.
std::string random_token();

// SHA-256 as 64 lower-case hexadecimal digits.
std::string sha256_of(const std::string &text);
// The same of the first `bytes` of an open file, read from its start; null when it cannot be read that far.
std::optional<std::string> sha256_of_file(int fd, int64_t bytes);
bool is_sha256(const std::string &text);

// Equality in a time that does not depend on where the texts differ.
bool same_secret(const std::string &a, const std::string &b);

// A short text file without its line end; null when it is absent, empty or larger than 4 KiB.
std::optional<std::string> read_secret_file(const std::string &path);
// Writes it whole (under a temporary name first) and readable by the owner alone.
bool write_secret_file(const std::string &path, const std::string &text);
// The file's secret; a new one is made and written when there is none yet.
std::optional<std::string> keep_secret_file(const std::string &path);

// Makes the names in a folder durable after a file was made or renamed in it.
bool sync_folder(const std::string &path);
