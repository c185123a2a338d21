#include "frame/DvModule.h"

#include "zovcore/Utility.h"

namespace vexel {
namespace {

DvModule gModule;

}  // namespace

const DvModule& LoadedDvModule() noexcept { return gModule; }

void LoadDvModule() noexcept try {
  using namespace zovcore::utility;
  gModule = {};
  void* const module = LoadModule(ApplicationModulesDirectory() + "/mc_enc_dv.dll");
  if (!module) return;
  gModule.handle = module;
  gModule.newEncoder = FindModuleFunction(module, "DVNewEnc");
  gModule.doneEncoder = FindModuleFunction(module, "DVDoneEnc");
  gModule.compressBuffer = FindModuleFunction(module, "DVCompressBuffer");
} catch (...) {
  // DV encoding is missing then, which is no reason not to start.
}

void ReleaseDvModule() noexcept {
  const DvModule module = gModule;
  gModule = {};
  // No encoder is open here: a null encoder closes the module as a whole.
  if (module.doneEncoder) reinterpret_cast<void (*)(void*)>(module.doneEncoder)(nullptr);
  zovcore::utility::UnloadModule(module.handle);
}

}  // namespace vexel
