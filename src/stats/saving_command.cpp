#include "stats/saving_command.h"

#include "foundation/fault.h"
#include "stats/turn.h"

namespace lumo {

CommandResult SavingCommand::Execute() {
  if (!CheckInputs()) return Fail();
  const BasicRasterPtr raster = FindRaster();
  if (!raster) return Fail();
  const Turn turn(raster, Read<Waiting>("Wait"), GetIPC());
  TakeFault();
  const bool isStored = Save(*raster);
  const String fault = TakeFault();
  Write("Return", isStored);
  if (!isStored && fault.GetLength() != 0) Write("Fault", fault);
  return Succeed();
}

}  // namespace lumo
