// Errors of the host, thrown as exceptions.
#pragma once

#include <stdexcept>
#include <string>

#include "zovcore/Export.h"

namespace zovcore::config {

// A text that takes the place of a marker in a message: the first value stands for "%1", the fourth for "%4".
struct ReplacementValue {
  std::string mText;
};

class ZOV_API Error : public std::runtime_error {
 public:
  Error(const std::string& text, int level, int code, int subcode);
  ~Error() override;
  int Level() const noexcept { return mLevel; }
  int Code() const noexcept { return mCode; }
  int Subcode() const noexcept { return mSubcode; }

 private:
  int mLevel, mCode, mSubcode;
};

// Throws an Error. A message "$$$/path=text" is a translation key with its default text; the text is what the error
// says. With traced set, the text also goes to the trace.
[[noreturn]] ZOV_API void ThrowError(int level, const char* message, int code, int subcode, bool traced,
                                     const ReplacementValue& first, const ReplacementValue& second,
                                     const ReplacementValue& third, const ReplacementValue& fourth);

}  // namespace zovcore::config
