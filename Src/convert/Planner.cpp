#include "convert/Planner.h"

#include <algorithm>
#include <atomic>
#include <iterator>

#include "convert/RgbKernels.h"
#include "convert/YuvKernels.h"
#include "formats/FormatBits.h"
#include "frame/Features.h"
#include "frame/KernelVariant.h"

namespace vexel {
namespace {

using F = VX_PixelFormat;

constexpr int kMaxNodes = 56, kMaxEdges = 320;
constexpr int kRasterCodes = 0x2000;  // every raster format's value lies below
constexpr uint8_t kNoNode = 0xFF;

// The graph with formats as small numbers.
struct Graph {
  Graph() noexcept {
    std::fill(std::begin(nodeOf), std::end(nodeOf), kNoNode);
    for (const Step& step : AllSteps()) {
      NodeFor(step.from);
      NodeFor(step.to);
    }
    const auto steps = AllSteps();
    for (size_t i = 0; i < steps.size(); ++i) {
      const int node = nodeOf[Bits(steps[i].from)];
      if (firstStep[node] == endStep[node]) firstStep[node] = static_cast<uint16_t>(i);
      endStep[node] = static_cast<uint16_t>(i + 1);
      toNode[i] = nodeOf[Bits(steps[i].to)];
    }
  }
  void NodeFor(F format) noexcept {
    if (nodeOf[Bits(format)] != kNoNode) return;
    nodeOf[Bits(format)] = static_cast<uint8_t>(nodeCount);
    formats[nodeCount++] = format;
  }
  int Find(F format) const noexcept { return Bits(format) < kRasterCodes ? nodeOf[Bits(format)] : kNoNode; }
  // The step between two neighbours.
  const Step* FindStep(int from, int to) const noexcept {
    int i = firstStep[from];
    while (toNode[i] != to) ++i;
    return &AllSteps()[i];
  }

  int nodeCount = 0;
  F formats[kMaxNodes] = {};
  uint16_t firstStep[kMaxNodes] = {}, endStep[kMaxNodes] = {};
  uint8_t toNode[kMaxEdges] = {};
  uint8_t nodeOf[kRasterCodes];
};

const Graph& TheGraph() noexcept {
  static const Graph graph;
  return graph;
}

// Chains that are fixed because callers compare against them: through premultiplied first, as the alpha kinds are
// resolved before depth and light.
struct FixedChain {
  int length;
  F formats[kMaxSteps + 1];
  bool onlyWithoutSse2 = false;
};
constexpr FixedChain kFixedChains[] = {
    {8,
     {F::XRGB_4444_8u, F::PRGB_4444_8u, F::BGRP_4444_8u, F::BGRP_4444_32f, F::BGRA_4444_32f, F::BGRA_4444_32f_Linear,
      F::ARGB_4444_32f_Linear, F::PRGB_4444_32f_Linear}},
    {4, {F::VUYA_4444_8u, F::VUYA_4444_32f, F::VUYP_4444_32f, F::VUYX_4444_32f}},
    {3, {F::VUYX_4444_8u, F::VUYA_4444_8u, F::BGRA_4444_8u}, true},
    {3, {F::VUYX_4444_8u_709, F::VUYA_4444_8u_709, F::BGRA_4444_8u}, true},
};

constexpr int BitsOfDepth(F format) noexcept {
  switch (Depth(format)) {
    case kDepth8u:
      return 8;
    case kDepth10u:
      return 10;
    case kDepth15u:
      return 15;
    default:
      return 32;
  }
}
constexpr bool IsSubsampled(F format) noexcept {
  return Layout(format) == kLayout422 || (IsYuv(format) && AlphaKind(format) == kAlphaNone);
}

// What a walk from one end to the other pays for a step.
class Price {
 public:
  Price(F src, F dst) noexcept
      : mDst(dst),
        mLeastDepth(std::min(BitsOfDepth(src), BitsOfDepth(dst))),
        mKeepsAlpha(HasAlpha(src) && HasAlpha(dst)),
        mKeepsStraight(AlphaKind(src) == kAlphaStraight && AlphaKind(dst) == kAlphaStraight),
        mKeepsChroma(!IsSubsampled(src) && !IsSubsampled(dst)),
        mPrecise(std::max(BitsOfDepth(src), BitsOfDepth(dst)) > 8) {}

