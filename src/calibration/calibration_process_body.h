#pragma once

#include <algorithm>
#include <vector>

#include "calibration/calibration_process.h"
#include "calibration/value_conversion.h"
#include "foundation/fault.h"
#include "raster/raster_tasks.h"
#include "tasks/parallel_ranges.h"
#include "tasks/process_builder.h"

namespace lumo::detail {

/// What a calibrating task needs; it outlives the process.
template <typename TOut>
struct CalibrationPlan : Object {
  const CalibrationFormula* formula = nullptr;
  std::vector<TOut> fill;  ///< for each band, what stands where nothing is computed
};

/// The lines of one tile.
template <typename TIn, typename TOut>
class CalibrationLoop final : public ArrayParallelFor {
 public:
  CalibrationLoop(const Tile<TIn>& input, const CalibrationPlan<TOut>& plan, Tile<TOut>& output)
      : ArrayParallelFor(input.Height()), input_(input), plan_(plan), output_(output) {
    if (!input.IsValid() || !output.IsValid() || input.Bands() != plan.formula->Bands()) Fail();
  }

  void Body(unsigned begin, unsigned end) override {
    if (Failed()) return;
    const std::size_t bands = input_.Bands(), atOnce = plan_.formula->PixelsAtOnce();
    std::vector<double> values(atOnce * bands);
    for (unsigned y = begin; y < end; ++y) {
      for (std::size_t x = 0; x < input_.Width(); x += atOnce) {
        const std::size_t pixels = std::min<std::size_t>(atOnce, input_.Width() - x);
        Compute(input_.Offset(static_cast<std::int64_t>(x), y), pixels, values.data());
      }
    }
  }

 private:
  void Compute(std::size_t at, std::size_t pixels, double* values) {
    const std::size_t count = pixels * input_.Bands();
    TOut* const out = output_.PixelArray().GetData() + at;
    ToDoubles(input_.PixelArray().GetData() + at, values, count);
    plan_.formula->Apply(values, pixels);
    FromDoubles(values, out, count);
    FillInvalid(input_.StateArray().GetData() + at, out, pixels);
  }

  void FillInvalid(const unsigned char* state, TOut* out, std::size_t pixels) const {
    const std::size_t bands = input_.Bands(), count = pixels * bands;
    unsigned char any = 0;
    for (std::size_t i = 0; i < count; ++i) any |= state[i];
    if ((any & PixelValueState::NotValid) == 0) return;
    for (std::size_t pixel = 0, i = 0; pixel < pixels; ++pixel) {
      for (std::size_t band = 0; band < bands; ++band, ++i) {
        if ((state[i] & PixelValueState::NotValid) != 0) out[i] = plan_.fill[band];
      }
    }
  }

  const Tile<TIn>& input_;
  const CalibrationPlan<TOut>& plan_;
  Tile<TOut>& output_;
};

/// Takes the tile in slot 0 and puts the computed one in its place. Setup arguments: the plan.
template <typename TIn, typename TOut>
class CalibrationTask final : public ConcurrentTask {
 public:
  explicit CalibrationTask(ArgList& setup)
      : ConcurrentTask("CalibrationTask"),
        plan_(dynamic_cast<CalibrationPlan<TOut>*>(setup.Get(0).Get())) {
    if (plan_ == nullptr) SetErrorState(TaskErrorBadParams());
  }

  bool Execute(ArgList& args) override {
    const TilePtr<TIn> input(args.Get(0));
    if (!input || !input->IsValid()) {
      SetErrorState(TaskErrorBadArgs());
      return false;
    }
    const TilePtr<TOut> output = pool_.Take();
    if (output->Resize(input->Dimensions())) {
      output->SetIndex(input->Index());
      output->SetOrigin(input->Origin());
      std::copy_n(input->StateArray().begin(), input->StateArray().GetCount(),
                  output->StateArray().begin());
    }
    CalibrationLoop<TIn, TOut> loop(*input, *plan_, *output);
    RunParallelFor(loop, 0, GetAbortFlag());
    if (loop.HasError()) {
      SetErrorState(TaskError());
      return false;
    }
    return args.Set(0, output);
  }

 private:
  const CalibrationPlan<TOut>* plan_;  // the process holds it
  TilePool<TOut> pool_;
};

template <typename TIn, typename TOut>
class CalibrationProcess final : public ProcessBuilder<Process> {
 public:
  CalibrationProcess(const char* name, const RasterIteratorPtr<TIn>& source,
                     const Pointer<CalibrationPlan<TOut>>& plan,
                     const RasterIteratorPtr<TOut>& target, const IPC& ipc)
      : ProcessBuilder(name, ipc) {
    Process& process = GetPipeline();
    const ArgID sourceId = process.TakeSetupArg();
    const ArgID planId = process.TakeSetupArg();
    const ArgID targetId = process.TakeSetupArg();
    const ArgID tile = process.TakeTokenArg();
    const bool placed =
        process.AddTask(0, TaskDescriptor(&read_, ArgIDs({tile}), ArgIDs({sourceId}))) &&
        process.AddTask(1, TaskDescriptor(&calibrate_, ArgIDs({tile}), ArgIDs({planId}))) &&
        process.AddTask(2, TaskDescriptor(&write_, ArgIDs({tile}), ArgIDs({targetId})));
    SetArg(sourceId, source);
    SetArg(planId, plan);
    SetArg(targetId, target);
    process.SetTotalTokens(std::uint64_t{source->Columns()} * source->Rows());
    if (placed) SetBuilt();
  }

 private:
  ManagedTask<RasterReadTask<TIn>> read_;
  ManagedTask<CalibrationTask<TIn, TOut>> calibrate_;
  ManagedTask<RasterWriteTask<TOut>> write_;
};

inline bool CheckFit(const BasicRaster& source, const BasicRaster& target,
                     const CalibrationFormula& formula) {
  if (formula.Bands() != source.Bands()) {
    SetFault("there are constants for " + std::to_string(formula.Bands()) +
             " bands, and the raster has " + std::to_string(source.Bands()));
    return false;
  }
  if (source.Samples() == target.Samples() && source.Lines() == target.Lines() &&
      source.Bands() == target.Bands() && target.CanWrite()) {
    return true;
  }
  SetFault(target.CanWrite() ? "CalibratedURI: the raster has another size or number of bands"
                             : "CalibratedURI: the raster can't be written");
  return false;
}

}  // namespace lumo::detail

namespace lumo {

template <typename TIn, typename TOut>
bool Calibrate(const char* name, const CalibrationFormula& formula, const RasterPtr<TIn>& source,
               const RasterPtr<TOut>& target, const IPC& ipc) {
  if (!source || !target || !detail::CheckFit(*source, *target, formula)) return false;
  const Pointer<detail::CalibrationPlan<TOut>> plan(new detail::CalibrationPlan<TOut>);
  plan->formula = &formula;
  for (unsigned band = 0; band < source->Bands(); ++band) {
    plan->fill.push_back(target->HasNoDataValue(band) ? target->NoDataValue(band) : TOut());
  }
  const RasterIteratorPtr<TIn> from(new RasterIteratorWide<TIn>(source));
  const RasterIteratorPtr<TOut> to(new RasterIteratorFromTemplateSpatial<TOut>(target, *from));
  detail::CalibrationProcess<TIn, TOut> process(name, from, plan, to, ipc);
  return process.RunProcess(process.kHere);
}

}  // namespace lumo
