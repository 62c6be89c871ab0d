#pragma once

namespace lumo {

// The three stages of a run, as the job engine and the processes have them. Items are handed from
// stage to stage by raw pointer and belong to whoever made them.

/// The first stage: gives the items one by one.
template <typename T>
class IPipelineReader {
 public:
  /// Bounds the items in flight; a hint that a reader may ignore.
  virtual void SetMaxTokens(unsigned /*tokens*/) {}
  /// The next item; null at the end.
  virtual T* Next() = 0;
  virtual ~IPipelineReader() = default;
};

/// A stage in the middle: makes one item of each that comes.
template <typename T, typename U>
class IPipelineProcess {
 public:
  /// True when several items may be in this stage at once.
  virtual bool IsParallel() const = 0;
  /// True when items must pass in the order in which they were read.
  virtual bool IsOrdered() const = 0;
  /// Makes the item for the next stage, on any worker. Null is no item, and what comes of it is up
  /// to the runner.
  virtual U* Process(T* item) = 0;
  virtual ~IPipelineProcess() = default;
};

/// A stage that hands on the item that it got.
template <typename T>
class ISimplePipelineProcess : public IPipelineProcess<T, T> {};

/// The last stage: takes the items.
template <typename T>
class IPipelineWriter {
 public:
  /// Takes an item out of the pipeline. False when it could not be used.
  virtual bool Write(T* item) = 0;
  virtual ~IPipelineWriter() = default;
};

}  // namespace lumo
