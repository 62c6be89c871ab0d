#include "orva/orva_factory.h"

#include "data/plain_factory.h"
#include "orva/orva_connection.h"

namespace lumo {
namespace {

class OrvaFactory final : public PlainFactory {
 public:
  OrvaFactory() : PlainFactory("ORVA") {}

  bool CanConnect(const Array<String>& connStrings) override {
    const std::string path = orva::FindPath(connStrings);
    return !path.empty() && orva::HasHeader(path);
  }

 private:
  DataConnection* Make() override { return new orva::Connection; }
};

}  // namespace

DataConnectionFactory* MakeOrvaFactory(FormatRecord&) {
  return new OrvaFactory;
}

}  // namespace lumo
