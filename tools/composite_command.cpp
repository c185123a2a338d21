// vexel composite and vexel blend-sheet: one picture over another.
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "blend.h"
#include "canvas.h"
#include "commands.h"
#include "convert_picture.h"
#include "picture_io.h"
#include "run_options.h"
#include "tool_error.h"
#include "unit_range.h"

namespace tool {
namespace {

constexpr int kTileWidth = 240, kMargin = 12, kLabelHeight = 30, kColumns = 6;

struct CompositeOptions {
  std::string back, front, out, mode = "Normal";
  std::vector<int> offset = {0, 0};
  BlendOptions blend;
  RunOptions run;
};

// ---- The sheet

struct Tile {
  std::string name, note;
  Picture picture;
};

// What belongs together: the plain ones, those that darken, lighten, raise contrast, compare, and recolour.
constexpr VX_BlendMode kSheetOrder[] = {
    VX_BlendMode::Normal,      VX_BlendMode::Dissolve,   VX_BlendMode::Darken,      VX_BlendMode::Multiply,
    VX_BlendMode::ColorBurn,   VX_BlendMode::LinearBurn, VX_BlendMode::DarkerColor, VX_BlendMode::Lighten,
    VX_BlendMode::Screen,      VX_BlendMode::ColorDodge, VX_BlendMode::LinearDodge, VX_BlendMode::LighterColor,
    VX_BlendMode::Overlay,     VX_BlendMode::SoftLight,  VX_BlendMode::HardLight,   VX_BlendMode::VividLight,
    VX_BlendMode::LinearLight, VX_BlendMode::PinLight,   VX_BlendMode::HardMix,     VX_BlendMode::Difference,
    VX_BlendMode::Exclusion,   VX_BlendMode::Subtract,   VX_BlendMode::Divide,      VX_BlendMode::Hue,
    VX_BlendMode::Saturation,  VX_BlendMode::Color,      VX_BlendMode::Luminosity};

// As it looks over black.
Picture Seen(const Picture& picture) { return ConvertPicture(picture, VX_PixelFormat::BGRX_4444_8u, {}); }

// A picture of nothing but `front`, of the back's size.
Picture FrontAlone(const Picture& back, const Picture& front, const BlendOptions& options) {
  Picture empty(VX_PixelFormat::BGRA_4444_8u, back.Width(), back.Height());
  std::fill_n(empty.Pixels(), empty.Size(), std::byte{0});
  BlendOptions normal = options;
  normal.mode = VX_BlendMode::Normal;
  return BlendPictures(empty, front, normal);
}

std::vector<Tile> DrawTiles(const Picture& back, const Picture& front, BlendOptions options) {
  std::vector<Tile> tiles;
  tiles.push_back({"the back", "", Seen(back)});
  tiles.push_back({"the front", "over black", Seen(FrontAlone(back, front, options))});
  for (const VX_BlendMode mode : kSheetOrder) {
    options.mode = mode;
    const auto number = static_cast<size_t>(mode);
    tiles.push_back({BlendModes()[number].name, std::to_string(number), Seen(BlendPictures(back, front, options))});
  }
  return tiles;
}

Canvas DrawBlendSheet(const std::vector<Tile>& tiles) {
  const Font large(16), small(13);
  const Picture& first = tiles.front().picture;
  const int factor = std::max(1, (first.Width() + kTileWidth - 1) / kTileWidth);
  const int width = std::max(1, first.Width() / factor), height = std::max(1, first.Height() / factor);
  const int stepX = std::max(width, kTileWidth) + kMargin, stepY = kLabelHeight + height + kMargin;
  const int rows = (static_cast<int>(tiles.size()) + kColumns - 1) / kColumns;
  Canvas canvas(kMargin + kColumns * stepX, kMargin + rows * stepY, kPaper);
  for (size_t i = 0; i < tiles.size(); ++i) {
    const int x = kMargin + static_cast<int>(i % kColumns) * stepX, y = static_cast<int>(i / kColumns) * stepY;
    const int end = large.Draw(canvas, x, y + kLabelHeight + 4, tiles[i].name, kInk);
    small.Draw(canvas, end + 8, y + kLabelHeight + 4, tiles[i].note, kFaintInk);
    canvas.Fill(x - 1, y + kLabelHeight + kMargin - 1, width + 2, height + 2, kFrame);
    canvas.Draw(tiles[i].picture, x, y + kLabelHeight + kMargin, factor);
  }
  return canvas;
}

// ---- Commands

void RunComposite(const CompositeOptions& options) {
  BlendOptions blend = options.blend;
  blend.mode = ParseBlendMode(options.mode);
  SavePicture(BlendPictures(LoadPicture(options.back), LoadPicture(options.front), blend), options.out);
}

void RunBlendSheet(const CompositeOptions& options) {
  const Picture back = LoadPicture(options.back), front = LoadPicture(options.front);
  SavePicture(DrawBlendSheet(DrawTiles(back, front, options.blend)).Result(), options.out);
}

CLI::App* AddBlend(CLI::App& app, const char* name, const char* help, void (*run)(const CompositeOptions&),
                   const std::shared_ptr<CompositeOptions>& options) {
  CLI::App* command = app.add_subcommand(name, help);
  command->add_option("back", options->back, "The picture below; of a video, the first frame")->required();
  command->add_option("front", options->front, "The picture above, of any size")->required();
  command->add_option("out", options->out, "The picture to write, as large as the back")->required();
  command->add_option("--opacity", options->blend.opacity, "0 to 1, multiplies the alpha of the front (default 1)")
      ->check(FromZeroToOne());
  command->add_option("--offset", options->offset, "X,Y of the front's top left corner on the back (default 0,0)")
      ->delimiter(',')
      ->expected(2);
  options->run.AddTo(*command);
  command->callback([options, run] {
    options->blend.x = options->offset[0];
    options->blend.y = options->offset[1];
    options->run.Apply();
    run(*options);
  });
  return command;
}

}  // namespace

void AddCompositeCommand(CLI::App& app) {
  const auto options = std::make_shared<CompositeOptions>();
  CLI::App* command =
      AddBlend(app, "composite", "Lay one picture over another, through a blend mode", RunComposite, options);
  std::string names;
  for (const BlendModeEntry& entry : BlendModes()) names += (names.empty() ? "" : ", ") + std::string(entry.name);
  command->add_option("--mode", options->mode, names + " (default Normal), or its number");
}

void AddBlendSheetCommand(CLI::App& app) {
  AddBlend(app, "blend-sheet", "Draw one picture over another in every blend mode", RunBlendSheet,
           std::make_shared<CompositeOptions>());
}

}  // namespace tool
