#pragma once

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <type_traits>
#include <utility>
#include <vector>

#include "foundation/fault.h"
#include "foundation/run_controls.h"
#include "tasks/task_errors.h"

// Parallel loops over ranges. A body says how large its range is and what to do with a part of it;
// a runner hands the parts to the engine's threads and returns when all are done. Bodies are plain
// objects on the caller's stack.
//
// Parts run on any thread, at the same time, on ranges that do not overlap; a body writes only what
// belongs to its part. While the caller waits it takes part in this loop and in nothing else, so it
// may hold a lock that other stages want.
//
// `abort`, where it is given, is looked at before each part, and the parts are cut so that one is
// at most about 1/256 of the range (of a reduction 1/64). When it rises the rest is left out; the
// result is then of no use, which the caller sees by the flag.
//
// An exception of a body ends the loop and comes out of the runner.
//
// A loop that is a function needs none of the classes:
//
//     ParallelFor(lines, ipc.abort.Get(), [&](unsigned line) { Sharpen(image, line); });
//
// One that reduces says how parts are made and joined:
//
//     struct Largest final : ArrayParallelReduce<float> {  // see parallel_ranges.h
//       explicit Largest(const Array<float>& a) : CountedRange(a.GetCount()), values(a) {}
//       float Identity() override { return -INFINITY; }
//       void Join(float& left, const float& right) override { left = std::max(left, right); }
//       float Accumulate(unsigned begin, unsigned end) override {
//         return *std::max_element(values.begin() + begin, values.begin() + end);
//       }
//       const Array<float>& values;
//     } loop(values);
//     float largest = 0;
//     RunParallelReduce(loop, largest);

namespace lumo {

/// A loop over begin <= i < end. Begin and End are asked before the loop and do not change
/// meanwhile.
template <typename I>
class IParallelFor {
 public:
  virtual I Begin() const = 0;
  virtual I End() const = 0;
  /// Works on a part of the range, the end excluded.
  virtual void Body(I begin, I end) = 0;
  virtual ~IParallelFor() = default;
};

/// A loop over a rectangle of indices. Dimension 1 is the slower one in memory where it matters.
template <typename I>
class IParallelFor2 {
 public:
  virtual I Begin0() const = 0;
  virtual I Begin1() const = 0;
  virtual I End0() const = 0;
  virtual I End1() const = 0;
  /// Works on a part of the rectangle, both ends excluded.
  virtual void Body(I begin0, I end0, I begin1, I end1) = 0;
  virtual ~IParallelFor2() = default;
};

/// A loop over a box of indices; of a block of pixels dimension 0 is samples, 1 lines and 2 bands.
template <typename I>
class IParallelFor3 {
 public:
  virtual I Begin0() const = 0;
  virtual I Begin1() const = 0;
  virtual I Begin2() const = 0;
  virtual I End0() const = 0;
  virtual I End1() const = 0;
  virtual I End2() const = 0;
  /// Works on a part of the box, all ends excluded.
  virtual void Body(I begin0, I end0, I begin1, I end1, I begin2, I end2) = 0;
  virtual ~IParallelFor3() = default;
};

/// A reduction over begin <= i < end. Results of parts are joined left to right, so Join need not
/// be commutative.
template <typename R, typename I>
class IParallelReduce {
 public:
  virtual I Begin() const = 0;
  virtual I End() const = 0;
  /// The result of an empty part: joined to another, it changes nothing.
  virtual R Identity() = 0;
  /// Joins the result of the part that follows `left` to it.
  virtual void Join(R& left, const R& right) = 0;
  /// The result of a part, on any worker.
  virtual R Accumulate(I begin, I end) = 0;
  virtual ~IParallelReduce() = default;
};

/// A reduction over a rectangle of indices; dimension 1 is the slower one in memory.
template <typename R, typename I>
class IParallelReduce2 {
 public:
  virtual I Begin0() const = 0;
  virtual I Begin1() const = 0;
  virtual I End0() const = 0;
  virtual I End1() const = 0;
  virtual R Identity() = 0;
  virtual void Join(R& left, const R& right) = 0;
  /// The result of a part of the rectangle, on any worker.
  virtual R Accumulate(I begin0, I end0, I begin1, I end1) = 0;
  virtual ~IParallelReduce2() = default;
};

/// A prefix scan over begin <= i < end: each element sees the joined result of all before it, as in
/// a running sum. A scan reads its data twice.
template <typename R, typename I>
class IParallelScan {
 public:
  virtual I Begin() const = 0;
  virtual I End() const = 0;
  /// The sum in front of the first element.
  virtual R Identity() = 0;
  /// Joins the sum of the part that follows to `sum`.
  virtual void Join(R& sum, const R& right) = 0;
  /// Sets `sum` to `value`.
  virtual void Assign(R& sum, const R& value) = 0;
  /// Writes the results of a part to which everything before adds up to `sum`. Gives the new sum.
  virtual R FinalScan(I begin, I end, const R& sum) = 0;
  /// Adds a part to `sum` and writes nothing. Gives the new sum.
  virtual R PreScan(I begin, I end, const R& sum) = 0;
  virtual ~IParallelScan() = default;
};

/// Notes that the data of a loop are of no use. A constructor or a body calls Fail(); bodies begin
/// with a look at Failed() and do nothing when it is set, and a reduction gives its identity. After
/// the runner has returned the caller finds ParallelError here, and must not use the result; with
/// Close() it also gets the fault text that the first failure set, on whichever thread.
/// Threads: Fail and Failed may be called on any; the error state is for after the loop.
class VEXG_EXPORT ParallelResult : public ErrorState {
 public:
  ParallelResult() = default;
  ParallelResult(const ParallelResult&) = delete;
  ParallelResult& operator=(const ParallelResult&) = delete;

