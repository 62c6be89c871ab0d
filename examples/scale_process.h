#pragma once

#include "raster/raster_tasks.h"
#include "tasks/parallel_ranges.h"
#include "tasks/process_builder.h"

// A process over a raster, as short as one can be: read a tile, compute on it, write it.

namespace lumo::example {

/// What is done with a scaled value by default: nothing.
struct Keep {
  double operator()(double value) const { return value; }
};

/// output = Op(gain[band] * input + offset[band]) for a stretch of pixels with all their bands; 0
/// where the state says that a pixel is not valid.
template <typename Op, typename TIn, typename TOut>
void ScalePixels(const TIn* in, const unsigned char* state, TOut* out, std::size_t pixels,
                 unsigned bands, const double* gains, const double* offsets) {
  for (std::size_t pixel = 0; pixel < pixels; ++pixel) {
    for (unsigned b = 0; b < bands; ++b, ++in, ++state, ++out) {
      const double value = Op()(gains[b] * static_cast<double>(*in) + offsets[b]);
      *out = (*state & PixelValueState::NotValid) == 0 ? static_cast<TOut>(value) : TOut();
    }
  }
}

/// The loop over the lines of one tile: output = Op(gain[band] * input + offset[band]).
template <typename TIn, typename TOut, typename Op>
class ScaleLoop final : public ArrayParallelFor {
 public:
  ScaleLoop(const Tile<TIn>& input, const Array<double>& gains, const Array<double>& offsets,
            Tile<TOut>& output)
      : ArrayParallelFor(input.Height()),
        input_(input),
        gains_(gains),
        offsets_(offsets),
        output_(output) {
    const unsigned bands = input.Bands();
    if (gains.GetCount() < bands || offsets.GetCount() < bands || !output.IsValid()) Fail();
  }

  void Body(unsigned begin, unsigned end) override {
    if (Failed()) return;
    for (unsigned y = begin; y < end; ++y) {
      const std::size_t at = input_.Offset(0, y);
      ScalePixels<Op>(input_.PixelArray().GetData() + at, input_.StateArray().GetData() + at,
                      output_.PixelArray().GetData() + at, input_.Width(), input_.Bands(),
                      gains_.GetData(), offsets_.GetData());
    }
  }

 private:
  const Tile<TIn>& input_;
  const Array<double>& gains_;
  const Array<double>& offsets_;
  Tile<TOut>& output_;
};

/// The stage between: takes the tile in slot 0 and puts the scaled one in its place. Setup
/// arguments: gains and offsets, arrays of double with an element for each band.
template <typename TIn, typename TOut, typename Op = Keep>
class ScaleTask final : public ConcurrentTask {
 public:
  explicit ScaleTask(ArgList& setup)
      : ConcurrentTask("ScaleTask"),
        gains_(dynamic_cast<Array<double>*>(setup.Get(0).Get())),
        offsets_(dynamic_cast<Array<double>*>(setup.Get(1).Get())) {
    if (gains_ == nullptr || offsets_ == nullptr) SetErrorState(TaskErrorBadParams());
  }

  bool Execute(ArgList& args) override {
    const TilePtr<TIn> input(args.Get(0));
    if (input.IsNull() || !input->IsValid()) {
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
    ScaleLoop<TIn, TOut, Op> loop(*input, *gains_, *offsets_, *output);
    RunParallelFor(loop, 0, GetAbortFlag());
    if (loop.HasError()) {
      SetErrorState(TaskError());
      return false;
    }
    return args.Set(0, output);
  }

 private:
  const Array<double>* gains_;  // the process holds them
  const Array<double>* offsets_;
  TilePool<TOut> pool_;
};

/// Scales a raster into another of the same size, tile by tile.
template <typename TIn, typename TOut, typename Op = Keep>
class ScaleProcess final : public ProcessBuilder<Process> {
 public:
  ScaleProcess(const RasterIteratorPtr<TIn>& input, const Pointer<Array<double>>& gains,
               const Pointer<Array<double>>& offsets, const RasterIteratorPtr<TOut>& output,
               const IPC& ipc = {}, const AsyncCallbackPtr& callback = {})
      : ProcessBuilder("ScaleProcess", ipc, callback) {
    Process& process = GetPipeline();
    const ArgID gainsId = process.TakeSetupArg();
    const ArgID offsetsId = process.TakeSetupArg();
    const ArgID inputId = process.TakeSetupArg();
    const ArgID outputId = process.TakeSetupArg();
    const ArgID tile = process.TakeTokenArg();

    const bool placed =
        process.AddTask(0, TaskDescriptor(&read_, ArgIDs({tile}), ArgIDs({inputId}))) &&
        process.AddTask(1, TaskDescriptor(&scale_, ArgIDs({tile}), ArgIDs({gainsId, offsetsId}))) &&
        process.AddTask(2, TaskDescriptor(&write_, ArgIDs({tile}), ArgIDs({outputId})));
    SetArg(gainsId, gains);
    SetArg(offsetsId, offsets);
    SetArg(inputId, input);
    SetArg(outputId, output);
    process.SetTotalTokens(std::uint64_t{input->Columns()} * input->Rows());
    if (placed) SetBuilt();
  }

 private:
  ManagedTask<RasterReadTask<TIn>> read_;
  ManagedTask<ScaleTask<TIn, TOut, Op>> scale_;
  ManagedTask<RasterWriteTask<TOut>> write_;
};

}  // namespace lumo::example
