#include "support/Arena.h"

#include <signal.h>
#include <sys/mman.h>
#include <ucontext.h>
#include <unistd.h>
#include <xmmintrin.h>

#include <array>
#include <cstdio>
#include <memory>
#include <numeric>
#include <stdexcept>
#include <system_error>

#include "frame/FpModeGuard.h"
#include "support/Formats.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

constexpr int kMostSources = 4;
// What a thread starts with: round to nearest, no flush to zero, all exceptions masked.
constexpr uint32_t kCallerMode = 0x1F80;
constexpr uint8_t kFirstPadding = 0x5A, kSecondPadding = 0xA5;

constexpr const char* kGuardNames[] = {"Behind", "Before", "Shifted", "Packed"};
constexpr const char* kContentsNames[] = {"Random",     "Extremes",  "Zeros",      "Maximum",
                                          "ClearAlpha", "TinyAlpha", "OpaqueAlpha"};

// ---- Memory: pictures between unreadable pages

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

// Reserved address space that faults on every access.
uint8_t* ReserveAddresses(size_t bytes) {
  void* memory = mmap(nullptr, bytes, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
  Check(memory != MAP_FAILED, "reserve addresses");
  return static_cast<uint8_t*>(memory);
}

struct Placement {
  Guard guard = Guard::Behind;
  bool negative = false;  // row bytes
  int shift = 0;          // Shifted: samples past the unreadable page; Packed: samples between rows
};

class ArmedBuffer {
 public:
  enum class Access { ReadOnly, ReadWrite };
  explicit ArmedBuffer(Access access) {
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

  // Lays a picture out. Throws std::length_error if it is too large. elementBytes as in ArenaCase.
  void Place(VX_PixelFormat format, ArenaSize size, const Placement& placement, size_t elementBytes = 0) {
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
    const bool block = placement.guard == Guard::Packed || !slotsFit;
    const size_t pitch =
        block ? extent + static_cast<size_t>(placement.shift) * std::max(unit, elementBytes) : kSlotPitch;
    block ? PlaceInBlock(extent, pitch, placement.negative) : PlaceInSlots(extent, placement, unit);
    mFrame.base = mSpans[placement.negative ? mFrame.height - 1 : 0].begin;
    mFrame.rowBytes = placement.negative ? -static_cast<int32_t>(pitch) : static_cast<int32_t>(pitch);
  }
  const ArenaFrame& Frame() const { return mFrame; }

  void FillPadding(uint8_t byte) {
    VisitPadding([&](uint8_t* p, size_t bytes) { std::memset(p + mToWritable, byte, bytes); });
  }

  void FillPixels(uint8_t byte) {
    for (const Span& span : mSpans) std::memset(span.begin + mToWritable, byte, span.bytes);
  }

  void FillPixels(Contents contents, uint64_t seed) {
    Random random(seed);
    for (const Span& span : mSpans) FillSamples(span.begin + mToWritable, span.bytes, mFrame.format, contents, random);
  }

  // Where padding no longer holds the byte; empty if it does everywhere.
  std::string TouchedPadding(uint8_t byte) const {
    const uint8_t* touched = nullptr;
    VisitPadding([&](const uint8_t* p, size_t bytes) {
      if (touched || bytes == 0 || (*p == byte && std::memcmp(p, p + 1, bytes - 1) == 0)) return;
      while (*p == byte) ++p;
      touched = p;
    });
    return touched ? PlaceOf(touched) : std::string();
  }

  void CopyPixels(std::vector<uint8_t>& pixels) const {
    pixels.clear();
    for (const Span& span : mSpans) pixels.insert(pixels.end(), span.begin, span.begin + span.bytes);
  }

  // The place of a byte of CopyPixels or of an address: "row 3, byte 17", "row 0, 4 bytes past its end".
  std::string PlaceOfPixelByte(size_t index) const {
    for (const Span& span : mSpans) {
      if (index < span.bytes) return PlaceOf(span.begin + index);
      index -= span.bytes;
    }
    return "beyond the picture";
  }

  std::string PlaceOf(const uint8_t* address) const {
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

  bool Holds(const uint8_t* address) const { return address >= mArmed && address < mArmed + kTotalBytes; }

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

  uint8_t* SlotBegin(int slot) const { return mArmed + kPage + static_cast<size_t>(slot) * kSlotPitch; }

  void PlaceInSlots(size_t extent, const Placement& placement, size_t unit) {
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
  }

  void PlaceInBlock(size_t extent, size_t pitch, bool negative) {
    uint8_t* const end = mArmed + kBlockOffset + kBlockBytes;
    uint8_t* const begin = end - (pitch * static_cast<size_t>(mFrame.height - 1) + extent);
    mZones.push_back({std::max(begin - kMargin, mArmed + kBlockOffset), end});
    for (int i = 0; i < mFrame.height; ++i)
      mSpans.push_back({begin + static_cast<size_t>(i) * pitch, extent, 0, negative ? mFrame.height - 1 - i : i});
  }

  void AddPlane(uint8_t* begin, size_t pitch, size_t bytes, int rows) {
    for (int row = 0; row < rows; ++row)
      mSpans.push_back({begin + static_cast<size_t>(row) * pitch, bytes, 0, static_cast<int>(mSpans.size())});
  }

  void PlaceSpecial(const Placement& placement) {
    const VX_PixelFormat format = mFrame.format;
    const auto total = static_cast<size_t>(VX_PixelFormatSize(format, mFrame.width, mFrame.height));
    if (total == 0 || total > kBlockBytes) throw std::length_error("a picture larger than the arena");
    uint8_t* const blockBegin = mArmed + kBlockOffset;
    uint8_t* const base = placement.guard == Guard::Before ? blockBegin : blockBegin + kBlockBytes - total;
    mFrame.base = base;
    mZones.push_back(
        {std::max(base - kMargin, blockBegin), std::min(base + total + kMargin, blockBegin + kBlockBytes)});
    if (!Is420(format)) return AddPlane(base, total, total, 1);
    const size_t unit = SampleBytes(format), chroma = static_cast<size_t>(mFrame.width + 1) / 2 * unit;
    void* planes[3];
    int32_t pitches[3];
    VX_GetPlanarBuffers(base, format, mFrame.width, mFrame.height, planes, pitches);
    for (int i = 0; i < (IsBiplanar(format) ? 2 : 3); ++i) {
      const auto pitch = static_cast<size_t>(pitches[i]);
      const size_t bytes = i == 0               ? static_cast<size_t>(mFrame.width) * unit
                           : IsBiplanar(format) ? 2 * chroma
                                                : std::min(chroma, pitch);
      AddPlane(static_cast<uint8_t*>(planes[i]), pitch, bytes, i == 0 ? mFrame.height : (mFrame.height + 1) / 2);
    }
  }

  template <class Visit>
  void VisitPadding(Visit visit) const {
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

  uint8_t* mArmed = nullptr;  // what operations see
  ptrdiff_t mToWritable = 0;  // from there to the view that may always be written
  ArenaFrame mFrame;
  std::vector<Zone> mZones;  // in the order of their addresses, as the spans
  std::vector<Span> mSpans;
};

// ---- Cases

void ReportFault(int, siginfo_t* info, void* context);

class FaultReporter {
 public:
  FaultReporter() {
    struct sigaction action = {};
    action.sa_sigaction = ReportFault;
    action.sa_flags = SA_SIGINFO | SA_RESETHAND;
    sigaction(SIGSEGV, &action, &mSegv);
    sigaction(SIGBUS, &action, &mBus);
  }
  ~FaultReporter() {
    sigaction(SIGSEGV, &mSegv, nullptr);
    sigaction(SIGBUS, &mBus, nullptr);
  }
  FaultReporter(const FaultReporter&) = delete;
  FaultReporter& operator=(const FaultReporter&) = delete;

 private:
  struct sigaction mSegv, mBus;
};

class Arena {
 public:
  static Arena& Instance() {
    static Arena arena;
    return arena;
  }

  ::testing::AssertionResult Run(const ArenaCase& arenaCase) {
    if (arenaCase.sources.size() > kMostSources) return ::testing::AssertionFailure() << "too many sources";
    mCase = &arenaCase;
    mActive = ActiveKernelVariant();
    const FaultReporter reporter;
    Random random(arenaCase.seed);
    std::string wrong;
    const auto runContents = [&](int contents) {
      wrong = Compare(static_cast<Contents>(contents), random.Next());
      return wrong.empty();
    };
    const auto runPlaced = [&](int width, int guard) {
      const int height = arenaCase.heights[random.Next() % arenaCase.heights.size()];
      Place({width, height}, static_cast<Guard>(guard), random);
      if (!arenaCase.everyContents) return runContents(static_cast<int>(random.Next() % kContentsCount));
      for (int contents = 0; contents < kContentsCount; ++contents)
        if (!runContents(contents)) return false;
      return true;
    };
    bool right = true;
    for (int pass = 0; right && pass < arenaCase.passes; ++pass)
      for (size_t i = 0; right && i < arenaCase.widths.size(); ++i)
        for (int guard = 0; right && guard < 4; ++guard) right = runPlaced(arenaCase.widths[i], guard);
    auto verdict = right ? ::testing::AssertionSuccess() : ::testing::AssertionFailure() << Describe() << ": " << wrong;
    mCase = nullptr;
    return verdict;
  }

  // The case that is running, for failures and faults.
  std::string Describe() const {
    const ArenaFrame& dst = mDestination.Frame();
    std::string text = mCase->name + ": ";
    for (size_t i = 0; i < mCase->sources.size(); ++i) {
      const ArenaFrame& src = mFrames[i];
      text += FormatName(src.format) + " " + std::to_string(src.width) + "x" + std::to_string(src.height) +
              " (row bytes " + std::to_string(src.rowBytes) + ") ";
    }
    return text + "-> " + FormatName(dst.format) + " " + std::to_string(dst.width) + "x" + std::to_string(dst.height) +
           " (row bytes " + std::to_string(dst.rowBytes) + "), " + kGuardNames[static_cast<int>(mGuard)] + ", " +
           kContentsNames[static_cast<int>(mContents)] + ", " + KernelVariantName(mVariant);
  }

  std::string DescribeFault(const uint8_t* address, bool write) const {
    if (!mCase) return "fault outside any case";
    std::string place = "at an address outside the arena";
    if (mDestination.Holds(address)) place = "of the destination, " + mDestination.PlaceOf(address);
    for (size_t i = 0; i < mCase->sources.size(); ++i)
      if (mSources[i]->Holds(address)) place = "of source " + std::to_string(i) + ", " + mSources[i]->PlaceOf(address);
    return Describe() + ": illegal " + (write ? "write " : "read ") + place;
  }

 private:
  Arena() {
    for (auto& source : mSources) source = std::make_unique<ArmedBuffer>(ArmedBuffer::Access::ReadOnly);
  }

  void Place(ArenaSize size, Guard guard, Random& random) {
    mGuard = guard;
    const auto draw = [&] {
      return Placement{guard, random.OneIn(2), static_cast<int>(random.OneIn(3) ? 0 : random.Int(0, 33))};
    };
    for (size_t i = 0; i < mCase->sources.size(); ++i) {
      const ArenaSize sourceSize = mCase->sourceSize ? mCase->sourceSize(static_cast<int>(i), size) : size;
      mSources[i]->Place(mCase->sources[i], sourceSize, draw(), mCase->elementBytes);
      mFrames[i] = mSources[i]->Frame();
    }
    mDestination.Place(mCase->destination, size, draw(), mCase->elementBytes);
  }

  std::string RunOnce(KernelVariant variant, Contents contents, uint64_t seed, uint8_t padding) {
    mVariant = variant;
    for (size_t i = 0; i < mCase->sources.size(); ++i) mSources[i]->FillPadding(padding);
    mDestination.FillPadding(padding);
    if (mCase->destinationIsInput) {
      mDestination.FillPixels(contents, ~seed);
    } else {
      mDestination.FillPixels(padding);
    }
    std::vector<uint8_t>& pixels = mPixels;
    if (mCase->expected != VX_Success) mDestination.CopyPixels(mPlain);

    LimitKernelVariant(variant);
    const uint32_t ownMode = _mm_getcsr();
    _mm_setcsr(kCallerMode);
    const VX_Result result = mCase->run(mFrames, mDestination.Frame());
    const uint32_t modeAfter = _mm_getcsr();
    _mm_setcsr(ownMode);
    LimitKernelVariant(mActive);

    if (result != mCase->expected)
      return std::string("returned ") + VX_ResultName(result) + " instead of " + VX_ResultName(mCase->expected);
    // The lower six bits are the sticky exception flags, which row kernels of their own may raise.
    if ((kCallerMode ^ modeAfter) & ~0x3Fu) return "left another floating-point mode";
    const std::string touched = mDestination.TouchedPadding(padding);
    if (!touched.empty()) return "wrote outside the picture: " + touched;
    mDestination.CopyPixels(pixels);
    if (mCase->expected != VX_Success && pixels != mPlain) return "refused, but wrote: " + FirstDifference();
    return {};
  }

  // Two runs: plain code over one padding, the variant under test over the other.
  std::string Compare(Contents contents, uint64_t seed) {
    mContents = contents;
    for (size_t i = 0; i < mCase->sources.size(); ++i) mSources[i]->FillPixels(contents, seed + i);
    if (std::string wrong = RunOnce(KernelVariant::Plain, contents, seed, kFirstPadding); !wrong.empty()) return wrong;
    if (mCase->expected == VX_Success) mPlain = mPixels;
    if (std::string wrong = RunOnce(mActive, contents, seed, kSecondPadding); !wrong.empty()) return wrong;
    return mCase->expected == VX_Success ? FirstDifference() : std::string();
  }

  // NaNs are alike whatever their sign and payload: which operand's survive is the compiler's choice in plain code.
  std::string FirstDifference() const {
    if (mPlain == mPixels) return {};
    const bool isFloat = Depth(mDestination.Frame().format) == kDepth32f;
    for (size_t i = 0; i < mPixels.size();) {
      float expected = 0, actual = 0;
      if (isFloat) {
        std::memcpy(&expected, &mPlain[i], 4);
        std::memcpy(&actual, &mPixels[i], 4);
        if (std::memcmp(&expected, &actual, 4) != 0 && !(std::isnan(expected) && std::isnan(actual))) {
          char text[100];
          std::snprintf(text, sizeof text, ": %a, with the other padding or in plain code %a", actual, expected);
          return "wrong bits at " + mDestination.PlaceOfPixelByte(i) + text;
        }
      } else if (mPlain[i] != mPixels[i]) {
        return "wrong bits at " + mDestination.PlaceOfPixelByte(i) + ": " + std::to_string(mPixels[i]) +
               ", with the other padding or in plain code " + std::to_string(mPlain[i]);
      }
      i += isFloat ? 4 : 1;
    }
    return {};
  }

  std::array<std::unique_ptr<ArmedBuffer>, kMostSources> mSources;
  ArmedBuffer mDestination{ArmedBuffer::Access::ReadWrite};
  ArenaFrame mFrames[kMostSources];
  std::vector<uint8_t> mPlain, mPixels;

  const ArenaCase* mCase = nullptr;
  KernelVariant mActive{}, mVariant{};
  Guard mGuard{};
  Contents mContents{};
};

// What runs when there is no arena case.
const std::string* gCallName = nullptr;

void ReportFault(int, siginfo_t* info, void* context) {
  // Nothing here is safe in a signal handler by the book; the fault came from a kernel, not from the heap's own code.
  const bool write = (static_cast<ucontext_t*>(context)->uc_mcontext.gregs[REG_ERR] & 2) != 0;
  const auto* address = static_cast<const uint8_t*>(info->si_addr);
  const std::string text =
      "Arena: " +
      (gCallName ? *gCallName + ": touched an unreadable buffer" : Arena::Instance().DescribeFault(address, write)) +
      "\n";
  if (::write(STDERR_FILENO, text.data(), text.size()) < 0) _exit(2);
  abort();  // what fuzzers and debuggers look for
}

}  // namespace

std::vector<int> Range(int first, int last) {
  std::vector<int> values(static_cast<size_t>(last - first + 1));
  std::iota(values.begin(), values.end(), first);
  return values;
}

::testing::AssertionResult RunArena(const ArenaCase& arenaCase) { return Arena::Instance().Run(arenaCase); }

std::function<VX_Result(const ArenaFrame*, const ArenaFrame&)> RunRows(const RowKernelSet& kernel) {
  return [&kernel](const ArenaFrame* sources, const ArenaFrame& destination) {
    const FpModeGuard guard;
    const RowKernel convert = kernel[ActiveKernelVariant()];
    for (int row = 0; row < destination.height; ++row)
      convert(sources[0].Row(row), destination.Row(row), static_cast<size_t>(destination.width));
    return VX_Success;
  };
}

void* UnreadableMemory() {
  static uint8_t* const middle = ReserveAddresses(size_t{1} << 36) + (size_t{1} << 35);
  return middle;
}

void ExpectRefusal(const std::string& what, VX_Result expected, const std::function<VX_Result(void* memory)>& call) {
  const FaultReporter reporter;
  gCallName = &what;
  const VX_Result result = call(UnreadableMemory());
  gCallName = nullptr;
  EXPECT_EQ(result, expected) << what;
}

ArenaFrame GiantStrideFrame(VX_PixelFormat format, int32_t width, int32_t height, int32_t rowBytes) {
  constexpr size_t kBytes = size_t{1} << 36, kPage = 4096;
  static uint8_t* const reserved = ReserveAddresses(kBytes);
  static std::vector<std::pair<uint8_t*, size_t>> mapped;
  for (const auto& [begin, bytes] : mapped) {
    madvise(begin, bytes, MADV_DONTNEED);
    mprotect(begin, bytes, PROT_NONE);
  }
  mapped.clear();
  const ArenaFrame frame = {reserved + kBytes / 2, rowBytes, format, width, height};
  const auto extent = static_cast<uintptr_t>(UnpaddedRowBytes(format, width));
  for (int row = 0; row < height; ++row) {
    const auto first = reinterpret_cast<uintptr_t>(frame.Row(row));
    const uintptr_t begin = first & ~(kPage - 1), end = (first + extent + kPage - 1) & ~(kPage - 1);
    mapped.emplace_back(reinterpret_cast<uint8_t*>(begin), end - begin);
    mprotect(mapped.back().first, end - begin, PROT_READ | PROT_WRITE);
  }
  return frame;
}

}  // namespace vexel::testing
