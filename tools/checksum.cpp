#include "checksum.h"

#include <cstdio>
#include <new>

extern "C" {
#include <libavutil/md5.h>
#include <libavutil/mem.h>
}

namespace tool {

void Checksum::Deleter::operator()(AVMD5* state) const { av_free(state); }

Checksum::Checksum() : mState(av_md5_alloc()) {
  if (!mState) throw std::bad_alloc();
  av_md5_init(mState.get());
}

void Checksum::Add(const std::vector<uint8_t>& bytes) { av_md5_update(mState.get(), bytes.data(), bytes.size()); }

std::string Checksum::Finish() {
  uint8_t digest[16];
  av_md5_final(mState.get(), digest);
  std::string text;
  for (const uint8_t byte : digest) {
    char digits[3];
    std::snprintf(digits, sizeof digits, "%02x", byte);
    text += digits;
  }
  return text;
}

}  // namespace tool