  /// True once some part has failed, on whichever thread.
  bool Failed() const { return failed_; }
  /// Notes a failure, and takes the fault text off this thread. Only the first one counts.
  void Fail() {
    if (failed_.exchange(true)) return;
    fault_ = TakeFault();
    SetErrorState(ParallelError());
  }
  /// Sets on this thread the fault text that the first failure left. @return true when nothing
  /// failed.
  bool Close() const {
    if (fault_.GetLength() != 0) SetFault(fault_);
    return !HasError();
  }

 private:
  std::atomic<bool> failed_{false};
  String fault_;
};

/// Runs the parts of a loop, and returns when all are done. I is unsigned or int. An empty range
/// calls nothing.
/// @param grain  bounds how finely the range is cut; 0 leaves it to the engine.
/// @param abort  leaves out the parts that have not begun when it rises; null for none.
template <typename I>
void RunParallelFor(IParallelFor<I>& loop, unsigned grain = 0, const AbortFlag* abort = nullptr);
/// Runs the parts of a loop over a rectangle. The same grain holds for both dimensions.
template <typename I>
void RunParallelFor2(IParallelFor2<I>& loop, unsigned grain = 0, const AbortFlag* abort = nullptr);
/// Runs the parts of a loop over a box, which the engine cuts as it sees fit.
template <typename I>
void RunParallelFor3(IParallelFor3<I>& loop, const AbortFlag* abort = nullptr);

extern template void RunParallelFor(IParallelFor<unsigned>&, unsigned, const AbortFlag*);
extern template void RunParallelFor(IParallelFor<int>&, unsigned, const AbortFlag*);
extern template void RunParallelFor2(IParallelFor2<unsigned>&, unsigned, const AbortFlag*);
extern template void RunParallelFor2(IParallelFor2<int>&, unsigned, const AbortFlag*);
extern template void RunParallelFor3(IParallelFor3<unsigned>&, const AbortFlag*);
extern template void RunParallelFor3(IParallelFor3<int>&, const AbortFlag*);

namespace detail {

/// A reference to a callable without arguments, which outlives it.
class WorkRef {
 public:
  template <typename F>
  WorkRef(F& work) : object_(&work), call_([](void* object) { (*static_cast<F*>(object))(); }) {}
  void operator()() const { call_(object_); }

