// The optional DV encoder module.
#pragma once

namespace vexel {

// Loaded by VX_Initialize, given back by VX_Terminate. Without the module, or without one of the functions, that
// pointer is null.
struct DvModule {
  void* handle = nullptr;
  void* newEncoder = nullptr;      // "DVNewEnc"
  void* doneEncoder = nullptr;     // "DVDoneEnc"
  void* compressBuffer = nullptr;  // "DVCompressBuffer"
};

// Null functions before VX_Initialize and after VX_Terminate.
const DvModule& LoadedDvModule() noexcept;

void LoadDvModule() noexcept;
// Calls the module's close function, if it has one, then lets go of the module.
void ReleaseDvModule() noexcept;

}  // namespace vexel
