// vexel pack and vexel unpack: frames to and from the layouts that codecs and cameras use.
#include <filesystem>
#include <iostream>
#include <memory>
#include <string>

#include "commands.h"
#include "convert_picture.h"
#include "format_catalogue.h"
#include "frame_sink.h"
#include "frame_source.h"
#include "packings.h"
#include "parse_size.h"
#include "run_options.h"
#include "tool_error.h"

namespace tool {
namespace {

struct PackOptions {
  std::string in, out, packing, rawFormat, size, matrix, container;
  RunOptions run;
};

SourceOptions SourceOptionsOf(const PackOptions& options) {
  SourceOptions source;
  source.threads = options.run.threads;
  if (!options.matrix.empty()) source.matrix = ParseMatrix(options.matrix);
  if (!options.size.empty()) std::tie(source.width, source.height) = ParseSize(options.size);
  return source;
}

void Report(const PackOptions& options, int64_t frames, const std::string& what) {
  if (frames == 0) throw ToolError("cannot read " + SourceName(options.in) + ": it holds no frame");
  std::cerr << SinkName(options.out) << ": " << frames << (frames == 1 ? " frame, " : " frames, ") << what << '\n';
}

// A file that nothing is known about is likely to be raw.
std::unique_ptr<FrameSource> OpenUnpacked(const std::string& path, const SourceOptions& options) try {
  return OpenSource(path, options);
} catch (const ToolError& error) {
  if (options.rawFormat || !std::filesystem::is_regular_file(path)) throw;
  throw ToolError(error.what() + std::string("; raw frames need --size WIDTHxHEIGHT"));
}

// Raw frames with a size alone are in the unpacked layout already; everything else is converted to it.
void RunPack(const PackOptions& options) {
  options.run.Apply();
  const Packing& packing = ParsePacking(options.packing);
  SourceOptions sourceOptions = SourceOptionsOf(options);
  const bool isUnpacked = options.rawFormat.empty() && sourceOptions.width != 0;
  if (isUnpacked)
    sourceOptions.rawFormat = packing.unpackedAs;
  else if (!options.rawFormat.empty())
    sourceOptions.rawFormat = ParseFormat(options.rawFormat);
  const auto source = OpenUnpacked(options.in, sourceOptions);
  const auto sink = OpenStreamSink(options.out, Container::Raw, source->FrameRate());
  const ConvertOptions convert{3, options.run.ThreadCount()};
  int64_t frames = 0;
  for (; const Picture frame = source->Next(); ++frames) {
    const FrameBytes unpacked =
        isUnpacked ? RawBytes(frame) : packing.FromPicture(ConvertPicture(frame, packing.picture, convert));
    sink->Append(frame, packing.pack(unpacked, frame.Width(), frame.Height()));
  }
  if (frames != 0) sink->Close();
  Report(options, frames, std::string("packed as ") + packing.name + " from " + packing.unpacked);
}

// Raw files get the unpacked layout, others the picture in it.
void RunUnpack(const PackOptions& options) {
  options.run.Apply();
  const Packing& packing = ParsePacking(options.packing);
  SourceOptions sourceOptions = SourceOptionsOf(options);
  sourceOptions.rawFormat = packing.packedAs;
  const Container container = options.container.empty() ? ContainerOf(options.out) : ParseContainer(options.container);
  const auto source = OpenSource(options.in, sourceOptions);
  const auto sink = OpenSink(options.out, {container, source->FrameRate()});
  const ConvertOptions convert{3, options.run.ThreadCount()};
  int64_t frames = 0;
  while (const Picture frame = source->Next()) {
    FrameBytes unpacked = packing.unpack(RawBytes(frame), frame.Width(), frame.Height());
    if (container == Container::Raw) {
      sink->Append(frame, unpacked);
    } else {
      const Picture picture = packing.ToPicture(unpacked, frame.Width(), frame.Height());
      const Picture stored = ConvertPicture(picture, sink->StorageFormat(picture.Format(), picture.Height()), convert);
      sink->Append(stored, sink->Encode(stored));
    }
    ++frames;
    if (!sink->TakesManyFrames()) break;
  }
  if (frames != 0) sink->Close();
  Report(options, frames,
         std::string("unpacked from ") + packing.name +
             (container == Container::Raw ? std::string(" to ") + packing.unpacked : ""));
}

std::string Footer(const char* title) {
  std::string text = title;
  for (const Packing& packing : Packings())
    text += std::string("\n  ") + packing.name + std::string(10 - std::string(packing.name).size(), ' ') +
            packing.help + "\n            unpacked: " + packing.unpacked;
  return text;
}

}  // namespace

void AddPackCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("pack", "Pack frames as a codec takes them");
  const auto options = std::make_shared<PackOptions>();
  command->add_option("in", options->in, "Picture, video, sequence (in_%04d.png) or raw frames; - is standard input")
      ->required();
  command->add_option("out", options->out, "The packed frames, without any header; - is standard output")->required();
  command->add_option("--to", options->packing, "Packing: " + PackingNames())->required();
  command->add_option("--size", options->size,
                      "WIDTHxHEIGHT: IN is raw frames, of the unpacked layout unless --raw-format says otherwise");
  command->add_option("--raw-format", options->rawFormat, "IN is raw frames of this pixel format, to be converted");
  command->add_option("--matrix", options->matrix, "Treat YUV input as BT.601, 709 or 2020, whatever the file says");
  options->run.AddTo(*command);
  command->footer(Footer("Packings:"));
  command->callback([options] { RunPack(*options); });
}

void AddUnpackCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("unpack", "Unpack frames that were packed for a codec");
  const auto options = std::make_shared<PackOptions>();
  command->add_option("in", options->in, "Packed frames without any header; - is standard input")->required();
  command
      ->add_option("out", options->out,
                   "Picture, sequence (out_%04d.png) or .y4m; .raw or - (standard output) for the unpacked layout")
      ->required();
  command->add_option("--from", options->packing, "Packing: " + PackingNames())->required();
  command->add_option("--size", options->size, "WIDTHxHEIGHT of the frames")->required();
  command->add_option("--container", options->container,
                      std::string("Write ") + ContainerNames() + ", whatever the extension");
  options->run.AddTo(*command);
  command->footer(Footer("Packings (v210 is BT.709):"));
  command->callback([options] { RunUnpack(*options); });
}

}  // namespace tool
