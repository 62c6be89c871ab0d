#include "views/expression_parser.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>

#include "foundation/fault.h"
#include "foundation/text_case.h"

namespace lumo {
namespace {

using Op = ExpressionOp;

struct FunctionRow {
  const char* name;
  Op op;
  unsigned operands;
  bool takesMore = false;  ///< computed from the left, two at a time
};

constexpr FunctionRow kFunctions[] = {
    {"abs", Op::kAbs, 1},       {"acos", Op::kAcos, 1},     {"asin", Op::kAsin, 1},
    {"atan", Op::kAtan, 1},     {"atan2", Op::kAtan2, 2},   {"ceil", Op::kCeil, 1},
    {"cos", Op::kCos, 1},       {"exp", Op::kExp, 1},       {"floor", Op::kFloor, 1},
    {"log", Op::kLog, 1},       {"log10", Op::kLog10, 1},   {"log2", Op::kLog2, 1},
    {"max", Op::kMax, 2, true}, {"min", Op::kMin, 2, true}, {"pow", Op::kPow, 2},
    {"round", Op::kRound, 1},   {"sin", Op::kSin, 1},       {"sqrt", Op::kSqrt, 1},
    {"tan", Op::kTan, 1},       {"where", Op::kWhere, 3}};

struct IndexRow {
  const char* name;
  std::vector<std::string> roles;
  const char* formula;
};

const std::vector<IndexRow>& Indices() {
  static const std::vector<IndexRow> rows{
      {"ndvi", {"nir", "red"}, "(nir-red)/(nir+red)"},
      {"ndwi", {"green", "nir"}, "(green-nir)/(green+nir)"},
      {"savi", {"nir", "red"}, "1.5*(nir-red)/(nir+red+0.5)"},
      {"evi", {"nir", "red", "blue"}, "2.5*(nir-red)/(nir+6*red-7.5*blue+1)"}};
  return rows;
}

bool IsNamePart(char c) {
  return BandNames::IsName({'a', c});
}

/// Signs, those of two characters first.
constexpr const char* kSigns[] = {"||", "&&", "<=", ">=", "==", "!=", "**", "+", "-",
                                  "*",  "/",  "^",  "(",  ")",  "<",  ">",  ",", "!"};

}  // namespace

ExpressionParser::ExpressionParser(const std::string& text, const BandNames& names)
    : shown_(text), names_(names), text_(text) {}

std::optional<Expression> ExpressionParser::Parse() {
  Next();
  made_.result_ = ParseOr();
  if (fault_.empty() && token_.kind != Token::Kind::kEnd) {
    Fault(token_, token_.text == ")" ? "there is no \"(\" for it" : "an operator is missing here");
  }
  if (!fault_.empty()) {
    SetFault(fault_);
    return std::nullopt;
  }
  KeepUsedConstants();
  return std::move(made_);
}

/// Drops the constants that others were computed from.
void ExpressionParser::KeepUsedConstants() {
  std::vector<double> used;
  const auto keep = [&](Operand& operand) {
    if (operand.kind != Operand::Kind::kConstant) return;
    used.push_back(made_.constants_[operand.index]);
    operand.index = static_cast<unsigned>(used.size() - 1);
  };
  for (Expression::Step& step : made_.steps_) {
    for (Operand& operand : step.operands) keep(operand);
  }
  keep(made_.result_);
  made_.constants_ = std::move(used);
}

void ExpressionParser::Fault(Token token, const std::string& why) {
  at_ = text_.size();
  token_ = {Token::Kind::kEnd, at_, {}, 0};
  if (!fault_.empty()) return;
  const auto isStart = [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; };
  const auto position = std::count_if(shown_.begin(), shown_.begin() + std::ptrdiff_t(token.at),
                                      isStart);  // characters, not bytes
  constexpr std::ptrdiff_t kMostShown = 200;
  std::ptrdiff_t end = std::min(std::ssize(shown_), kMostShown);
  while (end < std::ssize(shown_) && !isStart(shown_[std::size_t(end)])) ++end;
  const std::string shown(shown_.begin(), shown_.begin() + end);
  fault_ = "\"" + shown + (end < std::ssize(shown_) ? "...\"" : "\"") + ", position " +
           std::to_string(position + 1) + ", " +
           (token.text.empty() ? "the end" : "\"" + token.text + "\"") + ": " + why;
}

void ExpressionParser::Next() {
  while (at_ < text_.size() && (text_[at_] == ' ' || text_[at_] == '\t')) ++at_;
  token_ = {Token::Kind::kEnd, at_, {}, 0};
  if (at_ == text_.size()) return;
  const char* const begin = text_.data() + at_;
  const char* const end = text_.data() + text_.size();
  const bool isNumber = (*begin >= '0' && *begin <= '9') || *begin == '.';
  std::size_t length = 0;
  if (isNumber) {
    const auto [behind, fault] = std::from_chars(begin, end, token_.number);
    length = std::max<std::size_t>(static_cast<std::size_t>(behind - begin), 1);
    const bool isWhole = fault == std::errc() && (behind == end || !IsNamePart(*behind));
    while (begin + length < end && IsNamePart(begin[length])) ++length;
    token_ = {Token::Kind::kNumber, at_, std::string(begin, length), token_.number};
    if (!isWhole) return Fault(token_, "it is no number");
  } else if (BandNames::IsName(std::string(1, *begin))) {
    while (begin + length < end && IsNamePart(begin[length])) ++length;
    token_ = {Token::Kind::kName, at_, std::string(begin, length), 0};
  } else {
    const auto* const sign = std::find_if(std::begin(kSigns), std::end(kSigns), [&](auto* known) {
      return text_.compare(at_, std::char_traits<char>::length(known), known) == 0;
    });
    if (sign == std::end(kSigns)) {
      length = 1;
      while (begin + length < end && (static_cast<unsigned char>(begin[length]) & 0xC0) == 0x80) {
        ++length;  // the rest of a character beyond ASCII
      }
      token_.text.assign(begin, length);
      return Fault(token_, *begin == '='   ? "\"==\" compares"
                           : *begin == '&' ? "\"&&\" means and"
                           : *begin == '|' ? "\"||\" means or"
                                           : "it means nothing here");
    }
    length = std::char_traits<char>::length(*sign);
    token_ = {Token::Kind::kSign, at_, *sign, 0};
  }
  at_ += length;
}

bool ExpressionParser::Take(const char* sign) {
  if (token_.kind != Token::Kind::kSign || token_.text != sign) return false;
  Next();
  return true;
}

void ExpressionParser::Expect(const char* sign) {
  if (fault_.empty() && !Take(sign)) {
    Fault(token_, std::string("\"") + sign + "\" is missing here");
  }
}

/// Counts how deep the expression is nested, and faults one that would take too much of the stack.
class ExpressionParser::Depth {
 public:
  explicit Depth(ExpressionParser& parser) : parser_(parser) {
    constexpr unsigned kDeepest = 400;
    if (++parser_.depth_ > kDeepest) parser_.Fault(parser_.token_, "it is nested too deeply");
  }
  ~Depth() { --parser_.depth_; }
  Depth(const Depth&) = delete;
  Depth& operator=(const Depth&) = delete;

