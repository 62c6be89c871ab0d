#pragma once

#include <span>

#include "foundation/pipeline_stages.h"

namespace lumo {

/// A token limit from which on RunPipeline takes the scheduler's own number of threads.
inline constexpr unsigned kDefaultTokens = 0xFFFFFFFE;

/// Runs items from a reader through stages to a writer, with at most `maxTokens` of them in flight,
/// and returns when the reader has given null and the last item was written.
///
/// Reader and writer handle one item at a time, in order. A stage handles several at once when it
/// IsParallel(), else one, in order when it IsOrdered(). Different stages work at the same time, on
/// any worker. While this thread waits it takes part in this run and in nothing else.
///
/// @return false, with nothing run, when a stage is null or `maxTokens` is 0.
/// An exception of a reader, stage or writer ends the run and comes out here.
///
/// Exists for TaskToken; for other items through pipeline_body.h.
template <typename T>
bool RunPipeline(IPipelineReader<T>& reader, std::span<ISimplePipelineProcess<T>* const> stages,
                 IPipelineWriter<T>& writer, unsigned maxTokens);

}  // namespace lumo
