// vexel demo: a frame of each file through several ways to 8-bit RGB, on one labelled sheet.
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <memory>

#include "canvas.h"
#include "commands.h"
#include "convert_picture.h"
#include "format_catalogue.h"
#include "picture_io.h"
#include "run_options.h"

namespace tool {
namespace {

constexpr VX_PixelFormat kRgb = VX_PixelFormat::BGRA_4444_8u;
constexpr int kTileWidth = 480, kMargin = 16, kLabelHeight = 52, kTitleHeight = 44, kColumns = 3;
constexpr int kErrorGain = 32;
constexpr int kLeastInset = 90;  // the width of its label

struct DemoOptions {
  std::vector<std::string> files;
  std::string out = "vexel-demo.png";
  RunOptions run;
};

// One way from the source to RGB.
struct Way {
  std::string title;
  std::vector<VX_PixelFormat> stops;  // between the source and RGB
};

std::vector<Way> WaysFor(VX_PixelFormat source) {
  const bool bt601 = IsYuv(source) && (Bits(source) & 0x600) == 0;
  using F = VX_PixelFormat;
  const F uyvy = bt601 ? F::UYVY_422_8u : F::UYVY_422_8u_709, v210 = bt601 ? F::V210_422_10u : F::V210_422_10u_709;
  const F yuv = bt601 ? F::VUYA_4444_32f : F::VUYA_4444_32f_709;
  return {{"direct", {}},
          {"through 8-bit 4:2:2", {uyvy}},
          source == v210 ? Way{"through float YUV", {yuv}} : Way{"through 10-bit 4:2:2", {v210}},
          {"through 15-bit RGB", {F::BGRA_4444_15u}},
          {"through linear float", {F::BGRA_4444_32f_Linear}},
          {"through all of them", {uyvy, v210, F::BGRA_4444_15u, F::BGRA_4444_32f_Linear}}};
}

Picture Travel(const Picture& source, const Way& way, const ConvertOptions& options) {
  std::vector<VX_PixelFormat> stops = way.stops;
  stops.push_back(kRgb);
  Picture at;
  for (const VX_PixelFormat stop : stops) at = ConvertPicture(at ? at : source, stop, options);
  return at;
}

// Seconds of one pass: the best of several, over at least a tenth of a second.
double TimeOf(const Picture& source, const Way& way, const ConvertOptions& options) {
  using Clock = std::chrono::steady_clock;
  double best = 1e9, total = 0;
  while (total < 0.1) {
    const auto start = Clock::now();
    Travel(source, way, options);
    const double seconds = std::chrono::duration<double>(Clock::now() - start).count();
    best = std::min(best, seconds);
    total += seconds;
  }
  return best;
}

struct Difference {
  int worst = 0;
  double mean = 0;
  Picture picture;  // amplified
};

Difference Compare(const Picture& a, const Picture& b) {
  Difference difference;
  difference.picture = Picture(kRgb, a.Width(), a.Height());
  int64_t sum = 0;
  for (int y = 0; y < a.Height(); ++y) {
    const uint8_t *p = reinterpret_cast<uint8_t*>(a.Row(y)), *q = reinterpret_cast<uint8_t*>(b.Row(y));
    uint8_t* out = reinterpret_cast<uint8_t*>(difference.picture.Row(y));
    for (int i = 0; i < 4 * a.Width(); ++i) {
      const int error = std::abs(p[i] - q[i]);
      difference.worst = std::max(difference.worst, error);
      sum += error;
      out[i] = static_cast<uint8_t>(std::min(error * kErrorGain, 255));
    }
  }
  difference.mean = static_cast<double>(sum) / (4.0 * a.Width() * a.Height());
  return difference;
}

struct Stop {
  std::string title, figures;
  Picture picture, error;
};

struct Clip {
  std::string heading;
  int width = 0, height = 0;
  std::vector<Stop> stops;
};

// A frame some way into a video, the first of a picture.
Picture PickFrame(const std::string& path, int64_t* number) {
  const std::unique_ptr<FrameSource> source = OpenSource(path, {});
  const int64_t wanted = std::min<int64_t>(source->FrameCount() / 2, 48);
  for (*number = 0; *number < wanted && source->Skip(); ++*number) {
  }
  Picture picture = source->Next();
  return picture ? std::move(picture) : LoadPicture(path);
}

std::string Format(const char* format, auto... values) {
  char text[160];
  std::snprintf(text, sizeof text, format, values...);
  return text;
}

std::string PathOf(VX_PixelFormat source, const Way& way) {
  std::string text = FormatName(source);
  for (const VX_PixelFormat stop : way.stops) text += " > " + FormatName(stop);
  return text + " > " + FormatName(kRgb);
}

Clip RunClip(const std::string& path, const ConvertOptions& options) {
  int64_t frame = 0;
  const Picture source = PickFrame(path, &frame);
  const std::string name = std::filesystem::path(path).filename().string();
  Clip clip{name + ": " + Format("%dx%d, ", source.Width(), source.Height()) + FormatName(source.Format()) +
                ", frame " + std::to_string(frame),
            source.Width(),
            source.Height(),
            {}};
  std::cout << clip.heading << '\n';
  Picture direct;
  for (const Way& way : WaysFor(source.Format())) {
    Stop stop{way.title, {}, Travel(source, way, options), {}};
    const double speed = 1e-6 * source.Width() * source.Height() / TimeOf(source, way, options);
    stop.figures = Format("%.0f Mpixel/s", speed);
    if (direct) {
      Difference difference = Compare(direct, stop.picture);
      stop.figures += Format(", worst error %d of 255, mean %.3f", difference.worst, difference.mean);
      stop.error = std::move(difference.picture);
    } else {
      direct = Travel(source, way, options);
    }
    std::cout << Format("  %-22s ", way.title.c_str()) << stop.figures << "\n      " << PathOf(source.Format(), way)
              << '\n';
    clip.stops.push_back(std::move(stop));
  }
  return clip;
}

int ReductionOf(const Clip& clip) { return std::max(1, (clip.width + kTileWidth - 1) / kTileWidth); }

void DrawStop(Canvas& canvas, const Stop& stop, int x, int y, int reduction, const Font& large, const Font& small) {
  large.Draw(canvas, x, y + 20, stop.title, kInk);
  small.Draw(canvas, x, y + 41, stop.figures, kFaintInk);
  const int top = y + kLabelHeight, width = stop.picture.Width() / reduction,
            height = stop.picture.Height() / reduction;
  canvas.Fill(x - 1, top - 1, width + 2, height + 2, kFrame);
  canvas.Draw(stop.picture, x, top, reduction);
  if (!stop.error) return;
  const int insetReduction = reduction * 3, insetWidth = stop.error.Width() / insetReduction,
            insetHeight = stop.error.Height() / insetReduction;
  if (insetWidth < kLeastInset) return;
  const int left = x + width - insetWidth - 8, insetTop = top + height - insetHeight - 8;
  canvas.Fill(left - 2, insetTop - 22, insetWidth + 4, insetHeight + 24, kPaper);
  small.Draw(canvas, left + 4, insetTop - 6, Format("error x %d", kErrorGain), kInk);
  canvas.Draw(stop.error, left, insetTop, insetReduction, Canvas::Reduce::Maximum);
}

Canvas DrawSheet(const std::vector<Clip>& clips) {
  const Font title(22), large(18), small(15);
  int height = kMargin;
  for (const Clip& clip : clips) {
    const int rows = static_cast<int>(clip.stops.size() + kColumns - 1) / kColumns;
    height += kTitleHeight + rows * (kLabelHeight + clip.height / ReductionOf(clip) + kMargin);
  }
  Canvas canvas(kMargin + kColumns * (kTileWidth + kMargin), height, kPaper);
  int y = kMargin;
  for (const Clip& clip : clips) {
    title.Draw(canvas, kMargin, y + 24, clip.heading, kInk);
    y += kTitleHeight;
    const int reduction = ReductionOf(clip), tileHeight = kLabelHeight + clip.height / reduction + kMargin;
    for (size_t i = 0; i < clip.stops.size(); ++i) {
      const int column = static_cast<int>(i % kColumns), row = static_cast<int>(i / kColumns);
      DrawStop(canvas, clip.stops[i], kMargin + column * (kTileWidth + kMargin), y + row * tileHeight, reduction, large,
               small);
    }
    y += static_cast<int>((clip.stops.size() + kColumns - 1) / kColumns) * tileHeight;
  }
  return canvas;
}

void RunDemo(const DemoOptions& options) {
  const ConvertOptions convert{3, std::max(1, options.run.threads)};  // one thread unless asked: speeds compare
  OpenSink(options.out, {});                                          // refused before the work is done
  std::vector<Clip> clips;
  for (const std::string& file : options.files) clips.push_back(RunClip(file, convert));
  SavePicture(DrawSheet(clips).Result(), options.out, convert);
  std::cout << "Errors are in 8-bit codes against the direct way, speeds on " << convert.threads
            << (convert.threads == 1 ? " thread" : " threads") << ".\nThe contact sheet is in " << options.out << '\n';
}

}  // namespace

void AddDemoCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("demo", "Convert a frame in several ways and draw a labelled contact sheet");
  const auto options = std::make_shared<DemoOptions>();
  command->add_option("files", options->files, "Pictures or videos")->required();
  command->add_option("-o,--out", options->out, "The sheet (default vexel-demo.png)");
  options->run.AddTo(*command, "one, so that speeds compare");
  command->callback([options] {
    options->run.Apply();
    RunDemo(*options);
  });
}

}  // namespace tool
