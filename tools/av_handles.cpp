#include "av_handles.h"

#include <cstdarg>
#include <mutex>
#include <new>
#include <utility>

#include "tool_error.h"

namespace tool {
namespace {

std::mutex gLastMessageMutex;
std::string gLastMessage;

void KeepLastError(void* context, int level, const char* format, va_list arguments) {
  if (level > AV_LOG_ERROR) return;
  char line[512];
  int printPrefix = 0;
  av_log_format_line2(context, level, format, arguments, line, sizeof line, &printPrefix);
  std::string text = line;
  while (!text.empty() && (text.back() == '\n' || text.back() == ' ')) text.pop_back();
  const std::lock_guard lock(gLastMessageMutex);
  gLastMessage = text;
}

}  // namespace

Frame NewFrame() {
  Frame frame(av_frame_alloc());
  if (!frame) throw std::bad_alloc();
  return frame;
}

Packet NewPacket() {
  Packet packet(av_packet_alloc());
  if (!packet) throw std::bad_alloc();
  return packet;
}

void CollectAvMessages() { av_log_set_callback(KeepLastError); }

std::string TakeAvMessage() {
  const std::lock_guard lock(gLastMessageMutex);
  const std::string message = std::exchange(gLastMessage, {});
  return message.empty() ? message : " (" + message + ")";
}

void CheckAv(int code, const std::string& what) {
  if (code >= 0) return;
  char reason[AV_ERROR_MAX_STRING_SIZE] = "";
  av_strerror(code, reason, sizeof reason);
  throw ToolError(what + ": " + reason + TakeAvMessage());
}

}  // namespace tool
