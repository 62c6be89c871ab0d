#include "commands/catalog.h"
#include "commands/command.h"
#include "foundation/fault.h"
#include "metadata/metadata.h"
#include "metadata/metadata_types.h"

namespace lumo {
namespace {

const char* const kGroup = "Metadata";
const InputDeclaration kUri{"URI", Presence::kRequired, ValueKind::kURI, "the metadata"};
const InputDeclaration kPath{"PATH", Presence::kRequired, ValueKind::kText,
                             "a path such as /Sensor/Satellite/"};

/// Base of the commands on metadata of the catalog.
class MetadataCommand : public Command {
 protected:
  /// The object whose URI the input holds; else empty, with the fault set.
  MetadataPtr FindMetadata() const {
    const MetadataPtr metadata(CatalogFind(Read<URI>("URI")));
    if (!metadata) SetFault("URI: no such metadata is open");
    return metadata;
  }
};

const CommandDeclaration kCreate{
    "CreateMetadataCommand",
    kGroup,
    "Reads what a source says of itself.",
    {{"ConnStr", Presence::kRequired, ValueKind::kTextList,
      "the word of the format, the file, and for XML formats XmlFile, XmlUrl or XmlString; EMPTY "
      "for none"}},
    {{"URI", ValueKind::kURI, "the metadata"}}};

class CreateMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata(new Metadata);
    if (!metadata->Open(Read<Array<String>>("ConnStr"))) {
      return Fail(TakeFaultOr("the metadata could not be read"));
    }
    CatalogAdd(metadata);
    Write("URI", metadata->GetURI());
    return Succeed();
  }
};

const CommandFactoryT<CreateMetadataCommand> createFactory(kCreate);

const CommandDeclaration kAccess{"AccessMetadataCommand",
                                 kGroup,
                                 "Adds one to the opens of metadata.",
                                 {kUri},
                                 {{"URI", ValueKind::kURI, "the metadata"}}};

class AccessMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    if (!FindMetadata()) return Fail();
    const auto uri = Read<URI>("URI");
    catalog::Access(uri);
    Write("URI", uri);
    return Succeed();
  }
};

const CommandFactoryT<AccessMetadataCommand> accessFactory(kAccess);

const CommandDeclaration kQuery{
    "QueryMetadataCommand",
    kGroup,
    "Tells whether there is a value.",
    {kUri, kPath},
    {{"QueryResult", ValueKind::kBoolean, "there is a value, not a container, at the path"}}};

class QueryMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    Write("QueryResult", metadata->Exists(Read<String>("PATH")));
    return Succeed();
  }
};

const CommandFactoryT<QueryMetadataCommand> queryFactory(kQuery);

const CommandDeclaration kQueryNames{
    "QueryNamesMetadataCommand",
    kGroup,
    "Lists the values below a path.",
    {kUri,
     kPath,
     {"DOPRIVATE", Presence::kRequired, ValueKind::kInteger,
      "0 for the public values, else the private ones"}},
    {{"Names", ValueKind::kTextList, "full paths, in order"},
     {"QueryNamesResult", ValueKind::kBoolean,
      "true for an empty path, else whether a value stands at the path itself"}}};

class QueryNamesMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    const auto path = Read<String>("PATH");
    List<String> found;
    if (Read<std::int32_t>("DOPRIVATE") == 0) {
      metadata->GetNames(path, found);
    } else {
      metadata->GetNamesPrivate(path, found);
    }
    Array<String> names{ArrayDims(found.GetCount())};
    std::copy(found.begin(), found.end(), names.begin());
    Write("Names", names);
    Write("QueryNamesResult", path.GetLength() == 0 || metadata->Exists(path));
    return Succeed();
  }
};

const CommandFactoryT<QueryNamesMetadataCommand> queryNamesFactory(kQueryNames);

const CommandDeclaration kGetProperties{
    "GetPropertiesMetadataCommand",
    kGroup,
    "Tells what stands at a path.",
    {kUri, kPath},
    {{"GetPropertiesResult", ValueKind::kBoolean, "there is something; without it nothing follows"},
     {"Type", ValueKind::kInteger,
      "1 uchar, 2 short, 3 int, 4 float, 5 double, 7 string, 12 ushort, 13 uint, 14 long64, 15 "
      "ulong64, 0 undefined, 20 a container"},
     {"Size", ValueKind::kInteger, "elements; of a container, names in it"},
     {"IsArray", ValueKind::kBoolean, "it has rows and columns"},
     {"Rows", ValueKind::kInteger, "0 without"},
     {"Cols", ValueKind::kInteger, "0 without"}}};

class GetPropertiesMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    MetadataProperties properties;
    const bool found = metadata->GetProperties(Read<String>("PATH"), properties);
    Write("GetPropertiesResult", found);
    if (!found) return Succeed();
    Write("Type", properties.typeCode);
    Write("Size", properties.count);
    Write("IsArray", properties.isArray);
    Write("Rows", properties.rows);
    Write("Cols", properties.columns);
    return Succeed();
  }
};

const CommandFactoryT<GetPropertiesMetadataCommand> getPropertiesFactory(kGetProperties);

const CommandDeclaration kGet{
    "GetMetadataCommand",
    kGroup,
    "Gives the value at a path.",
    {kUri, kPath},
    {{"Value", ValueKind::kText, "the value, or the array of its elements; absent without one"},
     {"GetResult", ValueKind::kBoolean, "there is a value"}}};

class GetMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    const auto path = Read<String>("PATH");
    MetadataProperties properties;
    metadata->GetProperties(path, properties);
    const bool found = DispatchMetadataType(properties.typeCode, [&]<typename T>() {
      if (properties.count != 1 || properties.isArray) return Put<Array<T>>(*metadata, path);
      return Put<T>(*metadata, path);
    });
    Write("GetResult", found);
    return Succeed();
  }

  /// Writes what the store holds as a T; false when it holds none, since another thread changed it.
  template <typename T>
  bool Put(const Metadata& metadata, const String& path) {
    T value{};
    bool found = false;
    if constexpr (MetadataScalar<T>) {
      found = metadata.Get(path, value);
    } else {
      found = metadata.GetArray(path, value);
    }
    if (found) Write("Value", value);
    return found;
  }
};

const CommandFactoryT<GetMetadataCommand> getMetadataFactory(kGet);

const CommandDeclaration kSet{
    "SetMetadataCommand",
    kGroup,
    "Stores a value.",
    {kUri,
     kPath,
     {"TYPE", Presence::kRequired, ValueKind::kInteger,
      "type code, see GetPropertiesMetadataCommand"},
     {"SIZE", Presence::kRequired, ValueKind::kInteger, "elements"},
     {"ISARRAY", Presence::kRequired, ValueKind::kInteger,
      "0, with a size below 2, for a single value; else VALUE is an array"},
     {"VALUE", Presence::kOptional, ValueKind::kText, "the value; left out for type 0"}},
    {{"SetResult", ValueKind::kBoolean, "the value is stored"}}};

class SetMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    const auto type = Read<std::int32_t>("TYPE");
    const auto size = Read<std::int32_t>("SIZE");
    const bool isArray = Read<std::int32_t>("ISARRAY") != 0;
    if (type == 0) {
      if (isArray || size > 1) return Fail("a value of type 0 is not an array");
      Write("SetResult", metadata->SetUndefined(Read<String>("PATH"), 0));
      return Succeed();
    }
    bool isKnown = false, isRead = false;
    DispatchMetadataType(static_cast<unsigned>(type), [&]<typename T>() {
      isKnown = true;
      isRead = HasInput("VALUE") &&
               (isArray || size > 1 ? StoreArray<T>(*metadata) : StoreValue<T>(*metadata));
      return true;
    });
    if (!isKnown) return Fail("TYPE is no type of metadata values");
    return isRead ? Succeed() : Fail("VALUE holds no value of the type");
  }

  /// @return false when the text holds no value.
  template <typename T>
  bool StoreValue(Metadata& metadata) {
    T value{};
    if constexpr (std::is_arithmetic_v<T>) {
      std::istringstream in = MakeTextReader(Read<String>("VALUE"));
      if (!ReadNumber(in, value) || !(in >> std::ws).eof()) return false;
    } else {
      value = Read<String>("VALUE");
      if (value.GetData() == nullptr) value = "";
    }
    Write("SetResult", metadata.Set(Read<String>("PATH"), value));
    return true;
  }

  template <typename T>
  bool StoreArray(Metadata& metadata) {
    const auto values = Read<Array<T>>("VALUE");
    if (!values.IsValid() || values.GetCount() == 0) return false;
    Write("SetResult", metadata.SetArray(Read<String>("PATH"), values));
    return true;
  }
};

const CommandFactoryT<SetMetadataCommand> setFactory(kSet);

const CommandDeclaration kRemove{"RemoveMetadataCommand",
                                 kGroup,
                                 "Deletes what stands at a path; nothing when there is nothing.",
                                 {kUri, kPath},
                                 {}};

class RemoveMetadataCommand final : public MetadataCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const MetadataPtr metadata = FindMetadata();
    if (!metadata) return Fail();
    metadata->Remove(Read<String>("PATH"));
    return Succeed();
  }
};

const CommandFactoryT<RemoveMetadataCommand> removeFactory(kRemove);

}  // namespace
}  // namespace lumo
