// How often a caller may call: a bucket per caller that fills at a steady rate.
#pragma once

#include <glib.h>

#include <algorithm>
#include <map>
#include <string>

class RateLimit {
 public:
  RateLimit(double per_second, double burst) : per_second_(per_second), burst_(burst) {}

  // Takes one from the caller's bucket; false when it is empty.
  bool take(const std::string &caller) {
    const double now = static_cast<double>(g_get_monotonic_time()) / G_USEC_PER_SEC;
    forget_full_buckets(now);
    auto &bucket = buckets_.try_emplace(caller, Bucket{burst_, now}).first->second;
    bucket.level = std::min(burst_, bucket.level + (now - bucket.time) * per_second_);
    bucket.time = now;
    if (bucket.level < 1.0) return false;
    bucket.level -= 1.0;
    return true;
  }

 private:
  struct Bucket {
    double level;
    double time;  // seconds
  };
  // A caller who was quiet long enough is as good as new.
  void forget_full_buckets(double now) {
    if (buckets_.size() < 1000) return;
    for (auto it = buckets_.begin(); it != buckets_.end();)
      it = (now - it->second.time) * per_second_ >= burst_ ? buckets_.erase(it) : std::next(it);
  }

  double per_second_;
  double burst_;
  std::map<std::string, Bucket> buckets_;
};
