// vexel color: pictures and video between colour spaces, computed in float; and plots of the spaces.
#include <iostream>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "color_plot.h"
#include "color_spaces.h"
#include "commands.h"
#include "convert_picture.h"
#include "format_catalogue.h"
#include "frame_sink.h"
#include "frame_source.h"
#include "parallel.h"
#include "run_options.h"
#include "tool_error.h"

namespace tool {
namespace {

constexpr VX_PixelFormat kSignal = VX_PixelFormat::BGRA_4444_32f;

struct ColorCommand {
  std::string in, out, from, to, tone, matrix, rawFormat, size, plot;
  bool compressGamut = false;
  RunOptions run;
};

struct Tone {
  float a, b, c;
};

std::optional<Tone> ParseTone(const std::string& text) {
  if (text.empty()) return std::nullopt;
  std::istringstream in(text);
  Tone tone{};
  char comma1 = 0, comma2 = 0;
  in >> tone.a >> comma1 >> tone.b >> comma2 >> tone.c;
  const bool isRead = in && comma1 == ',' && comma2 == ',' && in.peek() == std::char_traits<char>::eof();
  if (!isRead || !(tone.a > 0 && tone.c > 0 && tone.c < 1 && tone.b > tone.c))
    throw ToolError("\"" + text +
                    "\" is no tone curve; write A,B,C with A > 0, 0 < C < 1 and B > C, for instance 1,1.2,0.6");
  return tone;
}

// P010 with the BT.2020 matrix, which the colour spaces decode themselves.
bool IsRec2020TenBit(VX_PixelFormat format) {
  constexpr uint32_t kColorimetry = 0x600, k2020 = 0x400;
  return Is420(format) && Is10Bit(format) && (Bits(format) & kColorimetry) >= k2020;
}

// The luma rows that share chroma row `row`: neighbours, or neighbours within a field.
std::pair<int, int> LumaRowsOf(VX_PixelFormat format, int row) {
  const bool isField = FrameKind(format) % 2 != 0;
  return isField ? std::pair{row / 2 * 4 + row % 2, row / 2 * 4 + row % 2 + 2} : std::pair{2 * row, 2 * row + 1};
}

Picture DecodeP010(const Picture& source, int threads) {
  const VX::Rec2020ColorSpace rec2020;
  Picture signal(kSignal, source.Width(), source.Height());
  const Plane luma = source.PlaneAt(0), chroma = source.PlaneAt(1);
  const size_t rowFloats = 4 * static_cast<size_t>(source.Width());
  ForEach(chroma.height, threads, [&](int row) {
    auto [first, second] = LumaRowsOf(source.Format(), row);
    if (first >= source.Height()) return;
    std::vector<float> spare(second < source.Height() ? 0 : rowFloats);
    const auto codes = [](const Plane& plane, int y) { return reinterpret_cast<const uint16_t*>(plane.Row(y)); };
    const bool isPair = spare.empty();
    rec2020.Convert2RowsFromP010toRGB(codes(luma, first), codes(luma, isPair ? second : first), codes(chroma, row),
                                      reinterpret_cast<float*>(signal.Row(first)),
                                      isPair ? reinterpret_cast<float*>(signal.Row(second)) : spare.data(),
                                      source.Width());
  });
  return signal;
}

class ColorConversion {
 public:
  explicit ColorConversion(const ColorCommand& command)
      : mCommand(command),
        mFrom(ParseColorSpace(command.from)),
        mTo(ParseColorSpace(command.to)),
        mTone(ParseTone(command.tone)) {
    if (mTone && mTo.isHdr)
      throw ToolError(std::string("--tone compresses into standard range; ") + mTo.name + " is not");
  }

  void Run() {
    const auto source = OpenSource(
        mCommand.in, ParseSourceOptions(mCommand.rawFormat, mCommand.size, mCommand.matrix, mCommand.run.threads));
    CheckContainer(ContainerOf(mCommand.out));
    SinkOptions sinkOptions;
    sinkOptions.frameRate = source->FrameRate();
    const auto sink = OpenSink(mCommand.out, sinkOptions);
    const int threads = mCommand.run.ThreadCount();
    const ConvertOptions options{3, threads};
    int64_t done = 0;
    std::string format;
    while (const Picture frame = source->Next()) {
      const Picture signal = Convert(frame, options);
      const VX_PixelFormat storage = sink->StorageFormat(FileFormat(frame), frame.Height());
      const Picture stored = ConvertPicture(signal, storage, options);
      sink->Append(stored, sink->Encode(stored));
      format = FormatName(FileFormat(frame));
      ++done;
      if (!sink->TakesManyFrames()) break;
    }
    if (done == 0) throw ToolError("cannot read " + SourceName(mCommand.in) + ": it holds no frame");
    sink->Close();
    std::cerr << SinkName(mCommand.out) << ": " << done << (done == 1 ? " frame, " : " frames, ") << format << ", "
              << mFrom.name << " to " << mTo.name << '\n';
  }

