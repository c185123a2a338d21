// vexel convert: frames of a file to another pixel format, and into a file.
#include <algorithm>
#include <chrono>
#include <iostream>
#include <limits>
#include <memory>

#include "checksum.h"
#include "commands.h"
#include "convert_picture.h"
#include "format_catalogue.h"
#include "frame_sink.h"
#include "frame_source.h"
#include "parallel.h"
#include "parse_size.h"
#include "progress.h"
#include "run_options.h"
#include "tool_error.h"

namespace tool {
namespace {

constexpr int64_t kNoEnd = std::numeric_limits<int64_t>::max();

struct ConvertCommand {
  std::string in, out, format, rawFormat, size, frames, matrix, container;
  int quality = 3;
  bool explain = false, hash = false;
  RunOptions run;
};

// "A-B", "A-" or "A"; frames count from 0 and B is included.
struct FrameRange {
  int64_t first = 0;
  int64_t last = kNoEnd;
};

FrameRange ParseFrames(const std::string& text) {
  if (text.empty()) return {};
  const std::string message = "\"" + text + "\" is not a range of frames; write A-B, A- or A, counting from 0";
  const size_t dash = text.find('-');
  FrameRange range;
  range.first = ParseNumber(std::string_view(text).substr(0, dash), message);
  if (dash == std::string::npos)
    range.last = range.first;
  else if (dash + 1 < text.size())
    range.last = ParseNumber(std::string_view(text).substr(dash + 1), message);
  if (range.last < range.first) throw ToolError(message);
  return range;
}

// One frame on its way: as read, as asked for, and as the file takes it.
struct Job {
  Picture source, converted, stored;
  std::vector<uint8_t> hashed, encoded;
};

class Conversion {
 public:
  explicit Conversion(const ConvertCommand& command)
      : mCommand(command),
        mFormat(ParseFormat(command.format)),
        mRange(ParseFrames(command.frames)),
        mSource(OpenSource(command.in,
                           ParseSourceOptions(command.rawFormat, command.size, command.matrix, command.run.threads))),
        mReport(command.out == "-" ? std::cerr : std::cout) {
    SinkOptions options;
    options.frameRate = mSource->FrameRate();
    if (!command.container.empty()) options.container = ParseContainer(command.container);
    mSink = OpenSink(command.out, options, mRange.first);
    if (!mSink->TakesManyFrames()) {
      if (!command.frames.empty() && mRange.last != mRange.first)
        throw ToolError("\"" + command.out + "\" holds one picture; name a sequence, for instance out_%04d.png");
      mRange.last = mRange.first;
    }
  }

  void Run() {
    int64_t skipped = 0;
    while (skipped < mRange.first && mSource->Skip()) ++skipped;
    {
      Progress progress(ExpectedFrames());
      while (const int count = RunBatch()) progress.Show(mDone += count);
    }
    if (mDone == 0)
      throw ToolError(skipped == 0 ? "cannot read " + SourceName(mCommand.in) + ": it holds no frame"
                                   : SourceName(mCommand.in) + " has only " + std::to_string(skipped) + " frames");
    mSink->Close();
    Report();
  }

 private:
  int64_t ExpectedFrames() const {
    const int64_t wanted = mRange.last == kNoEnd ? kNoEnd : mRange.last - mRange.first + 1;
    const int64_t held = mSource->FrameCount();
    if (held > 0) return std::min(wanted, held - mRange.first);
    return wanted == kNoEnd ? 0 : wanted;
  }

  int64_t FramesLeft() const { return mRange.last == kNoEnd ? kNoEnd : mRange.last - mRange.first + 1 - mDone; }

  // One frame per thread, but no more than about a gigabyte of them.
  std::vector<Job> ReadBatch(int threads) {
    constexpr int64_t kBytes = int64_t{1} << 30, kBytesPerPixel = 3 * 16;
    std::vector<Job> jobs;
    int64_t wanted = std::min<int64_t>(threads, FramesLeft());
    while (static_cast<int64_t>(jobs.size()) < wanted) {
      Job job{mSource->Next(), {}, {}, {}, {}};
      if (!job.source) break;
      const int64_t fitting = kBytes / (kBytesPerPixel * job.source.Width() * job.source.Height());
      wanted = std::min(wanted, std::max<int64_t>(fitting, 1));
      jobs.push_back(std::move(job));
    }
    return jobs;
  }

