#pragma once

#include "data/data_connection.h"

namespace lumo {

/// The factory of the row "MemoryRaster"; it lives until the process ends.
DataConnectionFactory* MakeMemoryFactory();

}  // namespace lumo
