#include <algorithm>

#include "commands/catalog.h"
#include "commands/catalog_session.h"
#include "commands/command.h"
#include "metadata/metadata.h"
#include "raster/raster.h"

namespace lumo {
namespace {

using catalog::OpenObject;

String KindOf(const OpenObject& open) {
  const ObjectPtr object = catalog::Find(open.uri);
  if (object.IsNull()) return "other";
  if (object->IsA(BasicRaster::TypeCode)) return "raster";
  return object->IsA(Metadata::TypeCode) ? "metadata" : "other";
}

template <typename T, typename Of>
Array<T> Collect(const std::vector<OpenObject>& objects, const Of& of) {
  Array<T> values{ArrayDims(static_cast<unsigned>(objects.size()))};
  std::transform(objects.begin(), objects.end(), values.begin(), of);
  return values;
}

const CommandDeclaration kList{
    "ListOpenObjectsCommand",
    "Server",
    "Lists what is open, by whom, one entry for each object and client; vexg's own.",
    {},
    {{"URIs", ValueKind::kURIArray, "the objects; further lists go along"},
     {"Kinds", ValueKind::kTextList, "raster, metadata or other"},
     {"Opens", ValueKind::kIntegerArray, "how often the client has opened it and not closed it"},
     {"Clients", ValueKind::kIntegerArray,
      "number of the client's process; 0 where the opens are nobody's"}}};

class ListOpenObjectsCommand final : public Command {
  CommandResult Execute() override {
    const std::vector<OpenObject> objects = catalog::ListOpenObjects();
    using Open = const OpenObject&;
    Write("URIs", Collect<URI>(objects, [](Open open) { return open.uri; }));
    Write("Kinds", Collect<String>(objects, KindOf));
    Write("Opens", Collect<unsigned>(objects, [](Open open) { return open.opens; }));
    Write("Clients",
          Collect<unsigned>(objects, [](Open open) { return static_cast<unsigned>(open.client); }));
    return Succeed();
  }
};

const CommandFactoryT<ListOpenObjectsCommand> listFactory(kList);

}  // namespace
}  // namespace lumo