 private:
  void CheckContainer(Container container) const {
    if (container == Container::Jpeg && mTo.isHdr)
      throw ToolError(std::string("a JPEG holds 8 bits, too few for ") + mTo.name + "; write png, tiff, dpx or y4m");
    const std::string name = mTo.name;
    if (container == Container::Exr && name != "rec709" && name != "rec2020")
      std::cerr << "vexel: note: an EXR holds light, taken from the signal by the power 2.4, which is not the curve of "
                << name << "; --to rec709 or rec2020 writes true light\n";
  }

  // Deep files stay deep; HDR signals need more than 8 bits in any case.
  VX_PixelFormat FileFormat(const Picture& frame) const {
    const bool hasAlpha = HasAlpha(frame.Format());
    if (Is8Bit(frame.Format()) && !mTo.isHdr)
      return hasAlpha ? VX_PixelFormat::BGRA_4444_8u : VX_PixelFormat::BGRX_4444_8u;
    return hasAlpha ? kSignal : VX_PixelFormat::BGRX_4444_32f;
  }

  Picture Convert(const Picture& frame, const ConvertOptions& options) const {
    Picture signal =
        IsRec2020TenBit(frame.Format()) ? DecodeP010(frame, options.threads) : ConvertPicture(frame, kSignal, options);
    ForEach(signal.Height(), options.threads, [&](int y) {
      float* row = reinterpret_cast<float*>(signal.Row(y));
      const int width = signal.Width();
      mFrom.space.ConvertPixelsToRec709(row, row, width, false);
      mTo.space.ConvertPixelsFromRec709(row, row, width, mCommand.compressGamut);
      if (mTone) mTo.space.CompressPixelsToSDR(row, row, width, mTone->a, mTone->b, mTone->c);
    });
    return signal;
  }

  const ColorCommand& mCommand;
  const NamedColorSpace& mFrom;
  const NamedColorSpace& mTo;
  std::optional<Tone> mTone;
};

void RunColor(const ColorCommand& command) {
  command.run.Apply();
  if (!command.plot.empty()) {
    if (!command.in.empty()) throw ToolError("--plot draws the colour spaces themselves and takes no picture");
    PlotColorSpaces(command.plot);
    return;
  }
  if (command.in.empty() || command.out.empty() || command.from.empty() || command.to.empty())
    throw CLI::RequiredError("color needs IN, OUT, --from and --to (or --plot)", CLI::ExitCodes::RequiredError);
  ColorConversion(command).Run();
}

}  // namespace

void AddColorCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("color", "Convert a picture or video to another colour space");
  const auto options = std::make_shared<ColorCommand>();
  command->add_option("in", options->in, "Picture, video or sequence (in_%04d.png); - is standard input");
  command->add_option(
      "out", options->out,
      "Picture, which takes the first frame, sequence (out_%04d.png), .y4m or .raw; - is standard output (raw)");
  command->add_option("--from", options->from, "Colour space of IN: " + ColorSpaceNames());
  command->add_option("--to", options->to, "Colour space of OUT");
  command->add_flag("--compress-gamut", options->compressGamut, "Bring colours outside the gamut of OUT inside");
  command->add_option("--tone", options->tone,
                      "Compress bright tones into standard range by the curve A,B,C (for instance 1,1.2,0.6)");
  command->add_option("--matrix", options->matrix, "Treat YUV input as BT.601, 709 or 2020, whatever the file says");
  command->add_option("--raw-format", options->rawFormat,
                      "IN is raw frames of this pixel format (P010 with HDR is "
                      "YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_10u_as16u_2020_HDR)");
  command->add_option("--size", options->size, "WIDTHxHEIGHT of raw frames");
  command->add_option(
      "--plot", options->plot,
      "Draw transfer curves, primaries and tone curves as transfer.svg, primaries.svg and tone.svg into "
      "this directory");
  options->run.AddTo(*command);
  command->callback([options] { RunColor(*options); });
}

}  // namespace tool
