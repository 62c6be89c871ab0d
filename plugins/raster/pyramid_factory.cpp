#include "pyramid_factory.h"

#include "data/plain_factory.h"
#include "pyramid_connection.h"

namespace lumo {
namespace {

class PyramidFactory final : public PlainFactory {
 public:
  PyramidFactory() : PlainFactory("Pyramid") {}

  bool CanConnect(const Array<String>& connStrings) override {
    pyramid::Place place;
    return pyramid::FindPlace(connStrings, place) && pyramid::IsPyramidFile(place.path);
  }

 private:
  DataConnection* Make() override { return new pyramid::Connection; }
};

}  // namespace

DataConnectionFactory* MakePyramidFactory() {
  return new PyramidFactory;
}

}  // namespace lumo
