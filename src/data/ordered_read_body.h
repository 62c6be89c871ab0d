#pragma once

#include <algorithm>
#include <atomic>
#include <mutex>
#include <optional>
#include <vector>

#include "data/ordered_read.h"
#include "foundation/fault.h"
#include "raster/interleave_lines.h"
#include "raster/pixel_states.h"
#include "tasks/crew.h"

namespace lumo::detail {

/// The bytes of the lines that are read at once: what becomes of them stays in the second cache.
inline constexpr std::size_t kGroupBytes = 256 << 10;

/// Room for the lines that a thread reads at once; states are 0. The thread may keep it.
template <typename T>
struct GroupRoom {
  explicit GroupRoom(std::size_t elements) {
    std::swap(pixels, Kept<T>());
    std::swap(states, Kept<unsigned char>());
    if (pixels.size() < elements) pixels.resize(elements);
    if (states.size() < elements) states.resize(elements);
  }
  /// Keeps the room for the next lines, when the states are 0 as before.
  void Keep() {
    if (pixels.size() * sizeof(T) > 4 * kGroupBytes) return;
    std::swap(pixels, Kept<T>());
    std::swap(states, Kept<unsigned char>());
  }

  std::vector<T> pixels;
  std::vector<unsigned char> states;

 private:
  template <typename E>
  static std::vector<E>& Kept() {
    thread_local std::vector<E> kept;
    return kept;
  }
};

/// Reads a block from a ConcurrentReads in an order that isn't its own, on this thread and those of
/// the crew. All pixels are written; states are made by the first lines that have some.
template <typename T>
bool ReadInOrder(RasterReader<T>& reader, const SubRect& rect, const Array<unsigned>& bands,
                 unsigned level, Interleave order, T* pixels, BlockStates& states) {
  const Interleave native = reader.NativeInterleave();
  const std::size_t width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const std::size_t lineElements = width * count;
  const std::size_t most = std::max(kGroupBytes / (lineElements * sizeof(T)), std::size_t{1});
  const std::size_t perGroup = std::min(most, height);
  const auto groups = static_cast<unsigned>((height + perGroup - 1) / perGroup);
  auto* const orders = dynamic_cast<OrderedReads<T>*>(&reader);
  std::atomic<bool> isRead{true};
  String fault;
  std::mutex faultLock;
  RunByCrew(groups, [&](unsigned group) {
    if (!isRead) return;
    const LinesOfBlock part{group * perGroup, std::min(perGroup, height - group * perGroup),
                            height};
    const std::size_t elements = part.count * lineElements;
    GroupRoom<T> room(elements);
    const unsigned top = rect.top + static_cast<unsigned>(part.first);
    const auto lines = static_cast<unsigned>(part.count);
    Array<unsigned char> ownStates;
    BlockStates madeStates(ownStates);
    std::optional<bool> isGroupRead;
    if (orders != nullptr) {
      isGroupRead = orders->ReadOrdered({rect.left, top, rect.right, top + lines - 1}, bands, level,
                                        native, room.pixels.data(), madeStates);
    }
    const bool hasNone = isGroupRead && !madeStates.AreMade();
    if (!isGroupRead) {
      isGroupRead = reader.ReadPixels(rect.left, top, rect.Width(), lines, bands, level,
                                      room.pixels.data(), room.states.data());
    }
    if (!*isGroupRead) {
      const std::lock_guard lock(faultLock);
      if (isRead.exchange(false)) fault = TakeFault();
      return;
    }
    ConvertLines(room.pixels.data(), native, part, pixels, order, width, count, sizeof(T));
    const unsigned char* const found =
        madeStates.AreMade() ? ownStates.GetData() : room.states.data();
    if (hasNone || !AnyHasState(found, elements, 0xFF)) return room.Keep();
    unsigned char* const state = states.Make(order, rect.Width(), rect.Height(), bands.GetCount());
    if (state == nullptr) {
      isRead = false;
    } else {
      ConvertLines(found, native, part, state, order, width, count, 1);
    }
  });
  if (!isRead && fault.GetLength() != 0) SetFault(fault);
  return isRead;
}

/// Reads a block as far as the reader needs no help to put it in order. All pixels are written.
/// @return nothing, with no states made, where it does.
template <typename T>
std::optional<bool> ReadAsked(RasterReader<T>& reader, const SubRect& rect,
                              const Array<unsigned>& bands, unsigned level, Interleave order,
                              T* pixels, BlockStates& states) {
  if (auto* const orders = dynamic_cast<OrderedReads<T>*>(&reader)) {
    const auto isRead = orders->ReadOrdered(rect, bands, level, order, pixels, states);
    if (isRead) return isRead;
  }
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const Interleave native = reader.NativeInterleave();
  if (native == order || count == 1) {
    unsigned char* const state = states.Make(order, width, height, count);
    return state != nullptr &&
           reader.ReadPixels(rect.left, rect.top, width, height, bands, level, pixels, state);
  }
  if (native == Interleave::None || dynamic_cast<ConcurrentReads*>(&reader) == nullptr) return {};
  return ReadInOrder(reader, rect, bands, level, order, pixels, states);
}

}  // namespace lumo::detail
