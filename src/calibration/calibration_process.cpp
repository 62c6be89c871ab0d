#include "calibration/calibration_process_body.h"

namespace lumo {

#define CALIBRATE(TOut, TIn)                                                             \
  template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<TIn>&, \
                          const RasterPtr<TOut>&, const IPC&);
#define CALIBRATE_FROM(TIn) VEXG_EIGHT_WITHIN(CALIBRATE, TIn)
VEXG_FOR(EIGHT, CALIBRATE_FROM);

}  // namespace lumo
