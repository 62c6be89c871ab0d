#include "tasks/parallel.h"

#include <oneapi/tbb/blocked_range.h>
#include <oneapi/tbb/blocked_range2d.h>
#include <oneapi/tbb/blocked_range3d.h>
#include <oneapi/tbb/parallel_for.h>
#include <oneapi/tbb/parallel_invoke.h>
#include <oneapi/tbb/task_arena.h>

#include "tasks/engine_arena.h"

#if defined(__SANITIZE_THREAD__)
#include <sanitizer/tsan_interface.h>
#define VEXG_TSAN(call) call
#else
#define VEXG_TSAN(call)
#endif

namespace lumo {
namespace {

/// Shows the thread sanitizer the order that oneTBB makes: a loop begins after the work that its
/// caller did before, and the work of its parts comes before the caller's next. Parts have no order
/// among themselves.
class LoopOrder {
 public:
  LoopOrder() { VEXG_TSAN(__tsan_release(&marks_.begin)); }
  ~LoopOrder() { VEXG_TSAN(__tsan_acquire(&marks_.end)); }
  LoopOrder(const LoopOrder&) = delete;
  LoopOrder& operator=(const LoopOrder&) = delete;

  template <typename F>
  void RunPart(const F& part) {
    VEXG_TSAN(__tsan_acquire(&marks_.begin));
    part();
    VEXG_TSAN(__tsan_release(&marks_.end));
  }

 private:
  /// Their addresses stand for the begin and the end; without the sanitizer nobody looks.
  struct Marks {
    char begin = 0, end = 0;
  };
  Marks marks_;
};

/// Hands [begin, end) to `body` piece by piece, with a look at `abort` before each. A piece is at
/// most 1/256 of the whole range, whatever part of it this is.
template <typename I, typename F>
void InPieces(I begin, I end, std::int64_t whole, const AbortFlag* abort, const F& body) {
  if (abort == nullptr) {
    body(begin, end);
    return;
  }
  constexpr std::int64_t kPieces = 256;
  const std::int64_t step = (whole + kPieces - 1) / kPieces;
  for (std::int64_t at = begin; at < end && !abort->IsSet(); at += step) {
    body(static_cast<I>(at), static_cast<I>(std::min<std::int64_t>(at + step, end)));
  }
}

/// Shows oneTBB a loop over one dimension.
template <typename I>
struct TBBParallelFor {
  IParallelFor<I>* loop;
  const AbortFlag* abort;
  LoopOrder* order;

  void operator()(const tbb::blocked_range<I>& range) const {
    order->RunPart([&] {
      InPieces(range.begin(), range.end(), std::int64_t{loop->End()} - loop->Begin(), abort,
               [this](I begin, I end) { loop->Body(begin, end); });
    });
  }
};

/// Shows oneTBB a loop over two dimensions: rows are dimension 0, columns dimension 1.
template <typename I>
struct TBBParallelFor2 {
  IParallelFor2<I>* loop;
  const AbortFlag* abort;
  LoopOrder* order;

  void operator()(const tbb::blocked_range2d<I>& range) const {
    const auto& r0 = range.rows();
    const auto& r1 = range.cols();
    order->RunPart([&] {
      InPieces(r1.begin(), r1.end(), std::int64_t{loop->End1()} - loop->Begin1(), abort,
               [&](I begin, I end) { loop->Body(r0.begin(), r0.end(), begin, end); });
    });
  }
};

/// Shows oneTBB a loop over three dimensions: pages, rows and columns are 0, 1 and 2.
template <typename I>
struct TBBParallelFor3 {
  IParallelFor3<I>* loop;
  const AbortFlag* abort;
  LoopOrder* order;

  void operator()(const tbb::blocked_range3d<I>& range) const {
    const auto& r0 = range.pages();
    const auto& r1 = range.rows();
    const auto& r2 = range.cols();
    order->RunPart([&] {
      InPieces(r1.begin(), r1.end(), std::int64_t{loop->End1()} - loop->Begin1(), abort,
               [&](I begin, I end) {
                 loop->Body(r0.begin(), r0.end(), begin, end, r2.begin(), r2.end());
               });
    });
  }
};

/// Runs `work` in the engine, and keeps this thread from taking up other work while it waits
/// inside.
template <typename Work>
void Isolate(const Work& work) {
  RunInEngine([&work] { tbb::this_task_arena::isolate(work); });
}

}  // namespace

template <typename I>
void RunParallelFor(IParallelFor<I>& loop, unsigned grain, const AbortFlag* abort) {
  if (loop.Begin() >= loop.End()) return;
  const tbb::blocked_range<I> range(loop.Begin(), loop.End(), std::max(grain, 1U));
  LoopOrder order;
  Isolate([&] { tbb::parallel_for(range, TBBParallelFor<I>{&loop, abort, &order}); });
}

template <typename I>
void RunParallelFor2(IParallelFor2<I>& loop, unsigned grain, const AbortFlag* abort) {
  if (loop.Begin0() >= loop.End0() || loop.Begin1() >= loop.End1()) return;
  const unsigned step = std::max(grain, 1U);
  const tbb::blocked_range2d<I> range(loop.Begin0(), loop.End0(), step, loop.Begin1(), loop.End1(),
                                      step);
  LoopOrder order;
  Isolate([&] { tbb::parallel_for(range, TBBParallelFor2<I>{&loop, abort, &order}); });
}

template <typename I>
void RunParallelFor3(IParallelFor3<I>& loop, const AbortFlag* abort) {
  if (loop.Begin0() >= loop.End0() || loop.Begin1() >= loop.End1() ||
      loop.Begin2() >= loop.End2()) {
    return;
  }
  const tbb::blocked_range3d<I> range(loop.Begin0(), loop.End0(), loop.Begin1(), loop.End1(),
                                      loop.Begin2(), loop.End2());
  LoopOrder order;
  Isolate([&] { tbb::parallel_for(range, TBBParallelFor3<I>{&loop, abort, &order}); });
}

void detail::InvokeBoth(WorkRef first, WorkRef second) {
  LoopOrder order;
  RunInEngine(
      [&] { tbb::parallel_invoke([&] { order.RunPart(first); }, [&] { order.RunPart(second); }); });
}

void detail::Isolated(WorkRef work) {
  Isolate(work);
}

template VEXG_EXPORT void RunParallelFor(IParallelFor<unsigned>&, unsigned, const AbortFlag*);
template VEXG_EXPORT void RunParallelFor(IParallelFor<int>&, unsigned, const AbortFlag*);
template VEXG_EXPORT void RunParallelFor2(IParallelFor2<unsigned>&, unsigned, const AbortFlag*);
template VEXG_EXPORT void RunParallelFor2(IParallelFor2<int>&, unsigned, const AbortFlag*);
template VEXG_EXPORT void RunParallelFor3(IParallelFor3<unsigned>&, const AbortFlag*);
template VEXG_EXPORT void RunParallelFor3(IParallelFor3<int>&, const AbortFlag*);

}  // namespace lumo
