// The arena's memory: pictures between unreadable pages.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "support/Arena.h"

namespace vexel::testing {

struct Placement {
  Guard guard = Guard::Behind;
  bool negative = false;  // row bytes
  int shift = 0;          // Shifted: samples past the unreadable page; Packed: samples between rows
};

class ArmedBuffer {
 public:
  enum class Access { ReadOnly, ReadWrite };
  explicit ArmedBuffer(Access access);
  ArmedBuffer(const ArmedBuffer&) = delete;
  ArmedBuffer& operator=(const ArmedBuffer&) = delete;

  // Lays a picture out. Throws std::length_error if it is too large. elementBytes as in ArenaCase.
  void Place(VX_PixelFormat format, ArenaSize size, const Placement& placement, size_t elementBytes = 0);
  const ArenaFrame& Frame() const { return mFrame; }

  void FillPadding(uint8_t byte);
  void FillPixels(uint8_t byte);
  void FillPixels(Contents contents, uint64_t seed);
  // Where padding no longer holds the byte; empty if it does everywhere.
  std::string TouchedPadding(uint8_t byte) const;
  void CopyPixels(std::vector<uint8_t>& pixels) const;
  // The place of a byte of CopyPixels or of an address: "row 3, byte 17", "row 0, 4 bytes past its end".
  std::string PlaceOfPixelByte(size_t index) const;
  std::string PlaceOf(const uint8_t* address) const;
  bool Holds(const uint8_t* address) const;

 private:
  // A stretch of writable memory that the rows in it do not fill.
  struct Zone {
    uint8_t *begin, *end;
  };
  struct Span {
    uint8_t* begin;
    size_t bytes;
    int zone;
    int row;
  };

  uint8_t* SlotBegin(int slot) const;
  void PlaceInSlots(size_t rowExtent, const Placement& placement, size_t unit);
  void PlaceInBlock(size_t rowExtent, const Placement& placement, size_t unit);
  void PlaceSpecial(const Placement& placement);
  void AddPlane(uint8_t* begin, size_t pitch, size_t bytes, int rows);
  template <class Visit>
  void VisitPadding(Visit visit) const;

  uint8_t* mArmed = nullptr;  // what operations see
  ptrdiff_t mToWritable = 0;  // from there to the view that may always be written
  ArenaFrame mFrame;
  std::vector<Zone> mZones;  // in the order of their addresses, as the spans
  std::vector<Span> mSpans;
};

// Reserved address space that faults on every access.
uint8_t* ReserveAddresses(size_t bytes);

}  // namespace vexel::testing
