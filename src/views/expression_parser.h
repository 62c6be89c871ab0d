#pragma once

#include <map>
#include <string>
#include <vector>

#include "views/expression.h"

namespace lumo {

/// Turns the text of an expression into its steps, by recursive descent: one function for each
/// strength of operators. The first fault ends the text, so that all of them return.
class ExpressionParser {
 public:
  ExpressionParser(const std::string& text, const BandNames& names);

  /// Nothing, with the fault text set, for a text that can't be read.
  std::optional<Expression> Parse();

 private:
  using Operand = Expression::Operand;
  struct Token {
    enum class Kind : unsigned char { kEnd, kNumber, kName, kSign };
    Kind kind = Kind::kEnd;
    std::size_t at = 0;  // in the text
    std::string text;
    double number = 0;
  };

  class Depth;

  void Next();
  bool Take(const char* sign);
  void Expect(const char* sign);
  void Fault(Token token, const std::string& why);

  Operand ParseOr();
  Operand ParseAnd();
  Operand ParseComparison();
  Operand ParseSum();
  Operand ParseProduct();
  Operand ParseSigned();
  Operand ParsePower();
  Operand ParsePrimary();
  Operand ParseName(const Token& name);
  std::vector<Operand> ParseArguments(const Token& name, std::size_t least, std::size_t most);
  Operand ParseIndex(const Token& name, std::size_t index);

  Operand Emit(const Token& token, ExpressionOp op, Operand a, Operand b = {}, Operand c = {});
  Operand Fold(const Token& token, ExpressionOp op, Operand a, Operand b, Operand c);
  Operand Constant(double number);
  Operand Input(const BandNames::Band& band);
  void Release(Operand operand);
  void KeepUsedConstants();

  const std::string shown_;  // the text as the user knows it
  const BandNames& names_;
  std::string text_;  // what is being read: shown_, or the formula of an index
  std::size_t at_ = 0;
  Token token_;
  unsigned depth_ = 0;
  std::string fault_;
  const std::map<std::string, Operand>* indexBands_ = nullptr;  // while an index is read
  Token indexName_;                                             // likewise, as it was typed
  std::vector<unsigned> uses_;                                  // of each row of steps
  Expression made_;
};

}  // namespace lumo