  uint32_t Of(const Step& step) const noexcept {
    const uint32_t rounds = step.loss == StepLoss::Rounds;
    const uint32_t cost = Depth(step.to) == kDepth32f ? 3 : Depth(step.to) == kDepth15u ? 2 : 1;
    const uint32_t alphaInYuv = IsYuv(step.from) && IsYuv(step.to) && HasAlpha(step.from) && HasAlpha(step.to) &&
                                AlphaKind(step.from) != AlphaKind(step.to);
    uint32_t price = kStep + (mPrecise ? kPreciseRounding : kRounding) * rounds + cost + 2 * alphaInYuv;
    if (!mPrecise && Depth(step.to) != kDepth8u) price += kDetour;
    if (step.to != mDst) price += kLoss * Losses(step.to);
    return price;
  }

 private:
  // Each rank exceeds what eight steps can gather of the ranks below it.
  static constexpr uint32_t kRounding = 64, kDetour = kRounding * 8 + 64, kStep = kDetour * 9,
                            kPreciseRounding = kStep * 9, kLoss = kPreciseRounding * 9;

  uint32_t Losses(F through) const noexcept {
    return (BitsOfDepth(through) < mLeastDepth) + (mKeepsAlpha && !HasAlpha(through)) +
           (mKeepsStraight && AlphaKind(through) != kAlphaStraight) + (mKeepsChroma && IsSubsampled(through));
  }

