#include <mutex>

#include "System.h"
#include "vexel_host/host.h"
#include "zovcore/Utility.h"

namespace {

struct Directory {
  std::mutex mutex;
  std::string path;
};

Directory& ModulesDirectory() {
  static auto& directory = *new Directory;
  return directory;
}

}  // namespace

namespace zovcore::utility {

std::string ApplicationModulesDirectory() {
  Directory& directory = ModulesDirectory();
  const std::lock_guard lock(directory.mutex);
  return directory.path.empty() ? vexel_host::system::ProgramDirectory() : directory.path;
}

void* LoadModule(const std::string& path) { return vexel_host::system::LoadModule(path); }

void* FindModuleFunction(void* module, const char* name) {
  return module ? vexel_host::system::FindFunction(module, name) : nullptr;
}

void UnloadModule(void* module) {
  if (module) vexel_host::system::UnloadModule(module);
}

}  // namespace zovcore::utility

namespace vexel_host {

void SetModulesDirectory(const std::string& path) {
  Directory& directory = ModulesDirectory();
  const std::lock_guard lock(directory.mutex);
  directory.path = path;
}

}  // namespace vexel_host
