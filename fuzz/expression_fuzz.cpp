// Expressions: whatever is read gives the same results for one pixel and for many, and the faults
// of the rest are one line.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "foundation/fault.h"
#include "views/expression.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  lumo::BandNames names({{"", 3}, {"a", 1}});
  if (!names.AddRole("red", "b0") || !names.AddRole("nir", "a_b0")) std::abort();
  const auto all = lumo::ParseExpressions(text, names);
  if (all.empty() && lumo::TakeFault().ToUTF8().find('\n') != std::string::npos) std::abort();
  if (!all.empty() && all.size() != lumo::CountExpressions(text)) std::abort();
  for (const lumo::NamedExpression& named : all) {
    const lumo::Expression& expression = named.expression;
    constexpr std::size_t kCount = 37;
    std::vector<std::vector<double>> planes;
    for (const lumo::BandNames::Band& band : expression.Inputs()) {
      std::vector<double>& plane = planes.emplace_back(kCount);
      for (std::size_t i = 0; i < kCount; ++i) {
        plane[i] = static_cast<double>(i * (band.band + 1)) - 5.0 * band.source;
      }
    }
    lumo::Expression::Scratch scratch(expression);
    const auto evaluate = [&](std::size_t first, std::size_t count, double* result) {
      std::vector<const double*> inputs;
      for (const std::vector<double>& plane : planes) inputs.push_back(plane.data() + first);
      expression.Evaluate(inputs, count, scratch, result);
    };
    double together[kCount], alone = 0;
    evaluate(0, kCount, together);
    for (std::size_t i = 0; i < kCount; ++i) {
      evaluate(i, 1, &alone);
      const bool areSame = alone == together[i] || (alone != alone && together[i] != together[i]);
      if (!areSame) std::abort();
    }
  }
  return 0;
}
