#include "views/expression.h"

#include <algorithm>

#include "foundation/fault.h"
#include "views/expression_parser.h"

namespace lumo {
namespace {

std::string Trimmed(const std::string& text) {
  const std::size_t first = text.find_first_not_of(' ');
  if (first == std::string::npos) return {};
  return text.substr(first, text.find_last_not_of(' ') - first + 1);
}

/// The pieces between semicolons, control characters as blanks. One behind the last expression ends
/// it.
std::vector<std::string> SplitExpressions(std::string text) {
  for (char& c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7F') c = ' ';
  }
  std::vector<std::string> pieces;
  for (std::size_t start = 0; start <= text.size();) {
    const std::size_t end = std::min(text.find(';', start), text.size());
    pieces.push_back(Trimmed(text.substr(start, end - start)));
    start = end + 1;
  }
  if (pieces.size() > 1 && pieces.back().empty()) pieces.pop_back();
  return pieces;
}

/// Takes "NAME=" off the front of an expression; an empty name where there is none. Nothing, with a
/// fault text, for a name that can't be.
std::optional<std::string> TakeName(std::string& piece, const BandNames& names) {
  const std::size_t sign = piece.find('=');
  const bool isName = sign != std::string::npos && sign != 0 &&
                      (sign + 1 == piece.size() || piece[sign + 1] != '=') &&
                      std::string("<>!=").find(piece[sign - 1]) == std::string::npos;
  if (!isName) return std::string();
  std::string name = Trimmed(piece.substr(0, sign));
  const auto isPart = [](char c) {
    return static_cast<unsigned char>(c) >= 0x80 || BandNames::IsName({'a', c});
  };
  if (names.Find(name)) {
    SetFault(String("\"" + piece + "\", position 1, \"" + name +
                    "\": that is a band, and none can be made; \"==\" compares"));
    return std::nullopt;
  }
  if (name.empty() || !std::all_of(name.begin(), name.end(), isPart)) {
    SetFault(String("\"" + piece + "\", position " + std::to_string(sign + 1) +
                    ", \"=\": in front of it stands a name of letters, digits and underscores; "
                    "\"==\" compares"));
    return std::nullopt;
  }
  piece = Trimmed(piece.substr(sign + 1));
  return name;
}

}  // namespace

std::optional<Expression> Expression::Parse(const std::string& text, const BandNames& names) {
  return ExpressionParser(text, names).Parse();
}

Expression::Scratch::Scratch(const Expression& expression)
    : numbers_((expression.constants_.size() + expression.rows_) * kMostPixels) {
  auto row = numbers_.begin();
  for (const double constant : expression.constants_) row = std::fill_n(row, kMostPixels, constant);
}

void Expression::Evaluate(std::span<const double* const> inputs, std::size_t count,
                          Scratch& scratch, double* result) const {
  double* const constants = scratch.numbers_.data();
  double* const rows = constants + constants_.size() * kMostPixels;
  const auto find = [&](Operand operand) -> const double* {
    switch (operand.kind) {
      case Operand::Kind::kInput:
        return inputs[operand.index];
      case Operand::Kind::kConstant:
        return constants + operand.index * kMostPixels;
      case Operand::Kind::kStep:
        return rows + operand.index * kMostPixels;
      default:
        return nullptr;
    }
  };
  for (const Step& step : steps_) {
    double* const to = &step == &steps_.back() ? result : rows + step.row * kMostPixels;
    ComputeStep(step.op, find(step.operands[0]), find(step.operands[1]), find(step.operands[2]),
                count, to);
  }
  if (steps_.empty()) std::copy_n(find(result_), count, result);
}

std::vector<NamedExpression> ParseExpressions(const std::string& text, const BandNames& names) {
  std::vector<NamedExpression> all;
  for (std::string& piece : SplitExpressions(text)) {
    const std::optional<std::string> name = TakeName(piece, names);
    if (!name) return {};
    std::optional<Expression> expression = Expression::Parse(piece, names);
    if (!expression) return {};
    all.push_back({*name, std::move(*expression)});
  }
  return all;
}

unsigned CountExpressions(const std::string& text) {
  return static_cast<unsigned>(SplitExpressions(text).size());
}

}  // namespace lumo
