#include "commands/command.h"
#include "commands/xml.h"
#include "data/access_policy.h"
#include "foundation/color.h"
#include "foundation/fault.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

const CommandDeclaration kStyle{
    "CreateClassStyleCommand",
    "Feature extraction",
    "Writes the style by which QGIS shows polygons in the colours, and with the names, of their "
    "classes. A command of this library's own.",
    {{"Style", Presence::kRequired, ValueKind::kText, "the file, with the ending .qml"},
     {"Field", Presence::kRequired, ValueKind::kText, "the field with the number of the class"},
     {"Classes", Presence::kRequired, ValueKind::kTextList, "the names of the numbers from 0 on"},
     {"Palette", Presence::kRequired, ValueKind::kPalette, "their colours"}},
    {}};

XMLElement* AddWith(XMLElement& parent, const char* name,
                    std::initializer_list<std::pair<const char*, std::string>> attributes) {
  XMLElement* const child = parent.AddChild(name);
  for (const auto& [key, value] : attributes) child->attributes[key] = String(value);
  return child;
}

/// A colour as the style has it: its parts, between commas.
std::string TextOf(const Color& color) {
  std::string text;
  for (const unsigned part : {color.r, color.g, color.b}) text.append(std::to_string(part)) += ',';
  return text + "255";
}

class CreateClassStyleCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::string file = Read<String>("Style").ToUTF8();
    if (!MayReachFile(file, true)) return Fail();
    const auto names = Read<Array<String>>("Classes");
    Palette colors = Read<Palette>("Palette");

    XMLDocumentRoot root{"qgis", {}, {}};
    root.attributes["version"] = ("3.22");
    root.attributes["styleCategories"] = ("Symbology");
    const XMLElementPtr renderer(new XMLElement("renderer-v2"));
    root.children.PushBack(renderer);
    renderer->attributes["type"] = ("categorizedSymbol");
    renderer->attributes["attr"] = (Read<String>("Field"));
    XMLElement* const categories = renderer->AddChild("categories");
    XMLElement* const symbols = renderer->AddChild("symbols");
    for (unsigned i = 0; i < names.GetCount(); ++i) {
      const std::string number = std::to_string(i);
      const ColorPtr color = i < colors.GetCount() ? colors.At(i) : ColorPtr(new Color());
      AddWith(*categories, "category",
              {{"value", number},
               {"symbol", number},
               {"label", names[i].ToUTF8()},
               {"render", "true"}});
      XMLElement* const symbol =
          AddWith(*symbols, "symbol", {{"name", number}, {"type", "fill"}, {"alpha", "1"}});
      XMLElement* const fill = AddWith(*symbol, "layer", {{"class", "SimpleFill"}});
      AddWith(*fill, "prop", {{"k", "color"}, {"v", TextOf(*color)}});
      AddWith(*fill, "prop", {{"k", "style"}, {"v", "solid"}});
      AddWith(*fill, "prop", {{"k", "outline_style"}, {"v", "no"}});
    }
    const String text = XMLSimpleWriter().Write(root);
    std::string fault;
    if (!platform::ReplaceFile(file, text.ToUTF8(), &fault)) {
      return Fail(String(file + ": " + fault));
    }
    return Succeed();
  }
};

const CommandFactoryT<CreateClassStyleCommand> createClassStyleFactory(kStyle);

}  // namespace
}  // namespace lumo
