// Where bytes go: a file that takes its name when it is whole, so that a failure leaves no half of one behind and a
// file can be converted onto itself.
#pragma once

#include <cstddef>
#include <cstdio>
#include <string>
#include <utility>

namespace tool {

class OutputFile {
 public:
  // "-" is standard output; what is there and no regular file (a device, a named pipe, a link to nothing) is written in
  // place. Nothing is made before the first Write().
  explicit OutputFile(std::string path) : mPath(std::move(path)) {}
  ~OutputFile();
  OutputFile(const OutputFile&) = delete;

  // These throw ToolError when the file cannot be written.
  void Write(const void* bytes, size_t count);
  // Puts the file in its place. Without it, what was written is thrown away.
  void Close();

 private:
  void Open();
  [[noreturn]] void Fail(const std::string& reason) const;

  std::string mPath;
  std::string mTarget;      // mPath without links
  std::string mUnfinished;  // its name until Close(); empty where the target is written in place
  std::FILE* mFile = nullptr;
};

}  // namespace tool
