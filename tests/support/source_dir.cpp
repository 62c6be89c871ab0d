#include "support/source_dir.h"

namespace lumo::test {

std::string SourceDir() {
  return VEXG_SOURCE_DIR;
}

}  // namespace lumo::test
