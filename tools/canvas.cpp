#include "canvas.h"

#include <ft2build.h>
#include FT_FREETYPE_H

#include <algorithm>

#include "tool_error.h"

namespace tool {

Canvas::Canvas(int width, int height, Colour background) : mPicture(VX_PixelFormat::BGRX_4444_8u, width, height) {
  Fill(0, 0, width, height, background);
}

void Canvas::Fill(int x, int y, int width, int height, Colour colour) {
  for (int row = std::max(y, 0); row < std::min(y + height, mPicture.Height()); ++row) {
    for (int column = std::max(x, 0); column < std::min(x + width, mPicture.Width()); ++column) {
      uint8_t* pixel = Pixel(column, row);
      pixel[0] = colour.blue;
      pixel[1] = colour.green;
      pixel[2] = colour.red;
      pixel[3] = 255;
    }
  }
}

namespace {

// One channel of a block of factor x factor pixels.
uint8_t ReduceBlock(const Picture& picture, int column, int row, int channel, int factor, Canvas::Reduce reduce) {
  int sum = factor * factor / 2, maximum = 0;
  for (int j = 0; j < factor; ++j) {
    const uint8_t* in = reinterpret_cast<const uint8_t*>(picture.Row(row * factor + j)) + channel;
    for (int i = 0; i < factor; ++i) {
      const int value = in[4 * (column * factor + i)];
      sum += value;
      maximum = std::max(maximum, value);
    }
  }
  return static_cast<uint8_t>(reduce == Canvas::Reduce::Maximum ? maximum : sum / (factor * factor));
}

}  // namespace

void Canvas::Draw(const Picture& picture, int x, int y, int factor, Reduce reduce) {
  for (int row = 0; row < picture.Height() / factor; ++row)
    for (int column = 0; column < picture.Width() / factor; ++column)
      if (IsInside(x + column, y + row))
        for (int c = 0; c < 3; ++c)
          Pixel(x + column, y + row)[c] = ReduceBlock(picture, column, row, c, factor, reduce);
}

void Canvas::Blend(int x, int y, Colour colour, int coverage) {
  if (!IsInside(x, y)) return;
  uint8_t* pixel = Pixel(x, y);
  const uint8_t ink[3] = {colour.blue, colour.green, colour.red};
  for (int c = 0; c < 3; ++c)
    pixel[c] = static_cast<uint8_t>((pixel[c] * (255 - coverage) + ink[c] * coverage + 127) / 255);
}

namespace {

constexpr const char* kFontFiles[] = {
    "/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf",
    "/usr/share/fonts/dejavu-sans-fonts/DejaVuSans.ttf",
    "/usr/share/fonts/TTF/DejaVuSans.ttf",
    "/usr/share/fonts/truetype/liberation/LiberationSans-Regular.ttf",
    "/usr/share/fonts/truetype/noto/NotoSans-Regular.ttf",
};

}  // namespace

void Font::Deleter::operator()(FT_LibraryRec_* library) const { FT_Done_FreeType(library); }
void Font::Deleter::operator()(FT_FaceRec_* face) const { FT_Done_Face(face); }

Font::Font(int pixelHeight) {
  FT_Library library = nullptr;
  if (FT_Init_FreeType(&library)) throw ToolError("cannot start FreeType");
  mLibrary.reset(library);
  for (const char* file : kFontFiles) {
    FT_Face face = nullptr;
    if (FT_New_Face(library, file, 0, &face)) continue;
    mFace.reset(face);
    FT_Set_Pixel_Sizes(face, 0, static_cast<FT_UInt>(pixelHeight));
    return;
  }
  throw ToolError("found no font for labels; install the DejaVu fonts (fonts-dejavu-core)");
}

int Font::Draw(Canvas& canvas, int x, int y, const std::string& text, Colour colour) const {
  for (const char c : text) {
    if (FT_Load_Char(mFace.get(), static_cast<unsigned char>(c), FT_LOAD_RENDER)) continue;
    const FT_GlyphSlot glyph = mFace->glyph;
    for (unsigned row = 0; row < glyph->bitmap.rows; ++row)
      for (unsigned column = 0; column < glyph->bitmap.width; ++column)
        canvas.Blend(x + glyph->bitmap_left + static_cast<int>(column), y - glyph->bitmap_top + static_cast<int>(row),
                     colour,
                     glyph->bitmap.buffer[static_cast<int>(row) * glyph->bitmap.pitch + static_cast<int>(column)]);
    x += static_cast<int>(glyph->advance.x >> 6);
  }
  return x;
}

}  // namespace tool
