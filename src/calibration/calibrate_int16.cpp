#include "calibration/calibration_process_impl.h"

namespace lumo {

template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::uint8_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::int8_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::uint16_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::int16_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::uint32_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<std::int32_t>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<float>&, const IPC&);
template bool Calibrate(const char*, const CalibrationFormula&, const RasterPtr<std::int16_t>&,
                        const RasterPtr<double>&, const IPC&);

}  // namespace lumo
