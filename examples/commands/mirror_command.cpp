// A command that makes a view: a declaration, a class of one line, and a factory.

#include "../mirrored_raster.h"
#include "views/view_command.h"

namespace lumo::example {
namespace {

const CommandDeclaration kMirror{"ExampleMirrorCommand",
                                 "Examples",
                                 "Shows a raster mirrored left to right.",
                                 {SourceInput()},
                                 PublishedOutputs()};

class ExampleMirrorCommand final : public ViewCommand {
  CommandResult Execute() override { return PublishView<MirroredRaster>(); }
};

const CommandFactoryT<ExampleMirrorCommand> exampleMirrorFactory(kMirror);

}  // namespace
}  // namespace lumo::example
