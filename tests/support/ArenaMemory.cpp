#include "support/ArenaMemory.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>
#include <system_error>

#include "formats/FormatBits.h"

namespace vexel::testing {
namespace {

constexpr size_t kPage = 4096;
constexpr size_t kSlotPages = 4;
constexpr int kSlots = 80;
constexpr size_t kSlotPitch = (kSlotPages + 1) * kPage;
constexpr size_t kBlockBytes = (kSlots * (kSlotPages * kPage + 256) / kPage + 1) * kPage;
// One unreadable page, slots with one behind each, the block with one behind it.
constexpr size_t kBlockOffset = kPage + kSlots * kSlotPitch;
constexpr size_t kTotalBytes = kBlockOffset + kBlockBytes + kPage;
// Padding is watched this far from the rows.
constexpr size_t kMargin = 256;

void Check(bool done, const char* what) {
  if (!done) throw std::system_error(errno, std::generic_category(), what);
}

size_t SampleBytes(VX_PixelFormat format) {
  switch (Depth(format)) {
    case kDepth8u:
      return 1;
    case kDepth15u:
      return 2;
    case kDepth10u:
      return Is420(format) ? 2 : 4;
    default:
      return 4;
  }
}

size_t RoundUp(size_t value, size_t multiple) { return (value + multiple - 1) / multiple * multiple; }

}  // namespace

uint8_t* ReserveAddresses(size_t bytes) {
  void* memory = mmap(nullptr, bytes, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
  Check(memory != MAP_FAILED, "reserve addresses");
  return static_cast<uint8_t*>(memory);
}

ArmedBuffer::ArmedBuffer(Access access) {
  const int file = memfd_create("arena", MFD_CLOEXEC);
  Check(file >= 0 && ftruncate(file, kTotalBytes) == 0, "arena memory");
  void* armed = mmap(nullptr, kTotalBytes, PROT_NONE, MAP_SHARED, file, 0);
  void* writable = mmap(nullptr, kTotalBytes, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
  Check(armed != MAP_FAILED && writable != MAP_FAILED, "map arena");
  close(file);
  mArmed = static_cast<uint8_t*>(armed);
  mToWritable = static_cast<uint8_t*>(writable) - mArmed;
  const int rights = access == Access::ReadOnly ? PROT_READ : PROT_READ | PROT_WRITE;
  for (int slot = 0; slot < kSlots; ++slot)
    Check(mprotect(SlotBegin(slot), kSlotPages * kPage, rights) == 0, "arm a slot");
  Check(mprotect(mArmed + kBlockOffset, kBlockBytes, rights) == 0, "arm the block");
}

uint8_t* ArmedBuffer::SlotBegin(int slot) const { return mArmed + kPage + static_cast<size_t>(slot) * kSlotPitch; }

void ArmedBuffer::Place(VX_PixelFormat format, ArenaSize size, const Placement& placement, size_t elementBytes) {
  mFrame = {nullptr, 0, format, size.width, size.height};
  mZones.clear();
  mSpans.clear();
  if (IsSpecial(format)) return PlaceSpecial(placement);
  const size_t unit = elementBytes != 0 ? 1 : SampleBytes(format);
  const auto width = static_cast<size_t>(std::max(size.width, 0));
  const size_t extent =
      elementBytes != 0 ? width * elementBytes : static_cast<size_t>(UnpaddedRowBytes(format, size.width));
  if (size.width < 1 || size.height < 1 || size.height > kSlots || extent + 64 * unit > kSlotPages * kPage)
    throw std::length_error("a picture larger than the arena");
  // Operations on elements see row bytes as whole elements.
  const bool slotsFit = elementBytes == 0 || kSlotPitch % elementBytes == 0;
  if (placement.guard == Guard::Packed || !slotsFit) {
    PlaceInBlock(extent, placement, std::max(unit, elementBytes));
  } else {
    PlaceInSlots(extent, placement, unit);
  }
}

void ArmedBuffer::PlaceInSlots(size_t extent, const Placement& placement, size_t unit) {
  for (int slot = 0; slot < mFrame.height; ++slot) {
    uint8_t* const begin = SlotBegin(slot);
    uint8_t* const end = begin + kSlotPages * kPage;
    uint8_t* row = begin;
    if (placement.guard == Guard::Behind) row = end - extent;
    if (placement.guard == Guard::Shifted) row += static_cast<size_t>(placement.shift) * unit;
    mZones.push_back(
        {row - std::min<size_t>(kMargin, row - begin), row + extent + std::min<size_t>(kMargin, end - row - extent)});
    mSpans.push_back({row, extent, slot, placement.negative ? mFrame.height - 1 - slot : slot});
  }
  mFrame.base = mSpans[placement.negative ? mFrame.height - 1 : 0].begin;
  mFrame.rowBytes = placement.negative ? -static_cast<int32_t>(kSlotPitch) : static_cast<int32_t>(kSlotPitch);
}

void ArmedBuffer::PlaceInBlock(size_t extent, const Placement& placement, size_t unit) {
  const size_t pitch = extent + static_cast<size_t>(placement.shift) * unit;
  uint8_t* const end = mArmed + kBlockOffset + kBlockBytes;
  uint8_t* const begin = end - (pitch * static_cast<size_t>(mFrame.height - 1) + extent);
  mZones.push_back({std::max(begin - kMargin, mArmed + kBlockOffset), end});
  for (int i = 0; i < mFrame.height; ++i)
    mSpans.push_back(
        {begin + static_cast<size_t>(i) * pitch, extent, 0, placement.negative ? mFrame.height - 1 - i : i});
  mFrame.base = mSpans[placement.negative ? mFrame.height - 1 : 0].begin;
  mFrame.rowBytes = placement.negative ? -static_cast<int32_t>(pitch) : static_cast<int32_t>(pitch);
}

void ArmedBuffer::AddPlane(uint8_t* begin, size_t pitch, size_t bytes, int rows) {
  for (int row = 0; row < rows; ++row)
    mSpans.push_back({begin + static_cast<size_t>(row) * pitch, bytes, 0, static_cast<int>(mSpans.size())});
}

void ArmedBuffer::PlaceSpecial(const Placement& placement) {
  const VX_PixelFormat format = mFrame.format;
  const auto total = static_cast<size_t>(VX_PixelFormatSize(format, mFrame.width, mFrame.height));
  if (total == 0 || total > kBlockBytes) throw std::length_error("a picture larger than the arena");
  uint8_t* const blockBegin = mArmed + kBlockOffset;
  uint8_t* const base = placement.guard == Guard::Before ? blockBegin : blockBegin + kBlockBytes - total;
  mFrame.base = base;
  mZones.push_back({std::max(base - kMargin, blockBegin), std::min(base + total + kMargin, blockBegin + kBlockBytes)});
  if (!Is420(format)) return AddPlane(base, total, total, 1);
  const size_t unit = SampleBytes(format), lumaBytes = static_cast<size_t>(mFrame.width) * unit;
  const size_t chromaBytes = static_cast<size_t>(mFrame.width + 1) / 2 * unit;
  const size_t lumaPitch = RoundUp(lumaBytes, 128);
  const int chromaRows = (mFrame.height + 1) / 2;
  AddPlane(base, lumaPitch, lumaBytes, mFrame.height);
  if (IsBiplanar(format))
    return AddPlane(base + lumaPitch * static_cast<size_t>(mFrame.height), lumaPitch, 2 * chromaBytes, chromaRows);
  const size_t rows = RoundUp(static_cast<size_t>(mFrame.height), 32);
  const size_t chromaPitch = RoundUp(static_cast<size_t>(mFrame.width / 2) * unit, 128);
  uint8_t* const chroma = base + rows * lumaPitch;
  AddPlane(chroma, chromaPitch, std::min(chromaBytes, chromaPitch), chromaRows);
  AddPlane(chroma + rows * chromaPitch / 2, chromaPitch, std::min(chromaBytes, chromaPitch), chromaRows);
}

template <class Visit>
void ArmedBuffer::VisitPadding(Visit visit) const {
  size_t span = 0;
  for (int zone = 0; zone < static_cast<int>(mZones.size()); ++zone) {
    uint8_t* position = mZones[zone].begin;
    for (; span < mSpans.size() && mSpans[span].zone == zone; ++span) {
      visit(position, static_cast<size_t>(mSpans[span].begin - position));
      position = mSpans[span].begin + mSpans[span].bytes;
    }
    visit(position, static_cast<size_t>(mZones[zone].end - position));
  }
}

void ArmedBuffer::FillPadding(uint8_t byte) {
  VisitPadding([&](uint8_t* p, size_t bytes) { std::memset(p + mToWritable, byte, bytes); });
}

void ArmedBuffer::FillPixels(uint8_t byte) {
  for (const Span& span : mSpans) std::memset(span.begin + mToWritable, byte, span.bytes);
}

void ArmedBuffer::FillPixels(Contents contents, uint64_t seed) {
  Random random(seed);
  for (const Span& span : mSpans) FillSamples(span.begin + mToWritable, span.bytes, mFrame.format, contents, random);
}

std::string ArmedBuffer::TouchedPadding(uint8_t byte) const {
  const uint8_t* touched = nullptr;
  VisitPadding([&](const uint8_t* p, size_t bytes) {
    if (touched || bytes == 0 || (*p == byte && std::memcmp(p, p + 1, bytes - 1) == 0)) return;
    while (*p == byte) ++p;
    touched = p;
  });
  return touched ? PlaceOf(touched) : std::string();
}

void ArmedBuffer::CopyPixels(std::vector<uint8_t>& pixels) const {
  pixels.clear();
  for (const Span& span : mSpans) pixels.insert(pixels.end(), span.begin, span.begin + span.bytes);
}

std::string ArmedBuffer::PlaceOfPixelByte(size_t index) const {
  for (const Span& span : mSpans) {
    if (index < span.bytes) return PlaceOf(span.begin + index);
    index -= span.bytes;
  }
  return "beyond the picture";
}

bool ArmedBuffer::Holds(const uint8_t* address) const { return address >= mArmed && address < mArmed + kTotalBytes; }

std::string ArmedBuffer::PlaceOf(const uint8_t* address) const {
  const Span* nearest = nullptr;
  ptrdiff_t least = PTRDIFF_MAX;
  for (const Span& span : mSpans) {
    const ptrdiff_t past = address - (span.begin + span.bytes - 1), before = span.begin - address;
    const ptrdiff_t distance = std::max({past, before, ptrdiff_t{0}});
    if (distance < least) least = distance, nearest = &span;
  }
  if (!nearest) return "no row";
  const std::string row = "row " + std::to_string(nearest->row) + ", ";
  if (address < nearest->begin) return row + std::to_string(nearest->begin - address) + " bytes before it";
  const ptrdiff_t offset = address - nearest->begin, bytes = static_cast<ptrdiff_t>(nearest->bytes);
  if (offset < bytes) return row + "byte " + std::to_string(offset);
  return row + std::to_string(offset - bytes) + " bytes past its end";
}

}  // namespace vexel::testing