 private:
  void* object_;
  void (*call_)(void*);
};

/// Runs both, perhaps at the same time, and returns when both are done.
VEXG_EXPORT void InvokeBoth(WorkRef first, WorkRef second);
/// Runs `work`, and keeps this thread from taking up other work while it waits inside.
VEXG_EXPORT void Isolated(WorkRef work);

/// The range [begin, end) of one dimension, in 64 bits.
struct Extent {
  std::int64_t begin = 0;
  std::int64_t end = 0;
  std::int64_t Size() const { return end - begin; }
};

/// How many parts a reduction is cut into at most, whatever the number of threads.
inline constexpr std::int64_t kReduceParts = 64;

/// Accumulates a rectangle into `into`, which holds an identity. The cut depends on the size of the
/// range alone, and joins follow the cut, so the result has the same bits for any number of
/// threads. Rows (dimension 1) are cut first, as they are the slower ones in memory.
template <typename R, typename Join, typename Accumulate, typename Identity>
void Reduce(Extent columns, Extent rows, std::int64_t parts, const Join& join,
            const Accumulate& accumulate, const Identity& identity, R& into) {
  const bool cutRows = rows.Size() > 1;
  Extent& cut = cutRows ? rows : columns;
  if (parts <= 1 || cut.Size() <= 1) {
    join(into, accumulate(columns, rows));
    return;
  }
  Extent behind = cut;
  behind.begin = cut.end = cut.begin + cut.Size() / 2;
  const Extent secondColumns = cutRows ? columns : behind;
  const Extent secondRows = cutRows ? behind : rows;
  R right = identity();
  auto first = [&] { Reduce(columns, rows, parts / 2, join, accumulate, identity, into); };
  auto second = [&] {
    Reduce(secondColumns, secondRows, parts - parts / 2, join, accumulate, identity, right);
  };
  InvokeBoth(first, second);
  join(into, right);
}

}  // namespace detail

/// Joins what the parts of a rectangle give; `out` is the identity for an empty one. The result has
/// the same bits from run to run and for any number of threads.
template <typename R, typename I>
void RunParallelReduce2(IParallelReduce2<R, I>& loop, R& out, const AbortFlag* abort = nullptr) {
  const detail::Extent columns{loop.Begin0(), loop.End0()};
  const detail::Extent rows{loop.Begin1(), loop.End1()};
  out = loop.Identity();
  if (columns.Size() <= 0 || rows.Size() <= 0) return;
  const auto join = [&](R& left, const R& right) { loop.Join(left, right); };
  const auto identity = [&] { return loop.Identity(); };
  const auto accumulate = [&](detail::Extent c, detail::Extent r) {
    if (abort != nullptr && abort->IsSet()) return loop.Identity();
    return loop.Accumulate(static_cast<I>(c.begin), static_cast<I>(c.end), static_cast<I>(r.begin),
                           static_cast<I>(r.end));
  };
  auto run = [&] {
    detail::Reduce(columns, rows, detail::kReduceParts, join, accumulate, identity, out);
  };
  detail::Isolated(run);
}

/// Joins the results of the parts of a range, as RunParallelReduce2 does over two dimensions.
template <typename R, typename I>
void RunParallelReduce(IParallelReduce<R, I>& loop, R& out, const AbortFlag* abort = nullptr) {
  const detail::Extent range{loop.Begin(), loop.End()};
  out = loop.Identity();
  if (range.Size() <= 0) return;
  const auto join = [&](R& left, const R& right) { loop.Join(left, right); };
  const auto identity = [&] { return loop.Identity(); };
  const auto accumulate = [&](detail::Extent c, detail::Extent) {
    if (abort != nullptr && abort->IsSet()) return loop.Identity();
    return loop.Accumulate(static_cast<I>(c.begin), static_cast<I>(c.end));
  };
  auto run = [&] {
    detail::Reduce(range, {0, 1}, detail::kReduceParts, join, accumulate, identity, out);
  };
  detail::Isolated(run);
}

/// Calls `body(i)` for the numbers below `count`, or `body(begin, end)` for parts of them, on any
/// thread: RunParallelFor for a loop that is a function.
/// @param abort  as for RunParallelFor; null for none.
template <typename F>
void ParallelFor(unsigned count, const AbortFlag* abort, const F& body) {
  struct Loop final : IParallelFor<unsigned> {
    Loop(unsigned end, const F& f) : count(end), call(f) {}
    unsigned Begin() const override { return 0; }
    unsigned End() const override { return count; }
    void Body(unsigned begin, unsigned end) override {
      if constexpr (std::is_invocable_v<const F&, unsigned, unsigned>) {
        call(begin, end);
      } else {
        for (unsigned i = begin; i < end; ++i) call(i);
      }
    }
    unsigned count;
    const F& call;
  } loop(count, body);
  RunParallelFor(loop, 0, abort);
}

/// Scans in two passes over the same parts, PreScan and then FinalScan; `sum` is the total, the
/// identity for an empty range. The result has the same bits for any number of threads.
template <typename R, typename I>
void RunParallelScan(IParallelScan<R, I>& loop, R& sum) {
  loop.Assign(sum, loop.Identity());
  const std::int64_t size = std::int64_t{loop.End()} - loop.Begin();
  if (size <= 0) return;
  const auto parts = static_cast<unsigned>(std::min(size, detail::kReduceParts));
  const auto start = [&](unsigned part) {
    return static_cast<I>(loop.Begin() + size * part / parts);
  };
  struct Part {
    R sum;
  };
  std::vector<Part> before(parts, Part{loop.Identity()});  // what stands in front of each part
  ParallelFor(parts - 1, nullptr, [&](unsigned part) {
    before[part + 1].sum = loop.PreScan(start(part), start(part + 1), loop.Identity());
  });
  for (unsigned part = 1; part < parts; ++part) {
    R total = before[part - 1].sum;
    loop.Join(total, before[part].sum);
    before[part].sum = std::move(total);
  }
  ParallelFor(parts, nullptr, [&](unsigned part) {
    R end = loop.FinalScan(start(part), start(part + 1), before[part].sum);
    if (part == parts - 1) loop.Assign(sum, end);
  });
}

}  // namespace lumo