  // Converts a batch of frames side by side and writes them in order. Threads beyond the frames work on bands of rows.
  int RunBatch() {
    const int threads = mCommand.run.ThreadCount();
    std::vector<Job> jobs = ReadBatch(threads);
    const int count = static_cast<int>(jobs.size());
    if (count == 0) return 0;
    if (mDone == 0) Explain(jobs[0].source);
    const ConvertOptions options{mCommand.quality, std::max(1, threads / count)};
    const auto start = std::chrono::steady_clock::now();
    ForEach(count, threads, [&](int i) { jobs[i].converted = ConvertPicture(jobs[i].source, mFormat, options); });
    mSeconds += std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    ForEach(count, threads, [&](int i) { Encode(jobs[i], options); });
    for (Job& job : jobs) {
      if (mCommand.hash) mChecksum.Add(job.hashed);
      mSink->Append(job.stored, job.encoded);
      mPixels += int64_t{job.stored.Width()} * job.stored.Height();
    }
    return count;
  }

  void Encode(Job& job, const ConvertOptions& options) const {
    if (mCommand.hash) job.hashed = RawBytes(job.converted);
    const VX_PixelFormat format = mSink->StorageFormat(mFormat, job.converted.Height());
    job.stored = format == mFormat ? std::move(job.converted) : ConvertPicture(job.converted, format, options);
    job.encoded = mSink->Encode(job.stored);
  }

  void Explain(const Picture& source) {
    if (!mCommand.explain) return;
    mReport << "plan: " << ExplainConversion(source.Format(), mFormat, mCommand.quality) << '\n';
    const VX_PixelFormat stored = mSink->StorageFormat(mFormat, source.Height());
    if (stored != mFormat) mReport << "file: " << ExplainConversion(mFormat, stored, mCommand.quality) << '\n';
  }

  void Report() {
    if (mCommand.hash) mReport << "md5 " << mChecksum.Finish() << '\n';
    char speed[96];
    std::snprintf(speed, sizeof speed, "%.2f ms per frame, %.0f Mpixel/s", mSeconds * 1e3 / static_cast<double>(mDone),
                  static_cast<double>(mPixels) / std::max(mSeconds, 1e-9) * 1e-6);
    std::cerr << SinkName(mCommand.out) << ": " << mDone << (mDone == 1 ? " frame, " : " frames, ")
              << FormatName(mFormat) << ", converted in " << speed << '\n';
    if (mRange.last != kNoEnd && mRange.first + mDone <= mRange.last)
      std::cerr << "vexel: note: " << SourceName(mCommand.in) << " ends with frame " << mRange.first + mDone - 1
                << '\n';
  }

  const ConvertCommand& mCommand;
  VX_PixelFormat mFormat;
  FrameRange mRange;
  std::unique_ptr<FrameSource> mSource;
  std::unique_ptr<FrameSink> mSink;
  std::ostream& mReport;
  Checksum mChecksum;
  int64_t mDone = 0, mPixels = 0;
  double mSeconds = 0;
};

}  // namespace

void AddConvertCommand(CLI::App& app) {
  CLI::App* command = app.add_subcommand("convert", "Convert a picture or video to another pixel format");
  const auto options = std::make_shared<ConvertCommand>();
  command->add_option("in", options->in, "Picture, video, sequence (in_%04d.png) or raw frames; - is standard input")
      ->required();
  command
      ->add_option("out", options->out,
                   "Picture, sequence (out_%04d.png, numbered by frame), .y4m or .raw; - is standard output (raw)")
      ->required();
  command->add_option("--format", options->format, "Pixel format to convert to (see \"vexel formats\")")->required();
  command->add_option("--quality", options->quality, "Render quality; above 1 interpolates chroma (default 3)")
      ->check(CLI::Range(0, 5));
  command->add_option("--frames", options->frames, "Frames A-B, A- or A, counting from 0 (default: all)");
  command->add_option("--raw-format", options->rawFormat, "IN is raw frames of this pixel format");
  command->add_option("--size", options->size, "WIDTHxHEIGHT of raw frames");
  command->add_option("--matrix", options->matrix, "Treat YUV input as BT.601, 709 or 2020, whatever the file says");
  command->add_option("--container", options->container,
                      std::string("Write ") + ContainerNames() + ", whatever the extension");
  command->add_flag("--explain", options->explain, "Show the chain of formats");
  command->add_flag("--hash", options->hash, "Print the MD5 of the converted frames (as a raw file would hold them)");
  options->run.AddTo(*command);
  command->callback([options] {
    options->run.Apply();
    Conversion(*options).Run();
  });
}

}  // namespace tool
