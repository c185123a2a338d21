// vexel formats: the catalogue.
#include <iomanip>
#include <iostream>
#include <memory>
#include <string>

#include "commands.h"
#include "format_catalogue.h"

namespace tool {
namespace {

std::string RowRule(VX_PixelFormat format) {
  const uint32_t kind = FrameKind(format);
  if (Is420(format)) return IsBiplanar420(format) ? "biplanar 4:2:0, rows to 128" : "planar 4:2:0, rows to 128";
  if (kind) return std::to_string(VX_PixelFormatSize(format, 720, 480)) + " bytes per frame";
  if (IsV210(format)) return "16 B per 6 px, rows to 128";
  const int bytes = IsPacked422(format) ? (Is8Bit(format) ? 2 : 8) : static_cast<int>(TightRowBytes(format, 1));
  return std::to_string(bytes) + " B/px, rows to " + (IsPacked422(format) ? "16" : "64");
}

const char* Depth(VX_PixelFormat format) {
  return IsFloat(format) ? "32f" : Is15Bit(format) ? "15u" : Is10Bit(format) ? "10u" : "8u";
}

const char* Layout(VX_PixelFormat format) {
  constexpr const char* kLayouts[] = {"4:4:4", "4:2:2", "DV", "4:2:0"};
  const uint32_t layout = (Bits(format) >> 4) & 3;
  return layout == 0 && ((Bits(format) >> 2) & 3) ? "4:4:4:4" : kLayouts[layout];
}

const char* Alpha(VX_PixelFormat format) {
  constexpr const char* kKinds[] = {"none", "straight", "premultiplied", "ignored"};
  return kKinds[(Bits(format) >> 2) & 3];
}

// RGB formats carry no colorimetry.
const char* Colorimetry(VX_PixelFormat format) {
  constexpr const char* kNames[] = {"BT.601", "BT.709", "BT.2020", "BT.2020 HDR"};
  return IsYuv(format) ? kNames[(Bits(format) >> 9) & 3] : IsLinear(format) ? "linear RGB" : "RGB";
}

const char* Range(VX_PixelFormat format) { return IsYuv(format) && !IsFullRangeYuv(format) ? "video" : "full"; }
const char* Origin(VX_PixelFormat format) { return VX_IsOriginTopLeft(format) ? "top" : "bottom"; }

// Whether the library converts from and to a format; others are for buffers, planes and fills.
const char* Converts(VX_PixelFormat format) {
  constexpr VX_PixelFormat kPartners[] = {VX_PixelFormat::BGRA_4444_32f, VX_PixelFormat::BGRA_4444_8u};
  const VX_PixelFormat partner = kPartners[format == kPartners[0]];
  VX_PixelFormat chain[9];
  int32_t count = 0;
  const bool from = VX_ExplainConversion(format, partner, 3, chain, &count) == VX_Success;
  const bool to = VX_ExplainConversion(partner, format, 3, chain, &count) == VX_Success;
  return from ? (to ? "from and to" : "from") : to ? "to" : "no";
}

std::string Hex(VX_PixelFormat format) {
  char text[16];
  std::snprintf(text, sizeof text, "0x%08X", static_cast<unsigned>(Bits(format)));
  return text;
}

void PrintTable() {
  const auto row = [](auto name, auto value, auto depth, auto layout, auto alpha, auto colour, auto range, auto rows,
                      auto origin, auto converts) {
    std::cout << std::left << std::setw(52) << name << std::setw(12) << value << std::setw(6) << depth << std::setw(9)
              << layout << std::setw(15) << alpha << std::setw(13) << colour << std::setw(7) << range << std::setw(29)
              << rows << std::setw(11) << origin << converts << '\n';
  };
  row("name", "value", "depth", "layout", "alpha", "colour", "range", "row rule", "first row", "converts");
  for (const CatalogueEntry& entry : Catalogue())
    row(entry.name, Hex(entry.format), Depth(entry.format), Layout(entry.format), Alpha(entry.format),
        Colorimetry(entry.format), Range(entry.format), RowRule(entry.format), Origin(entry.format),
        Converts(entry.format));
}

void PrintMarkdown() {
  std::cout
      << "# Pixel formats\n\nWritten by `vexel formats --markdown`. The value's bits are explained in "
         "[pixel_formats.h](../include/vexel/pixel_formats.h). *First row* is the picture row that is stored first; "
         "*row rule* is what `VX_AllocatePixelBuffer` gives; *converts* says which ways `VX_Convert` goes.\n\n"
         "| name | value | depth | layout | alpha | colour | range | row rule | first row | converts |\n"
         "|---|---|---|---|---|---|---|---|---|---|\n";
  for (const CatalogueEntry& entry : Catalogue()) {
    const VX_PixelFormat f = entry.format;
    std::cout << "| `" << entry.name << "` | " << Hex(f) << " | " << Depth(f) << " | " << Layout(f) << " | " << Alpha(f)
              << " | " << Colorimetry(f) << " | " << Range(f) << " | " << RowRule(f) << " | " << Origin(f) << " | "
              << Converts(f) << " |\n";
  }
}

void PrintJson() {
  std::cout << "[\n";
  const char* separator = "";
  for (const CatalogueEntry& entry : Catalogue()) {
    const auto text = [](const char* key, const std::string& value) {
      return std::string(", \"") + key + "\": \"" + value + '"';
    };
    const bool named = VX_PixelFormatFromName(entry.name) == entry.format;
    std::cout << separator << "  {\"name\": \"" << entry.name << "\", \"value\": " << Bits(entry.format)
              << ", \"named\": " << (named ? "true" : "false") << text("depth", Depth(entry.format))
              << text("layout", Layout(entry.format)) << text("alpha", Alpha(entry.format))
              << text("colour", Colorimetry(entry.format)) << text("range", Range(entry.format))
              << text("rowRule", RowRule(entry.format)) << text("firstRow", Origin(entry.format))
              << text("converts", Converts(entry.format)) << text("hostName", entry.hostName)
              << text("hostMapping", entry.mapping) << "}";
    separator = ",\n";
  }
  std::cout << "\n]\n";
}

}  // namespace

void AddFormatsCommand(CLI::App& app) {
  CLI::App* command =
      app.add_subcommand("formats", "List the pixel formats: bits, row rule, origin, which ways they convert");
  const auto style = std::make_shared<std::string>();
  CLI::Option* json = command->add_flag_callback(
      "--json", [style] { *style = "json"; }, "As JSON");
  command
      ->add_flag_callback(
          "--markdown", [style] { *style = "markdown"; }, "As a Markdown table")
      ->excludes(json);
  command->callback([style] {
    if (*style == "json") return PrintJson();
    if (*style == "markdown") return PrintMarkdown();
    PrintTable();
  });
}

}  // namespace tool
