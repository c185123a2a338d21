// The host's settings, trace and contract dialog.
#pragma once

#include <string>

#include "zovcore/Export.h"

namespace zovcore::debug {

// Settings as texts. Entries come from the file that the environment variable VEXEL_DEBUG_DATABASE names, read at first
// use ("key=value" lines; blanks around both are dropped; empty lines and lines that begin with # are skipped), and
// from SetEntry, which wins. Thread-safe.
class ZOV_API DebugDatabase {
 public:
  static DebugDatabase& Instance();
  // The text of a key, or defaultText if there is none.
  std::string GetEntry(const std::string& key, const std::string& defaultText) const;
  void SetEntry(const std::string& key, const std::string& text);
  void RemoveEntry(const std::string& key);

  DebugDatabase(const DebugDatabase&) = delete;
  DebugDatabase& operator=(const DebugDatabase&) = delete;

 private:
  DebugDatabase();
};

// True if lines of that category and level are wanted. The entry "Trace.CATEGORY" (else "Trace") of the debug database
// holds the least level that is shown, as a number; without both, defaultOn decides, and it counts only while a sink is
// set. Ask again when TraceChangeCount() has moved.
ZOV_API bool TraceEnabled(const char* category, int level, bool defaultOn);
// Moves whenever an answer of TraceEnabled may have changed.
ZOV_API int TraceChangeCount();
// Hands a finished line, its end of line included, to the sink (standard error without one).
ZOV_API void Trace(const std::string& line);

// Reports a broken contract to the trace. True if the caller should break into an attached debugger.
ZOV_API bool BreakAfterContractDialog(const char* condition, const char* file, const char* function, int line);
ZOV_API bool IsDebuggerAttached();

}  // namespace zovcore::debug
