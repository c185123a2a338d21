#include "color_spaces.h"

#include "nearest_name.h"
#include "tool_error.h"

namespace tool {

const std::vector<NamedColorSpace>& ColorSpaces() {
  static const VX::SRGBColorSpace srgb;
  static const VX::PQColorSpace pq(false, false), pqP3(true, false);
  static const VX::HLGColorSpace hlg;
  const auto working = [](VX_WorkingSpace space) -> const VX::ColorSpace& {
    return VX::ColorSpace::WorkingSpace(space);
  };
  static const std::vector<NamedColorSpace> spaces = {
      {"srgb", "IEC 61966-2-1 sRGB", srgb, false},
      {"rec709", "BT.709 primaries, display power 2.4 (BT.1886)", working(VX_WorkingSpaceRec709), false},
      {"rec2020", "BT.2020 primaries, display power 2.4", working(VX_WorkingSpaceRec2020), false},
      {"p3-d60", "DCI-P3 primaries, white D60, power 2.6", working(VX_WorkingSpaceDCIP3D60), false},
      {"p3-d65", "DCI-P3 primaries, white D65, power 2.6", working(VX_WorkingSpaceDCIP3D65), false},
      {"pq", "BT.2100 PQ (SMPTE ST 2084), BT.2020 primaries", pq, true},
      {"pq-p3", "SMPTE ST 2084, DCI-P3 D65 primaries", pqP3, true},
      {"hlg", "BT.2100 HLG, BT.2020 primaries, 1,000 cd/m2", hlg, true}};
  return spaces;
}

const NamedColorSpace& ParseColorSpace(const std::string& name) {
  std::vector<std::string> names;
  for (const NamedColorSpace& space : ColorSpaces()) {
    if (SameName(name, space.name)) return space;
    names.push_back(space.name);
  }
  throw ToolError("unknown colour space \"" + name + "\"" + DidYouMean(name, names) +
                  " (\"vexel color --help\" lists all)");
}

std::string ColorSpaceNames() {
  std::string names;
  for (const NamedColorSpace& space : ColorSpaces()) names += (names.empty() ? "" : ", ") + std::string(space.name);
  return names;
}

}  // namespace tool