  F mDst;
  int mLeastDepth;
  bool mKeepsAlpha, mKeepsStraight, mKeepsChroma, mPrecise;
};

// A remembered chain: bits 0-3 its steps (15: no chain), then six bits for each node after the source.
constexpr uint64_t kUnknown = 0, kNoChain = 15;
constexpr int kNodeBits = 6;
static_assert(kMaxNodes <= (1 << kNodeBits) && 4 + kMaxSteps * kNodeBits <= 64);

uint64_t Pack(const int* nodes, int steps) noexcept {
  uint64_t packed = static_cast<uint64_t>(steps);
  for (int i = 0; i < steps; ++i) packed |= static_cast<uint64_t>(nodes[i + 1]) << (4 + kNodeBits * i);
  return packed;
}

uint64_t FixedChainFor(const Graph& graph, F src, F dst, bool hasSse2) noexcept {
  for (const FixedChain& chain : kFixedChains) {
    if (chain.onlyWithoutSse2 && hasSse2) continue;
    if (chain.formats[0] != src || chain.formats[chain.length - 1] != dst) continue;
    int nodes[kMaxSteps + 1];
    for (int i = 0; i < chain.length; ++i) nodes[i] = graph.Find(chain.formats[i]);
    return Pack(nodes, chain.length - 1);
  }
  return kUnknown;
}

// The nameless formats inside the walks from `Invalid`; nobody can hold a buffer of them.
constexpr bool IsPairStorage(F format) noexcept {
  return IsYuv(format) && Layout(format) == kLayout4444 && AlphaKind(format) == kAlphaNone;
}

// As a source `Invalid` stands for an 8-bit picture and leads no further than 8-bit Y'CbCr, 4:2:2 and BGR.
bool InvalidReaches(F dst) noexcept {
  return Depth(dst) == kDepth8u && !IsLinear(dst) && (IsYuv(dst) || !IsReversed(dst)) && dst != F::Invalid;
}

// Cheapest walk of at most kMaxSteps steps, by relaxing all steps once per length.
uint64_t FindChain(const Graph& graph, int src, int dst, bool hasSse2) noexcept {
  if (const uint64_t fixed = FixedChainFor(graph, graph.formats[src], graph.formats[dst], hasSse2)) return fixed;
  constexpr uint32_t kFar = UINT32_MAX;
  uint32_t price[kMaxSteps + 1][kMaxNodes];
  uint8_t previous[kMaxSteps + 1][kMaxNodes];
  for (auto& row : price) std::fill(std::begin(row), std::end(row), kFar);
  price[0][src] = 0;
  uint32_t best = kFar;
  int bestLength = 0;
  const Price pricing(graph.formats[src], graph.formats[dst]);
  for (int length = 1; length <= kMaxSteps; ++length) {
    for (int from = 0; from < graph.nodeCount; ++from) {
      if (price[length - 1][from] >= best || from == dst) continue;
      for (int i = graph.firstStep[from]; i < graph.endStep[from]; ++i) {
        const int to = graph.toNode[i];
        const uint32_t total = price[length - 1][from] + pricing.Of(AllSteps()[i]);
        if (total >= price[length][to]) continue;
        price[length][to] = total;
        previous[length][to] = static_cast<uint8_t>(from);
      }
    }
    if (price[length][dst] < best) {
      best = price[length][dst];
      bestLength = length;
    }
  }
  if (bestLength == 0) return kNoChain;
  int nodes[kMaxSteps + 1];
  nodes[bestLength] = dst;
  for (int length = bestLength; length > 0; --length) nodes[length - 1] = previous[length][nodes[length]];
  return Pack(nodes, bestLength);
}

}  // namespace

const RowKernelSet* FusedKernelFor(VX_PixelFormat src, VX_PixelFormat dst) noexcept {
  struct FusedChain {
    F src, dst;
    const RowKernelSet* kernel;
  };
  static constexpr FusedChain kFused[] = {
      {F::BGRA_4444_8u, F::UYVY_422_8u, &kBgra8ToUyvy8_601}, {F::BGRA_4444_8u, F::UYVY_422_8u_709, &kBgra8ToUyvy8_709},
      {F::BGRP_4444_8u, F::UYVY_422_8u, &kBgrx8ToUyvy8_601}, {F::BGRP_4444_8u, F::UYVY_422_8u_709, &kBgrx8ToUyvy8_709},
      {F::BGRX_4444_8u, F::UYVY_422_8u, &kBgrx8ToUyvy8_601}, {F::BGRX_4444_8u, F::UYVY_422_8u_709, &kBgrx8ToUyvy8_709}};
  for (const FusedChain& chain : kFused)
    if (chain.src == src && chain.dst == dst) return chain.kernel;
  return nullptr;
}

const RowKernelSet* CopyKernelFor(VX_PixelFormat format) noexcept {
  if (IsSpecial(format)) return nullptr;
  if (IsV210(format)) return &kCopyV210;
  if (Layout(format) == kLayout422) return Depth(format) == kDepth8u ? &kCopy422_8u : &kCopy422_32f;
  if (Bits(format) == kDepth10u) return &kCopy4;
  if (AlphaKind(format) == kAlphaNone) return nullptr;
  switch (Depth(format)) {
    case kDepth8u:
      return &kCopy4;
    case kDepth15u:
      return &kCopy8;
    default:
      return &kCopy16;
  }
}

VX_Result MakePlan(VX_PixelFormat src, VX_PixelFormat dst, int32_t renderQuality, Plan* plan) noexcept {
  if (IsSpecial(src)) return VX_ErrUnsupportedFormat;
  if (IsSpecial(dst)) return VX_ErrUnsupportedDestinationFormat;
  const Graph& graph = TheGraph();
  const int from = graph.Find(src), to = graph.Find(dst);
  if (from == kNoNode || to == kNoNode || IsPairStorage(src) || IsPairStorage(dst)) return VX_ErrFailed;
  if (from == to) {
    const RowKernelSet* copy = CopyKernelFor(src);
    if (!copy) return VX_ErrFailed;
    plan->steps[0] = {copy, StepSpan::Point, dst};
    plan->stepCount = 1;
    return VX_Success;
  }

  if (src == F::Invalid && !InvalidReaches(dst)) return VX_ErrFailed;

  // Every thread that finds a pair unknown computes the same value, so relaxed stores are enough.
  static std::atomic<uint64_t> chains[2][kMaxNodes * kMaxNodes];
  const bool hasSse2 = gSwitches.sse2 && ActiveKernelVariant() != KernelVariant::Plain;
  std::atomic<uint64_t>& slot = chains[hasSse2][from * kMaxNodes + to];
  uint64_t chain = slot.load(std::memory_order_relaxed);
  if (chain == kUnknown) {
    chain = FindChain(graph, from, to, hasSse2);
    slot.store(chain, std::memory_order_relaxed);
  }
  if (chain == kNoChain) return VX_ErrFailed;
  plan->stepCount = static_cast<int>(chain & 15);
  int current = from;
  for (int i = 0; i < plan->stepCount; ++i) {
    const int next = static_cast<int>(chain >> (4 + kNodeBits * i)) & ((1 << kNodeBits) - 1);
    const Step* step = graph.FindStep(current, next);
    const bool nearest = renderQuality <= 1 && step->kernel == &kUyvy32fToVuyx32f;
    plan->steps[i] = {nearest ? &kUyvy32fToVuyx32fNearest : step->kernel, step->span, step->to};
    current = next;
  }
  return VX_Success;
}

}  // namespace vexel
