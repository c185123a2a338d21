// Drawing pictures and text onto a picture, for sheets.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "picture.h"

struct FT_LibraryRec_;
struct FT_FaceRec_;

namespace tool {

struct Colour {
  uint8_t red, green, blue;
};
// Of sheets.
inline constexpr Colour kPaper{24, 26, 30}, kInk{235, 235, 235}, kFaintInk{150, 155, 165}, kFrame{70, 74, 82};

// An opaque BGRX_4444_8u picture, measured in pixels from its top left corner. What falls outside is cut off.
class Canvas {
 public:
  Canvas(int width, int height, Colour background);

  const Picture& Result() const { return mPicture; }

  void Fill(int x, int y, int width, int height, Colour colour);
  // A BGRA_4444_8u or BGRX_4444_8u picture, alpha ignored, reduced by a whole factor in both directions: to the average
  // of each block, or to its maximum, channel by channel.
  enum class Reduce { Average, Maximum };
  void Draw(const Picture& picture, int x, int y, int factor = 1, Reduce reduce = Reduce::Average);
  void Blend(int x, int y, Colour colour, int coverage);

 private:
  uint8_t* Pixel(int x, int y) const { return reinterpret_cast<uint8_t*>(mPicture.Row(y)) + 4 * x; }
  bool IsInside(int x, int y) const { return x >= 0 && y >= 0 && x < mPicture.Width() && y < mPicture.Height(); }

  Picture mPicture;
};

// An outline font at one size. Text is ASCII.
class Font {
 public:
  // The first sans-serif font found among those that common systems install. Throws ToolError when there is none.
  explicit Font(int pixelHeight);
  // Draws with the baseline at y; returns the x behind the text.
  int Draw(Canvas& canvas, int x, int y, const std::string& text, Colour colour) const;

 private:
  struct Deleter {
    void operator()(FT_LibraryRec_* library) const;
    void operator()(FT_FaceRec_* face) const;
  };
  std::unique_ptr<FT_LibraryRec_, Deleter> mLibrary;
  std::unique_ptr<FT_FaceRec_, Deleter> mFace;
};

}  // namespace tool
