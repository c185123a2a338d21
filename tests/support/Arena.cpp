#include "support/Arena.h"

#include <signal.h>
#include <sys/mman.h>
#include <ucontext.h>
#include <unistd.h>
#include <xmmintrin.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <memory>
#include <numeric>

#include "formats/FormatBits.h"
#include "frame/FpModeGuard.h"
#include "support/ArenaMemory.h"
#include "support/Formats.h"

namespace vexel::testing {
namespace {

constexpr int kMostSources = 4;
// What a thread starts with: round to nearest, no flush to zero, all exceptions masked.
constexpr uint32_t kCallerMode = 0x1F80;
constexpr uint8_t kFirstPadding = 0x5A, kSecondPadding = 0xA5;

const char* GuardName(Guard guard) {
  static constexpr const char* kNames[] = {"Behind", "Before", "Shifted", "Packed"};
  return kNames[static_cast<int>(guard)];
}

const char* ContentsName(Contents contents) {
  static constexpr const char* kNames[] = {"Random",     "Extremes",  "Zeros",      "Maximum",
                                           "ClearAlpha", "TinyAlpha", "OpaqueAlpha"};
  return kNames[static_cast<int>(contents)];
}

class Arena {
 public:
  static Arena& Instance() {
    static Arena arena;
    return arena;
  }

  ::testing::AssertionResult Run(const ArenaCase& arenaCase);

  // The case that is running, for failures and faults.
  std::string Describe() const;
  std::string DescribeFault(const uint8_t* address, bool write) const;

 private:
  Arena() {
    for (auto& source : mSources) source = std::make_unique<ArmedBuffer>(ArmedBuffer::Access::ReadOnly);
  }
  void Place(ArenaSize size, Guard guard, Random& random);
  std::string Compare(Contents contents, uint64_t seed);
  std::string RunOnce(KernelVariant variant, Contents contents, uint64_t seed, uint8_t padding);
  std::string FirstDifference() const;

  std::array<std::unique_ptr<ArmedBuffer>, kMostSources> mSources;
  ArmedBuffer mDestination{ArmedBuffer::Access::ReadWrite};
  ArenaFrame mFrames[kMostSources];
  std::vector<uint8_t> mPlain, mPixels;

  const ArenaCase* mCase = nullptr;
  KernelVariant mActive{}, mVariant{};
  Guard mGuard{};
  Contents mContents{};
};

// ---- Faults

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

std::string Arena::Describe() const {
  const ArenaFrame& dst = mDestination.Frame();
  std::string text = mCase->name + ": ";
  for (size_t i = 0; i < mCase->sources.size(); ++i) {
    const ArenaFrame& src = mFrames[i];
    text += FormatName(src.format) + " " + std::to_string(src.width) + "x" + std::to_string(src.height) +
            " (row bytes " + std::to_string(src.rowBytes) + ") ";
  }
  return text + "-> " + FormatName(dst.format) + " " + std::to_string(dst.width) + "x" + std::to_string(dst.height) +
         " (row bytes " + std::to_string(dst.rowBytes) + "), " + GuardName(mGuard) + ", " + ContentsName(mContents) +
         ", " + KernelVariantName(mVariant);
}

std::string Arena::DescribeFault(const uint8_t* address, bool write) const {
  if (!mCase) return "fault outside any case";
  std::string place = "at an address outside the arena";
  if (mDestination.Holds(address)) place = "of the destination, " + mDestination.PlaceOf(address);
  for (size_t i = 0; i < mCase->sources.size(); ++i)
    if (mSources[i]->Holds(address)) place = "of source " + std::to_string(i) + ", " + mSources[i]->PlaceOf(address);
  return Describe() + ": illegal " + (write ? "write " : "read ") + place;
}

// ---- Running

void Arena::Place(ArenaSize size, Guard guard, Random& random) {
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

std::string Arena::RunOnce(KernelVariant variant, Contents contents, uint64_t seed, uint8_t padding) {
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
std::string Arena::Compare(Contents contents, uint64_t seed) {
  mContents = contents;
  for (size_t i = 0; i < mCase->sources.size(); ++i) mSources[i]->FillPixels(contents, seed + i);
  if (std::string wrong = RunOnce(KernelVariant::Plain, contents, seed, kFirstPadding); !wrong.empty()) return wrong;
  if (mCase->expected == VX_Success) mPlain = mPixels;
  if (std::string wrong = RunOnce(mActive, contents, seed, kSecondPadding); !wrong.empty()) return wrong;
  return mCase->expected == VX_Success ? FirstDifference() : std::string();
}

// NaNs are alike whatever their sign and payload: which operand's survive is the compiler's choice in plain code.
std::string Arena::FirstDifference() const {
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

::testing::AssertionResult Arena::Run(const ArenaCase& arenaCase) {
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
