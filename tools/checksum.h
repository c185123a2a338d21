// MD5 over frames, as `md5sum` gives it for a raw file of them.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

struct AVMD5;

namespace tool {

class Checksum {
 public:
  Checksum();
  void Add(const std::vector<uint8_t>& bytes);
  // 32 hexadecimal digits; nothing may be added afterwards.
  std::string Finish();

 private:
  struct Deleter {
    void operator()(AVMD5* state) const;
  };
  std::unique_ptr<AVMD5, Deleter> mState;
};

}  // namespace tool
