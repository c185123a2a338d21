#include "zovcore/Debug.h"

#include <atomic>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <map>
#include <memory>
#include <mutex>
#include <sstream>

#include "System.h"
#include "vexel_host/host.h"

namespace zovcore::debug {
namespace {

using Sink = std::function<void(std::string_view)>;

struct Entries {
  std::mutex mutex;
  std::map<std::string, std::string> texts;
};

std::string Trimmed(const std::string& text) {
  constexpr const char* kBlanks = " \t\r";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

void ReadFile(const char* path, std::map<std::string, std::string>& texts) {
  std::ifstream file(path);
  for (std::string line; std::getline(file, line);) {
    line = Trimmed(line);
    const size_t equals = line.find('=');
    if (line.empty() || line[0] == '#' || equals == std::string::npos) continue;
    texts[Trimmed(line.substr(0, equals))] = Trimmed(line.substr(equals + 1));
  }
}

// Never destroyed: other static objects may still ask while the process ends.
Entries& AllEntries() {
  static Entries& entries = []() -> Entries& {
    auto* const made = new Entries;
    if (const char* const path = std::getenv("VEXEL_DEBUG_DATABASE")) ReadFile(path, made->texts);
    return *made;
  }();
  return entries;
}

std::atomic<int> gTraceChanges{1};
std::atomic<bool> gHasSink{false};

struct SinkHolder {
  std::mutex mutex;
  std::shared_ptr<const Sink> sink;
};

SinkHolder& TraceSink() {
  static auto& holder = *new SinkHolder;
  return holder;
}

void NoteTraceChange() { gTraceChanges.fetch_add(1, std::memory_order_release); }

// "true" and "false" switch every level; a number is the least level shown.
bool LevelShown(const std::string& setting, int level, bool otherwise) {
  if (setting == "true") return true;
  if (setting == "false") return false;
  int least = 0;
  const auto [end, error] = std::from_chars(setting.data(), setting.data() + setting.size(), least);
  if (error != std::errc{} || end != setting.data() + setting.size()) return otherwise;
  return level >= least;
}

}  // namespace

DebugDatabase::DebugDatabase() = default;

DebugDatabase& DebugDatabase::Instance() {
  static DebugDatabase database;
  return database;
}

std::string DebugDatabase::GetEntry(const std::string& key, const std::string& defaultText) const {
  Entries& entries = AllEntries();
  const std::lock_guard lock(entries.mutex);
  const auto found = entries.texts.find(key);
  return found == entries.texts.end() ? defaultText : found->second;
}

void DebugDatabase::SetEntry(const std::string& key, const std::string& text) {
  Entries& entries = AllEntries();
  {
    const std::lock_guard lock(entries.mutex);
    entries.texts[key] = text;
  }
  NoteTraceChange();
}

void DebugDatabase::RemoveEntry(const std::string& key) {
  Entries& entries = AllEntries();
  {
    const std::lock_guard lock(entries.mutex);
    entries.texts.erase(key);
  }
  NoteTraceChange();
}

bool TraceEnabled(const char* category, int level, bool defaultOn) {
  const DebugDatabase& database = DebugDatabase::Instance();
  const bool otherwise = defaultOn && gHasSink.load(std::memory_order_acquire);
  const std::string forAll = database.GetEntry("Trace", "");
  return LevelShown(database.GetEntry(std::string("Trace.") + category, forAll), level, otherwise);
}

int TraceChangeCount() { return gTraceChanges.load(std::memory_order_acquire); }

void Trace(const std::string& line) {
  std::shared_ptr<const Sink> sink;
  {
    SinkHolder& holder = TraceSink();
    const std::lock_guard lock(holder.mutex);
    sink = holder.sink;
  }
  if (sink)
    (*sink)(line);
  else
    std::fwrite(line.data(), 1, line.size(), stderr);
}

bool BreakAfterContractDialog(const char* condition, const char* file, const char* function, int line) {
  if (TraceEnabled("Contract", 5, true)) {
    std::ostringstream text;
    text << file << ":" << line << ": " << function << ": contract broken: " << condition << "\n";
    Trace(text.str());
  }
  return IsDebuggerAttached();
}

bool IsDebuggerAttached() { return vexel_host::system::IsDebuggerAttached(); }

}  // namespace zovcore::debug

namespace vexel_host {

void SetTraceSink(std::function<void(std::string_view line)> sink) {
  using namespace zovcore::debug;
  auto shared = sink ? std::make_shared<const Sink>(std::move(sink)) : nullptr;
  gHasSink.store(shared != nullptr, std::memory_order_release);
  {
    SinkHolder& holder = TraceSink();
    const std::lock_guard lock(holder.mutex);
    holder.sink.swap(shared);
  }
  NoteTraceChange();
}

void SetDebugEntry(const std::string& key, const std::string& text) {
  zovcore::debug::DebugDatabase::Instance().SetEntry(key, text);
}

void RemoveDebugEntry(const std::string& key) { zovcore::debug::DebugDatabase::Instance().RemoveEntry(key); }

}  // namespace vexel_host
