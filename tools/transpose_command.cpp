// vexel transpose and vexel rotate: pictures turned without touching a pixel's bits.
#include <memory>
#include <string>

#include "commands.h"
#include "format_catalogue.h"
#include "picture_io.h"
#include "run_options.h"
#include "tool_error.h"

namespace tool {
namespace {

struct TurnOptions {
  std::string in, out;
  int angle = 0;
  bool flip = false;
  RunOptions run;
};

bool HasFourChannels(VX_PixelFormat format) {
  constexpr uint32_t kAlphaKind = 0xC, kLayout = 0x30;
  return IsRaster(format) && (Bits(format) & kLayout) == 0 && (Bits(format) & kAlphaKind) != 0 && !Is10Bit(format);
}

// As the file holds it if its pixels can be moved one by one.
Picture LoadFourChannels(const std::string& path) {
  Picture picture = LoadPicture(path);
  if (HasFourChannels(picture.Format())) return picture;
  const bool isDeep = !Is8Bit(picture.Format());
  return ConvertPicture(picture, isDeep ? VX_PixelFormat::BGRX_4444_32f : VX_PixelFormat::BGRX_4444_8u, {});
}

void Check(VX_Result result) { CheckResult(result, "cannot turn the picture"); }

// Mirrors what is seen, so both pictures are walked from their top rows.
void RunTranspose(const TurnOptions& options) {
  const Picture source = LoadFourChannels(options.in);
  const Picture turned(source.Format(), source.Height(), source.Width());
  const auto stride = [](const Picture& picture) {
    return picture.IsBottomUp() ? -picture.RowBytes() : picture.RowBytes();
  };
  const auto pixelBytes = static_cast<uint8_t>(TightRowBytes(source.Format(), 1));
  Check(VX_Transpose(source.Row(0), stride(source), turned.Row(0), stride(turned), source.Width(), source.Height(),
                     pixelBytes));
  SavePicture(turned, options.out);
}

// The library turns stored rows: clockwise where the bottom row comes first, the other way round elsewhere.
void RunRotate(const TurnOptions& options) {
  const Picture source = LoadFourChannels(options.in);
  const bool isSideways = options.angle % 180 != 0;
  const Picture turned(source.Format(), isSideways ? source.Height() : source.Width(),
                       isSideways ? source.Width() : source.Height());
  Check(VX_RotateImageAndFlip(source.Pixels(), source.RowBytes(), turned.Pixels(), turned.RowBytes(), source.Width(),
                              source.Height(), source.Format(), source.IsBottomUp() ? options.angle : -options.angle,
                              options.flip));
  SavePicture(turned, options.out);
}

CLI::App* AddTurn(CLI::App& app, const char* name, const char* help, const std::shared_ptr<TurnOptions>& options,
                  void (*run)(const TurnOptions&)) {
  CLI::App* command = app.add_subcommand(name, help);
  command->add_option("in", options->in, "A picture or video, of which the first frame is taken")->required();
  command->add_option("out", options->out, "The picture to write")->required();
  options->run.AddTo(*command);
  command->callback([options, run] {
    options->run.Apply();
    run(*options);
  });
  return command;
}

}  // namespace

void AddTransposeCommand(CLI::App& app) {
  AddTurn(app, "transpose", "Mirror a picture about the diagonal from its top left", std::make_shared<TurnOptions>(),
          RunTranspose);
}

void AddRotateCommand(CLI::App& app) {
  const auto options = std::make_shared<TurnOptions>();
  CLI::App* command = AddTurn(app, "rotate", "Rotate a picture by quarter turns", options, RunRotate);
  command->add_option("--angle", options->angle, "Degrees clockwise")
      ->required()
      ->check(CLI::IsMember({-270, -180, -90, 0, 90, 180, 270}));
  command->add_flag("--flip", options->flip, "Turn the picture upside down first");
}

}  // namespace tool
