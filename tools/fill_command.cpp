// vexel fill and vexel dissolve: pictures of one colour, and the mix of two.
#include <algorithm>
#include <cctype>
#include <charconv>
#include <iterator>
#include <memory>
#include <string>

#include "commands.h"
#include "format_catalogue.h"
#include "parse_size.h"
#include "picture_io.h"
#include "run_options.h"
#include "tool_error.h"
#include "unit_range.h"
#include "vexel/compositing.h"

namespace tool {
namespace {

struct FillCommand {
  std::string out, format, size, color, container;
};

using Fill = VX_Result (*)(void*, int32_t, int32_t, int32_t, VX_PixelFormat);
struct NamedFill {
  const char* name;
  Fill fill;
  bool needsAlpha;
};
constexpr NamedFill kFills[] = {{"black", VX_FillWithOpaqueBlack, false},
                                {"white", VX_FillWithOpaqueWhite, false},
                                {"transparent-black", VX_FillWithTransparentBlack, true},
                                {"transparent-white", VX_FillWithTransparentWhite, true}};

bool IsDv(VX_PixelFormat format) { return FrameKind(format) >= 1 && FrameKind(format) <= 8; }
bool HasFourChannels(VX_PixelFormat format) { return IsRaster(format) && !IsPacked422(format) && !Is10Bit(format); }

struct Bgra {
  uint8_t bytes[4];
};

// #RRGGBB or #RRGGBBAA.
Bgra ParseColor(const std::string& text) {
  const auto isHex = [](unsigned char c) { return std::isxdigit(c) != 0; };
  if ((text.size() != 7 && text.size() != 9) || text[0] != '#' || !std::all_of(text.begin() + 1, text.end(), isHex))
    throw ToolError("\"" + text +
                    "\" is not a colour; write black, white, transparent-black, transparent-white, #RRGGBB or "
                    "#RRGGBBAA");
  Bgra color{{0, 0, 0, 255}};
  constexpr int kPlaces[] = {2, 1, 0, 3};
  for (size_t i = 0; 2 * i + 1 < text.size(); ++i)
    std::from_chars(&text[2 * i + 1], &text[2 * i + 3], color.bytes[kPlaces[i]], 16);
  return color;
}

void FillPicture(const Picture& picture, const std::string& color) {
  const std::string format = FormatName(picture.Format());
  if (IsDv(picture.Format()) && color != "black" && color != "white")
    throw ToolError(format + (FrameKind(picture.Format()) <= 2 ? " takes black only" : " has no encoder"));
  VX_Result result;
  const NamedFill* const named =
      std::find_if(std::begin(kFills), std::end(kFills), [&](const NamedFill& f) { return color == f.name; });
  if (named != std::end(kFills)) {
    if (named->needsAlpha && !(IsRaster(picture.Format()) && HasAlpha(picture.Format())))
      throw ToolError(format + " has no alpha to make transparent; --color " + std::string(color).substr(12) +
                      " fills it");
    result = named->fill(picture.Pixels(), picture.RowBytes(), picture.Width(), picture.Height(), picture.Format());
  } else {
    const Bgra bgra = ParseColor(color);
    if (!HasFourChannels(picture.Format()))
      throw ToolError("only formats of four channels take any colour; " + format + " takes black and white");
    result = VX_FillWithColor(picture.Pixels(), picture.RowBytes(), picture.Width(), picture.Height(), picture.Format(),
                              bgra.bytes, VX_PixelFormat::BGRA_4444_8u);
  }
  CheckResult(result, "cannot fill " + format + " with " + color,
              result == VX_ErrFormatNotHandled ? "; there is no encoder for that" : "");
}

// As asked for; a DV frame is as large as its standard says, and only those of 25 Mbit/s have an encoder.
std::pair<int, int> SizeOf(VX_PixelFormat format, const std::string& size) {
  if (IsDv(format)) {
    if (!size.empty()) throw ToolError(FormatName(format) + " has a size of its own; leave --size out");
    return {720, format == VX_PixelFormat::PALDV25 ? 576 : 480};
  }
  if (size.empty()) throw ToolError("--size is required: " + FormatName(format) + " has no size of its own");
  return ParseSize(size);
}

void RunFill(const FillCommand& command) {
  const VX_PixelFormat format = ParseFormat(command.format);
  const bool isDv = IsDv(format);
  const std::pair<int, int> size = SizeOf(format, command.size);
  const Picture picture(format, size.first, size.second);
  FillPicture(picture, command.color);
  SinkOptions options;
  options.container = command.container.empty() ? ContainerByExtension(command.out) : ParseContainer(command.container);
  if (isDv && options.container.value_or(Container::Raw) != Container::Raw)
    throw ToolError("\"" + command.out +
                    "\" would hold pictures; a DV frame is a file of its own, for instance out.dv");
  if (isDv) options.container = Container::Raw;
  SavePicture(picture, command.out, {}, options);
}

struct DissolveCommand {
  std::string a, b, out, format;
  float mix = 0;
  int quality = 3;
  RunOptions run;
};

// As the file holds it if the library mixes such pictures.
Picture LoadRaster(const std::string& path) {
  Picture picture = LoadPicture(path);
  if (IsRaster(picture.Format())) return picture;
  return ConvertPicture(picture,
                        Is8Bit(picture.Format()) ? VX_PixelFormat::BGRX_4444_8u : VX_PixelFormat::BGRX_4444_32f, {});
}

void RunDissolve(const DissolveCommand& command) {
  command.run.Apply();
  const Picture a = LoadRaster(command.a), b = LoadRaster(command.b);
  const auto size = [](const Picture& p) { return std::to_string(p.Width()) + "x" + std::to_string(p.Height()); };
  if (a.Width() != b.Width() || a.Height() != b.Height())
    throw ToolError("\"" + command.a + "\" is " + size(a) + " and \"" + command.b + "\" is " + size(b) +
                    "; a dissolve takes pictures of one size");
  const VX_PixelFormat format = command.format.empty() ? a.Format() : ParseFormat(command.format);
  const Picture out(format, a.Width(), a.Height());
  CheckResult(
      VX_CrossDissolve(a.Pixels(), a.RowBytes(), a.Format(), b.Pixels(), b.RowBytes(), b.Format(), out.Pixels(),
                       out.RowBytes(), format, out.Width(), out.Height(), command.mix, command.quality),
      "cannot mix " + FormatName(a.Format()) + " and " + FormatName(b.Format()) + " into " + FormatName(format));
  SavePicture(out, command.out);
}

}  // namespace

void AddFillCommand(CLI::App& app) {
  const auto options = std::make_shared<FillCommand>();
  CLI::App* command = app.add_subcommand("fill", "Write a picture of one colour");
  command->add_option("out", options->out, "Picture, .y4m or .raw; - is standard output (raw); other names for DV")
      ->required();
  command->add_option("--format", options->format, "Pixel format to fill (see \"vexel formats\")")->required();
  command->add_option("--size", options->size, "WIDTHxHEIGHT; DV frames have one of their own");
  command
      ->add_option("--color", options->color,
                   "black, white, transparent-black, transparent-white, #RRGGBB or #RRGGBBAA")
      ->required();
  command->add_option("--container", options->container,
                      std::string("Write ") + ContainerNames() + ", whatever the extension");
  command->callback([options] { RunFill(*options); });
}

void AddDissolveCommand(CLI::App& app) {
  const auto options = std::make_shared<DissolveCommand>();
  CLI::App* command = app.add_subcommand("dissolve", "Mix two pictures of one size");
  command->add_option("a", options->a, "A picture or video, of which the first frame is taken")->required();
  command->add_option("b", options->b, "The same")->required();
  command->add_option("out", options->out, "The picture to write")->required();
  command->add_option("--mix", options->mix, "0 gives A, 1 gives B")->required()->check(FromZeroToOne());
  command->add_option("--format", options->format,
                      "Pixel format of the result (default: A's; 8-bit or float RGB for 4:2:0)");
  command->add_option("--quality", options->quality, "Render quality; 2 mixes in the depth of the result (default 3)")
      ->check(CLI::Range(0, 5));
  options->run.AddTo(*command);
  command->callback([options] { RunDissolve(*options); });
}

}  // namespace tool
