#pragma once

#include <algorithm>

#include <oneapi/tbb/parallel_pipeline.h>
#include <oneapi/tbb/task.h>
#include <oneapi/tbb/task_arena.h>

#include "foundation/library.h"
#include "tasks/engine_arena.h"
#include "tasks/pipeline.h"

namespace lumo {

/// The first filter: gives what the reader gives, and stops the pipeline at null.
template <typename T>
class TBBRPWReader {
 public:
  explicit TBBRPWReader(IPipelineReader<T>& reader) : reader_(&reader) {}

  T* operator()(tbb::flow_control& control) const {
    T* const item = reader_->Next();
    if (item == nullptr) control.stop();
    return item;
  }

 private:
  IPipelineReader<T>* reader_;
};

/// A filter in the middle.
template <typename T, typename U>
class TBBRPWProcessor {
 public:
  explicit TBBRPWProcessor(IPipelineProcess<T, U>& stage) : stage_(&stage) {}

  U* operator()(T* item) const { return stage_->Process(item); }

  tbb::filter_mode Mode() const {
    if (stage_->IsParallel()) return tbb::filter_mode::parallel;
    return stage_->IsOrdered() ? tbb::filter_mode::serial_in_order
                               : tbb::filter_mode::serial_out_of_order;
  }

 private:
  IPipelineProcess<T, U>* stage_;
};

/// The last filter.
template <typename T>
class TBBRPWWriter {
 public:
  explicit TBBRPWWriter(IPipelineWriter<T>& writer) : writer_(&writer) {}

  void operator()(T* item) const { writer_->Write(item); }

 private:
  IPipelineWriter<T>* writer_;
};

template <typename T>
bool RunPipeline(IPipelineReader<T>& reader, std::span<ISimplePipelineProcess<T>* const> stages,
                 IPipelineWriter<T>& writer, unsigned maxTokens) {
  if (maxTokens == 0 || std::ranges::count(stages, nullptr) != 0) return false;
  if (maxTokens >= kDefaultTokens) maxTokens = static_cast<unsigned>(GetProcessingCores());
  reader.SetMaxTokens(maxTokens);

  constexpr auto kInOrder = tbb::filter_mode::serial_in_order;
  auto chain = tbb::make_filter<void, T*>(kInOrder, TBBRPWReader<T>(reader));
  for (ISimplePipelineProcess<T>* const stage : stages) {
    const TBBRPWProcessor<T, T> processor(*stage);
    chain = chain & tbb::make_filter<T*, T*>(processor.Mode(), processor);
  }
  const auto whole = chain & tbb::make_filter<T*, void>(kInOrder, TBBRPWWriter<T>(writer));
  const auto run = [&] { tbb::parallel_pipeline(maxTokens, whole); };
  // Inside a stage or a loop of another run, the wait must take up nothing of that. Elsewhere there
  // is nothing but this pipeline, and the wait helps with the loops of its stages.
  if (tbb::task::current_context() != nullptr) {
    RunInEngine([&] { tbb::this_task_arena::isolate(run); });
  } else {
    RunInEngine(run);
  }
  return true;
}

}  // namespace lumo
