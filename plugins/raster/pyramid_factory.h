#pragma once

#include "data/data_connection.h"

namespace lumo {

/// The factory of the row "Pyramid"; it lives until the process ends.
DataConnectionFactory* MakePyramidFactory();

}  // namespace lumo