 private:
  ExpressionParser& parser_;
};

ExpressionParser::Operand ExpressionParser::ParseOr() {
  const Depth depth(*this);
  Operand left = ParseAnd();
  for (Token sign = token_; Take("||"); sign = token_) left = Emit(sign, Op::kOr, left, ParseAnd());
  return left;
}

ExpressionParser::Operand ExpressionParser::ParseAnd() {
  Operand left = ParseComparison();
  for (Token sign = token_; Take("&&"); sign = token_) {
    left = Emit(sign, Op::kAnd, left, ParseComparison());
  }
  return left;
}

ExpressionParser::Operand ExpressionParser::ParseComparison() {
  struct Comparison {
    const char* sign;
    Op op;
    bool isTurned;  // a > b is b < a
  };
  static constexpr Comparison kComparisons[] = {
      {"<", Op::kLess, false},      {"<=", Op::kLessEqual, false}, {">", Op::kLess, true},
      {">=", Op::kLessEqual, true}, {"==", Op::kEqual, false},     {"!=", Op::kNotEqual, false}};
  Operand left = ParseSum();
  bool isCompared = false;
  for (Token sign = token_; sign.kind == Token::Kind::kSign; sign = token_) {
    const auto* const found =
        std::find_if(std::begin(kComparisons), std::end(kComparisons),
                     [&](const Comparison& comparison) { return sign.text == comparison.sign; });
    if (found == std::end(kComparisons)) break;
    if (isCompared) {
      Fault(sign, "comparisons are joined with &&, as in 0 < b0 && b0 < 9");
      break;
    }
    isCompared = true;
    Next();
    const Operand right = ParseSum();
    left =
        found->isTurned ? Emit(sign, found->op, right, left) : Emit(sign, found->op, left, right);
  }
  return left;
}

ExpressionParser::Operand ExpressionParser::ParseSum() {
  Operand left = ParseProduct();
  for (Token sign = token_;; sign = token_) {
    const bool isSum = Take("+");
    if (!isSum && !Take("-")) return left;
    left = Emit(sign, isSum ? Op::kAdd : Op::kSubtract, left, ParseProduct());
  }
}

ExpressionParser::Operand ExpressionParser::ParseProduct() {
  Operand left = ParseSigned();
  for (Token sign = token_;; sign = token_) {
    const bool isProduct = Take("*");
    if (!isProduct && !Take("/")) return left;
    const Token right = token_;
    const Operand factor = ParseSigned();
    left = Emit(isProduct ? sign : right, isProduct ? Op::kMultiply : Op::kDivide, left, factor);
  }
}

ExpressionParser::Operand ExpressionParser::ParseSigned() {
  const Depth depth(*this);
  const Token sign = token_;
  const bool isMinus = Take("-");
  const bool isNot = !isMinus && Take("!");
  if (!isMinus && !isNot && !Take("+")) return ParsePower();
  const Operand operand = ParseSigned();
  return isMinus ? Emit(sign, Op::kNegate, operand)
         : isNot ? Emit(sign, Op::kNot, operand)
                 : operand;
}

ExpressionParser::Operand ExpressionParser::ParsePower() {
  const Operand base = ParsePrimary();
  const Token sign = token_;
  if (!Take("^") && !Take("**")) return base;
  return Emit(sign, Op::kPow, base, ParseSigned());
}

ExpressionParser::Operand ExpressionParser::ParsePrimary() {
  const Token token = token_;
  switch (token.kind) {
    case Token::Kind::kNumber:
      Next();
      return Constant(token.number);
    case Token::Kind::kName:
      Next();
      return ParseName(token);
    default:
      break;
  }
  if (Take("(")) {
    const Operand inner = ParseOr();
    Expect(")");
    return inner;
  }
  Fault(token, "a number, a band or a function is missing here");
  return {};
}

ExpressionParser::Operand ExpressionParser::ParseName(const Token& name) {
  const std::string lower = LowerCase(name.text);
  const bool isCalled = token_.kind == Token::Kind::kSign && token_.text == "(";
  const std::vector<IndexRow>& indices = Indices();
  const auto index = std::find_if(indices.begin(), indices.end(),
                                  [&](const IndexRow& row) { return lower == row.name; });
  if (isCalled) {
    if (index != indices.end()) {
      return ParseIndex(name, static_cast<std::size_t>(index - indices.begin()));
    }
    const auto* const function =
        std::find_if(std::begin(kFunctions), std::end(kFunctions),
                     [&](const FunctionRow& row) { return lower == row.name; });
    if (function == std::end(kFunctions)) {
      Fault(name, "there is no such function");
      return {};
    }
    const std::vector<Operand> given =
        ParseArguments(name, function->operands, function->takesMore ? 1000 : function->operands);
    if (!fault_.empty()) return {};
    if (!function->takesMore) {
      return Emit(name, function->op, given[0], given.size() > 1 ? given[1] : Operand(),
                  given.size() > 2 ? given[2] : Operand());
    }
    Operand result = given[0];
    for (std::size_t i = 1; i < given.size(); ++i)
      result = Emit(name, function->op, result, given[i]);
    return result;
  }
  if (indexBands_ != nullptr) {
    const Operand band = indexBands_->at(lower);
    if (band.kind == Operand::Kind::kStep) ++uses_[band.index];
    return band;
  }
  if (const auto band = names_.Find(lower)) return Input(*band);
  if (index != indices.end()) {
    return ParseIndex(name, static_cast<std::size_t>(index - indices.begin()));
  }
  if (lower == "nan") return Constant(std::numeric_limits<double>::quiet_NaN());
  Fault(name, "there is no such band; there are " + names_.Describe());
  return {};
}

std::vector<ExpressionParser::Operand> ExpressionParser::ParseArguments(const Token& name,
                                                                        std::size_t least,
                                                                        std::size_t most) {
  std::vector<Operand> given;
  Expect("(");
  if (!Take(")")) {
    do {
      given.push_back(ParseOr());
    } while (Take(","));
    Expect(")");
  }
  if (given.size() < least || given.size() > most) {
    Fault(name, "it takes " + std::to_string(least) + (least == most ? "" : " or more") +
                    (least == 1 ? " value, and not " : " values, and not ") +
                    std::to_string(given.size()));
  }
  return given;
}

/// An index, of the values in parentheses or of the bands that have its roles.
ExpressionParser::Operand ExpressionParser::ParseIndex(const Token& name, std::size_t index) {
  const IndexRow& row = Indices()[index];
  std::map<std::string, Operand> bands;
  if (token_.kind == Token::Kind::kSign && token_.text == "(") {
    const std::vector<Operand> given = ParseArguments(name, row.roles.size(), row.roles.size());
    if (!fault_.empty()) return {};
    for (std::size_t i = 0; i < given.size(); ++i) bands[row.roles[i]] = given[i];
  } else {
    for (const std::string& role : row.roles) {
      const auto band = names_.Find(role);
      if (!band) {
        Fault(name, "no band has the role " + role + ", which it needs");
        return {};
      }
      bands[role] = Input(*band);
    }
  }
  // The formula is read in the place of the text; faults are those of the name.
  const std::string outer = text_;
  const std::size_t at = at_;
  const Token token = token_;
  text_ = row.formula;
  at_ = 0;
  indexBands_ = &bands;
  indexName_ = name;
  Next();
  const Operand result = ParseOr();
  indexBands_ = nullptr;
  for (const auto& [role, band] : bands) Release(band);
  text_ = outer;
  at_ = fault_.empty() ? at : outer.size();
  if (fault_.empty()) token_ = token;
  return result;
}

ExpressionParser::Operand ExpressionParser::Constant(double number) {
  std::vector<double>& all = made_.constants_;
  all.push_back(number);
  return {Operand::Kind::kConstant, static_cast<unsigned>(all.size() - 1)};
}

ExpressionParser::Operand ExpressionParser::Input(const BandNames::Band& band) {
  std::vector<BandNames::Band>& all = made_.inputs_;
  auto found = std::find(all.begin(), all.end(), band);
  if (found == all.end()) found = all.insert(all.end(), band);
  return {Operand::Kind::kInput, static_cast<unsigned>(found - all.begin())};
}

void ExpressionParser::Release(Operand operand) {
  if (operand.kind == Operand::Kind::kStep) --uses_[operand.index];
}

/// Adds a step, or computes it where all operands are constants.
/// @param token  that a fault is said of.
ExpressionParser::Operand ExpressionParser::Emit(const Token& token, Op op, Operand a, Operand b,
                                                 Operand c) {
  if (!fault_.empty()) return {};
  const auto isConstant = [](Operand operand) {
    return operand.kind == Operand::Kind::kConstant || operand.kind == Operand::Kind::kNone;
  };
  const Token& named = indexBands_ != nullptr ? indexName_ : token;
  const auto numberOf = [&](Operand operand) { return made_.constants_[operand.index]; };
  if (op == Op::kDivide && isConstant(b) && numberOf(b) == 0) {
    Fault(named, "division by 0");
    return {};
  }
  if (isConstant(a) && isConstant(b) && isConstant(c)) return Fold(named, op, a, b, c);
  if (op == Op::kPow && isConstant(b) && numberOf(b) == 2) {  // a square, in one rounding
    op = Op::kMultiply;
    b = a;
    if (a.kind == Operand::Kind::kStep) ++uses_[a.index];
  }
  // The result gets a row that none of the operands has.
  const auto row = static_cast<unsigned>(std::find(uses_.begin(), uses_.end(), 0U) - uses_.begin());
  if (row == uses_.size()) uses_.push_back(0);
  uses_[row] = 1;
  made_.rows_ = std::max(made_.rows_, row + 1);
  made_.steps_.push_back({op, {a, b, c}, row});
  for (const Operand operand : {a, b, c}) Release(operand);
  return {Operand::Kind::kStep, row};
}

ExpressionParser::Operand ExpressionParser::Fold(const Token& token, Op op, Operand a, Operand b,
                                                 Operand c) {
  double numbers[3] = {};
  bool isNaN = false;
  const Operand operands[] = {a, b, c};
  for (int i = 0; i < 3; ++i) {
    if (operands[i].kind == Operand::Kind::kNone) continue;
    numbers[i] = made_.constants_[operands[i].index];
    isNaN = isNaN || std::isnan(numbers[i]);
  }
  double result = 0;
  ComputeStep(op, &numbers[0], &numbers[1], &numbers[2], 1, &result);
  if (!isNaN && !std::isfinite(result)) {
    Fault(token, "its result is no number");
    return {};
  }
  return Constant(result);
}

}  // namespace lumo
