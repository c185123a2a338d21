// A frame is 10 or 12 sequences of 150 blocks of 80 bytes: a header, two of subcode, three of video auxiliary data,
// then nine times one of audio and fifteen of video. Every block begins with three bytes that say what and where it is.
// No pixel of a black frame differs from another, so all video blocks are alike but for these, and no macroblock spills
// over into its neighbours.
#include "composite/DvBlackFrames.h"

#include <cstring>

namespace vexel {
namespace {

constexpr size_t kBlockBytes = 80, kIdBytes = 3, kPackBytes = 5;
constexpr int kSubcodeBlocks = 2, kVauxBlocks = 3, kAudioBlocks = 9, kVideoBlocksPerAudio = 15;

// Section type in the upper three bits, the rest as recorders write it.
enum Section : uint8_t { kHeader = 0x1F, kSubcode = 0x3F, kVaux = 0x56, kAudio = 0x76, kVideo = 0x96 };

constexpr uint8_t kNoInfo = 0xFF;
constexpr uint8_t kAudioSource = 0x50, kAudioControl = 0x51, kVideoSource = 0x60, kVideoControl = 0x61;

class FrameWriter {
 public:
  FrameWriter(DvSystem system, uint8_t* frame) noexcept : mSystem(system), mNext(frame) {}

  void Write() noexcept {
    for (mSequence = 0; mSequence < SequenceCount(); ++mSequence) {
      WriteHeader();
      for (int i = 0; i < kSubcodeBlocks; ++i) WriteSubcode(i);
      for (int i = 0; i < kVauxBlocks; ++i) WriteVaux(i);
      for (int i = 0; i < kAudioBlocks; ++i) {
        WriteAudio(i);
        for (int j = 0; j < kVideoBlocksPerAudio; ++j) WriteVideo(i * kVideoBlocksPerAudio + j);
      }
    }
  }

 private:
  bool Is625() const noexcept { return mSystem == DvSystem::Lines625; }
  int SequenceCount() const noexcept { return Is625() ? 12 : 10; }
  bool IsFirstHalf() const noexcept { return mSequence < SequenceCount() / 2; }
  // Bit 5 where a pack says 50 or 60 fields.
  uint8_t FieldBit() const noexcept { return Is625() ? 0x20 : 0; }

  // Returns the data of the next block, all of it "no information".
  uint8_t* Begin(Section section, int number) noexcept {
    uint8_t* const block = mNext;
    mNext += kBlockBytes;
    std::memset(block, kNoInfo, kBlockBytes);
    block[0] = section;
    block[1] = static_cast<uint8_t>(mSequence << 4 | 0x7);
    block[2] = static_cast<uint8_t>(number);
    return block + kIdBytes;
  }

  static void PutPack(uint8_t* to, const uint8_t (&pack)[kPackBytes]) noexcept { std::memcpy(to, pack, kPackBytes); }

  // The system, and all sections valid by IEC 61834.
  void WriteHeader() noexcept {
    PutPack(Begin(kHeader, 0), {static_cast<uint8_t>(Is625() ? 0xBF : 0x3F), 0x78, 0x78, 0x78, 0x78});
  }

  // Six sync blocks without time code or track numbers.
  void WriteSubcode(int number) noexcept {
    constexpr int kSyncBlocks = 6, kSyncBytes = 8;
    uint8_t* const data = Begin(kSubcode, number);
    for (int i = 0; i < kSyncBlocks; ++i) {
      data[i * kSyncBytes] = IsFirstHalf() ? 0x8F : 0x0F;
      data[i * kSyncBytes + 1] = static_cast<uint8_t>(0xF0 | (number * kSyncBlocks + i));
    }
  }

  // The two packs that must be there lie in the last block of even sequences and in the first of odd ones.
  void WriteVaux(int number) noexcept {
    uint8_t* const data = Begin(kVaux, number);
    const bool odd = mSequence % 2 != 0;
    if (number != (odd ? 0 : 2)) return;
    uint8_t* const packs = data + (odd ? 0 : 9 * kPackBytes);
    PutPack(packs, {kVideoSource, kNoInfo, kNoInfo, static_cast<uint8_t>(0xC0 | FieldBit()), kNoInfo});
    // Copying is free; an original, 4:3; interlaced frames, each unlike the one before.
    PutPack(packs + kPackBytes, {kVideoControl, 0x3F, 0xC8, 0xFC, kNoInfo});
  }

  // One channel per half of the frame, 16 bits at 48 kHz: 1,602 samples, or 1,920 in step with the picture.
  void WriteAudio(int number) noexcept {
    uint8_t* const data = Begin(kAudio, number);
    const int pack = number - (mSequence % 2 != 0 ? 0 : 3);
    const auto size = static_cast<uint8_t>(Is625() ? 0x40 | (1920 - 1896) : 0xC0 | (1602 - 1580));
    if (pack == 0)
      PutPack(data, {kAudioSource, size, static_cast<uint8_t>(IsFirstHalf() ? 0 : 1),
                     static_cast<uint8_t>(0xC0 | FieldBit()), 0xC0});
    if (pack == 1) PutPack(data, {kAudioControl, 0x3F, 0xCF, kNoInfo, kNoInfo});
    std::memset(data + kPackBytes, 0, kBlockBytes - kIdBytes - kPackBytes);
  }

  // Four luma and two chroma blocks of 8 x 8, each nine bits of mean (twice the code's distance from 128), three of
  // mode and class, and the end of block, 0110.
  void WriteVideo(int number) noexcept {
    constexpr size_t kLumaBytes = 14, kChromaBytes = 10;
    constexpr uint32_t kEnd = 0x6, kBlack = ((2 * (16 - 128)) & 0x1FF) << 7 | kEnd, kGrey = kEnd;
    uint8_t* data = Begin(kVideo, number);
    *data++ = 0x0F;  // no error, finest quantiser
    for (int i = 0; i < 6; ++i) {
      const uint32_t bits = i < 4 ? kBlack : kGrey;
      data[0] = static_cast<uint8_t>(bits >> 8);
      data[1] = static_cast<uint8_t>(bits);
      data += i < 4 ? kLumaBytes : kChromaBytes;
    }
  }

  const DvSystem mSystem;
  uint8_t* mNext;
  int mSequence = 0;
};

}  // namespace

void WriteDvBlackFrame(DvSystem system, uint8_t* frame) noexcept { FrameWriter(system, frame).Write(); }

}  // namespace vexel
