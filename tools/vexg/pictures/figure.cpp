#include "pictures/figure.h"

#include <algorithm>
#include <filesystem>

#include <fmt/format.h>

#include "drawing/figure_drawing.h"
#include "foundation/text_case.h"
#include "pictures/drawing_plugin.h"
#include "pictures/picture_writer.h"

namespace lumo::host {
namespace {

bool IsSvg(const std::string& name) {
  return LowerCase(std::filesystem::path(name).extension().string()) == ".svg";
}

std::string Escaped(const std::string& text) {
  std::string escaped;
  for (const char c : text) {
    if (c == '&') {
      escaped += "&amp;";
    } else if (c == '<') {
      escaped += "&lt;";
    } else if (c == '>') {
      escaped += "&gt;";
    } else {
      escaped += c;
    }
  }
  return escaped;
}

std::string PlacesOf(const std::vector<FigurePoint>& points) {
  std::string text;
  for (const FigurePoint& point : points) {
    text += fmt::format("{}{:.2f},{:.2f}", text.empty() ? "" : " ", point.x, point.y);
  }
  return text;
}

std::string LettersOf(const std::string& text, const Figure::TextForm& form, unsigned colour) {
  const char* const anchor = form.align == 0 ? "start" : form.align == 1 ? "end" : "middle";
  const std::string turn =
      form.isUpright ? fmt::format(" transform=\"rotate(-90 {:.2f} {:.2f})\"", form.at.x, form.at.y)
                     : std::string();
  return fmt::format(
      "<text x=\"{:.2f}\" y=\"{:.2f}\" font-size=\"{:g}\" text-anchor=\"{}\"{}{} "
      "fill=\"#{:06x}\">{}</text>\n",
      form.at.x, form.at.y, form.size, anchor, form.isBold ? " font-weight=\"bold\"" : "", turn,
      colour, Escaped(text));
}

}  // namespace

void Figure::Fill(std::vector<FigurePoint> corners, unsigned colour) {
  marks_.push_back({Kind::kArea, std::move(corners), colour, 0, {}, {}});
}

void Figure::Line(std::vector<FigurePoint> points, double width, unsigned colour) {
  marks_.push_back({Kind::kLine, std::move(points), colour, width, {}, {}});
}

void Figure::Text(const std::string& text, const TextForm& form, unsigned colour) {
  marks_.push_back({Kind::kText, {form.at}, colour, 0, Printable(text), form});
}

std::string Figure::AsSvg() const {
  std::string svg = fmt::format(
      "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
      "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"{0}\" height=\"{1}\" viewBox=\"0 0 {0} "
      "{1}\" font-family=\"Helvetica, Arial, sans-serif\">\n"
      "<rect width=\"{0}\" height=\"{1}\" fill=\"#ffffff\"/>\n",
      width_, height_);
  for (const Mark& mark : marks_) {
    switch (mark.kind) {
      case Kind::kArea:
        svg += fmt::format("<polygon points=\"{}\" fill=\"#{:06x}\"/>\n", PlacesOf(mark.points),
                           mark.colour);
        break;
      case Kind::kLine:
        svg += fmt::format(
            "<polyline points=\"{}\" fill=\"none\" stroke=\"#{:06x}\" stroke-width=\"{:g}\" "
            "stroke-linejoin=\"round\"/>\n",
            PlacesOf(mark.points), mark.colour, mark.width);
        break;
      case Kind::kText:
        svg += LettersOf(mark.text, mark.form, mark.colour);
    }
  }
  return svg + "</svg>\n";
}

void Figure::WritePicture(const OutputFile& output) const {
  constexpr unsigned kScale = 2, kChannels = 3, kMost = 32767;  // pixels of Cairo
  const unsigned width = kScale * width_, height = kScale * height_;
  if (std::max(width, height) > kMost) {
    throw HostError(kExitFailed, fmt::format("{}: a plot of {} by {} pixels is too large for a "
                                             "picture; an .svg has room for it",
                                             output.GetShownName(), width, height));
  }
  std::vector<std::vector<double>> places;
  std::vector<VexgMark> marks;
  for (const Mark& mark : marks_) {
    places.emplace_back();
    for (const FigurePoint& point : mark.points) {
      places.back().insert(places.back().end(), {point.x, point.y});
    }
    marks.push_back({static_cast<int>(mark.kind), places.back().data(), mark.points.size(),
                     mark.colour, mark.kind == Kind::kText ? mark.form.size : mark.width,
                     mark.text.c_str(), mark.form.align, mark.form.isUpright, mark.form.isBold});
  }
  const std::size_t lineBytes = std::size_t{width} * kChannels;
  std::vector<unsigned char> pixels(lineBytes * height);
  auto* const draw = FindDrawing<VexgDrawFigureFunction>("VexgDrawFigure");
  if (!draw(marks.data(), marks.size(), kScale, width, height, pixels.data())) {
    throw HostError(kExitFailed, output.GetShownName() + ": can't be drawn");
  }
  const auto writer = MakePictureWriter(output, width, height, kChannels);
  for (unsigned y = 0; y < height; ++y) writer->WriteLine(&pixels[y * lineBytes]);
  writer->Close();
}

void Figure::Write(const OutputFile& output) const {
  if (!IsSvg(output.GetShownName())) return WritePicture(output);
  const std::string svg = AsSvg();
  FileWriter file(output);
  file.Write(svg.data(), svg.size());
  file.Close();
}

void CheckFigureName(const std::string& name) {
  if (IsSvg(name) || IsPictureName(name)) return;
  throw HostError(kExitUsage, name + ": a plot is named .svg, .png, .jpg, .jpeg or .webp");
}

}  // namespace lumo::host
