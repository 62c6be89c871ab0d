#include "memory_factory.h"

#include "data/plain_factory.h"
#include "memory_connection.h"

namespace lumo {
namespace {

class MemoryFactory final : public PlainFactory {
 public:
  MemoryFactory() : PlainFactory("MemoryRaster") {}

  /// Only by name: a text of unknown format is not to be taken for the address of a block.
  bool CanConnect(const Array<String>& connStrings) override {
    memory::Description block;
    return FindFormatName(connStrings) == "MemoryRaster" &&
           memory::ReadDescription(connStrings, block);
  }

  DataConnectionPtr CreateRaster(const Array<String>&, const RasterDef&) override {
    return FailWith("a block of memory is opened, not made");
  }

 private:
  DataConnection* Make() override { return new memory::Connection; }
};

}  // namespace

DataConnectionFactory* MakeMemoryFactory() {
  return new MemoryFactory;
}

}  // namespace lumo
