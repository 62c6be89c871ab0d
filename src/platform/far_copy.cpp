#include "platform/far_copy.h"

#include <cstdint>
#include <cstring>

#if defined(__SSE2__) && !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
#include <emmintrin.h>
#define VEXG_STREAMS 1
#endif

namespace lumo::platform {

#if defined(VEXG_STREAMS)

void CopyFar(void* to, const void* from, std::size_t bytes) {
  constexpr std::size_t kLine = 64;
  auto* at = static_cast<unsigned char*>(to);
  const auto* source = static_cast<const unsigned char*>(from);
  const std::size_t head = -reinterpret_cast<std::uintptr_t>(to) % kLine;
  if (bytes < head + kLine) {
    std::memcpy(to, from, bytes);
    return;
  }
  std::memcpy(at, source, head);
  at += head;
  source += head;
  bytes -= head;
  for (; bytes >= kLine; bytes -= kLine, at += kLine, source += kLine) {
    const auto* const in = reinterpret_cast<const __m128i*>(source);
    auto* const out = reinterpret_cast<__m128i*>(at);
    const __m128i a = _mm_loadu_si128(in), b = _mm_loadu_si128(in + 1);
    const __m128i c = _mm_loadu_si128(in + 2), d = _mm_loadu_si128(in + 3);
    _mm_stream_si128(out, a);
    _mm_stream_si128(out + 1, b);
    _mm_stream_si128(out + 2, c);
    _mm_stream_si128(out + 3, d);
  }
  std::memcpy(at, source, bytes);
  _mm_sfence();  // whoever is told that the bytes are there sees them
}

#else

void CopyFar(void* to, const void* from, std::size_t bytes) {
  std::memcpy(to, from, bytes);
}

#endif

}  // namespace lumo::platform
