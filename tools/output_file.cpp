#include "output_file.h"

#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <random>
#include <system_error>
#include <utility>

#include "tool_error.h"

namespace tool {
namespace {

namespace fs = std::filesystem;

// The unfinished file, for a program that is interrupted: one is written at a time.
char gUnfinished[4096];

extern "C" void RemoveUnfinished(int signal) {
  std::remove(gUnfinished);
  std::signal(signal, SIG_DFL);
  std::raise(signal);
}

constexpr int kInterruptions[] = {
#ifdef SIGHUP
    SIGHUP,
#endif
    SIGINT, SIGTERM};

// Signals that are ignored stay so.
void WhenInterrupted(void (*handler)(int)) {
  for (const int signal : kInterruptions)
    if (std::signal(signal, handler) == SIG_IGN) std::signal(signal, SIG_IGN);
}

void RemoveWhenInterrupted(const std::string& path) {
  if (path.size() >= sizeof gUnfinished) return;
  std::memcpy(gUnfinished, path.c_str(), path.size() + 1);
  WhenInterrupted(RemoveUnfinished);
}

// Beside the target, whose name may be as long as names can be.
std::string UnfinishedName(const std::string& target) {
  constexpr size_t kMostKept = 200;
  char suffix[24];
  std::snprintf(suffix, sizeof suffix, ".%08x.part", static_cast<unsigned>(std::random_device()()));
  const fs::path path(target);
  return (path.parent_path() / (path.filename().string().substr(0, kMostKept) + suffix)).string();
}

// Whether a file that is there may be written to; renaming would replace it all the same.
bool IsWritable(const std::string& path) {
  std::FILE* const file = std::fopen(path.c_str(), "r+b");
  return file && std::fclose(file) == 0;
}

}  // namespace

OutputFile::~OutputFile() {
  if (mFile && mFile != stdout) std::fclose(mFile);
  if (mUnfinished.empty()) return;
  std::remove(mUnfinished.c_str());
  WhenInterrupted(SIG_DFL);
}

void OutputFile::Open() {
  if (mPath == "-") {
    if (isatty(STDOUT_FILENO)) Fail("it is a terminal, which shows no frames; redirect it");
    mFile = stdout;
    return;
  }
  std::error_code error;
  const fs::path canonical = fs::canonical(mPath, error);
  const bool isResolved = !error;
  mTarget = isResolved ? canonical.string() : mPath;
  // A link whose end has no name, or is not there yet, exists as well; renaming would replace the link.
  const bool exists = fs::exists(fs::symlink_status(mTarget, error));
  if (exists && !(isResolved && fs::is_regular_file(mTarget, error))) {
    mFile = std::fopen(mTarget.c_str(), "wb");
  } else if (!exists || IsWritable(mTarget)) {
    const std::string unfinished = UnfinishedName(mTarget);
    mFile = std::fopen(unfinished.c_str(), "wbx");
    if (mFile) mUnfinished = unfinished;
  }
  if (!mFile) Fail(std::strerror(errno));
  if (mUnfinished.empty()) return;
  RemoveWhenInterrupted(mUnfinished);
  if (exists) fs::permissions(mUnfinished, fs::status(mTarget, error).permissions(), error);
}

void OutputFile::Write(const void* bytes, size_t count) {
  if (!mFile) Open();
  if (std::fwrite(bytes, 1, count, mFile) != count) Fail(std::strerror(errno));
}

void OutputFile::Close() {
  if (!mFile) return;
  if (mFile == stdout ? std::fflush(mFile) != 0 : std::fclose(std::exchange(mFile, nullptr)) != 0)
    Fail(std::strerror(errno));
  if (mUnfinished.empty()) return;
  std::error_code error;
  fs::rename(mUnfinished, mTarget, error);
  if (error) Fail(error.message());
  mUnfinished.clear();
  WhenInterrupted(SIG_DFL);
}

void OutputFile::Fail(const std::string& reason) const {
  const std::string name = mPath == "-" ? "standard output" : "\"" + mPath + "\"";
  throw ToolError("cannot write " + name + ": " + reason);
}

}  // namespace tool
