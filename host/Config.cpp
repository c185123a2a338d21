#include "zovcore/Config.h"

#include "zovcore/Debug.h"

namespace zovcore::config {
namespace {

std::string Text(const char* message, const ReplacementValue* const (&values)[4]) {
  std::string text = message;
  // "$$$/path=text": without a dictionary the default text is what is shown.
  if (text.rfind("$$$/", 0) == 0)
    if (const size_t equals = text.find('='); equals != std::string::npos) text.erase(0, equals + 1);
  // One pass, so that a marker inside a value stays as it is.
  std::string result;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '%' && i + 1 < text.size() && text[i + 1] >= '1' && text[i + 1] <= '4')
      result += values[text[++i] - '1']->mText;
    else
      result += text[i];
  }
  return result;
}

}  // namespace

Error::Error(const std::string& text, int level, int code, int subcode)
    : std::runtime_error(text), mLevel(level), mCode(code), mSubcode(subcode) {}

Error::~Error() = default;

void ThrowError(int level, const char* message, int code, int subcode, bool traced, const ReplacementValue& first,
                const ReplacementValue& second, const ReplacementValue& third, const ReplacementValue& fourth) {
  const std::string text = Text(message, {&first, &second, &third, &fourth});
  if (traced && debug::TraceEnabled("Error", level, true)) debug::Trace(text + "\n");
  throw Error(text, level, code, subcode);
}

}  // namespace zovcore::config
