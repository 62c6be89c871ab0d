#include <algorithm>

#include "commands/command.h"
#include "fx/class_samples.h"

namespace lumo {
namespace {

const CommandDeclaration kSamples{
    "QueryClassSamplesCommand",
    "Feature extraction",
    "Tells the classes of the samples in a vector file. A command of this library's own.",
    {{"Vectors", Presence::kRequired, ValueKind::kText, "the file of samples, of any shape"},
     {"ClassField", Presence::kRequired, ValueKind::kText, "the field with the class of a sample"},
     {"Layer", Presence::kOptional, ValueKind::kText,
      "a layer of the file, by its name or its number from 0; the first when absent"},
     {"Where", Presence::kOptional, ValueKind::kText,
      "FIELD=VALUE: only records with that value; all when absent"}},
    {{"Classes", ValueKind::kTextList, "the names of the classes, numbers in front of texts"},
     {"Counts", ValueKind::kIntegerArray, "the samples of each"}}};

class QueryClassSamplesCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const SampleSource source{Read<String>("Vectors").ToUTF8(), Read<String>("Layer").ToUTF8(),
                              Read<String>("Where").ToUTF8(), Read<String>("ClassField").ToUTF8()};
    ClassSamples samples;
    if (!ReadClassSamples(source, GetIPC(), samples)) return Fail();
    const std::vector<std::string> names = OrderClassNames(samples.classes);
    const auto count = static_cast<unsigned>(names.size());
    Array<String> classes{ArrayDims(count)};
    Array<unsigned> counts{ArrayDims(count)};
    for (unsigned i = 0; i < count; ++i) {
      classes[i] = String(names[i]);
      counts[i] = static_cast<unsigned>(
          std::count(samples.classes.begin(), samples.classes.end(), names[i]));
    }
    Write("Classes", classes);
    Write("Counts", counts);
    return Succeed();
  }
};

const CommandFactoryT<QueryClassSamplesCommand> queryClassSamplesFactory(kSamples);

}  // namespace
}  // namespace lumo
