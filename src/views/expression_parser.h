#pragma once

#include <map>
#include <string>
#include <vector>

#include "views/expression.h"

namespace lumo {

/// Turns the text of an expression into its steps, by recursive descent: one function for each
/// strength of operators, from the weakest. The first fault ends the text, so that all of them
/// return. Expression::Parse is the way in.
///
/// A step writes a row of numbers, which is used again once no later step reads it; so an
/// expression needs as many rows as it is deep, and not as it is long. What has constants alone is
/// computed here and becomes one.
///
/// Threads: one at a time, for one text.
class ExpressionParser {
 public:
  /// @param names  outlives the parser.
  ExpressionParser(const std::string& text, const BandNames& names);

  /// Reads the text. Nothing, with the fault text set, for one that can't be read.
  std::optional<Expression> Parse();

 private:
  using Operand = Expression::Operand;
  /// A piece of the text that means something by itself.
  struct Token {
    enum class Kind : unsigned char { kEnd, kNumber, kName, kSign };
    Kind kind = Kind::kEnd;
    std::size_t at = 0;  ///< in the text, in bytes
    std::string text;
    double number = 0;  ///< of a kNumber
  };

  class Depth;

  // Tokens. `token_` is the one that is to be understood next.

  /// Goes on to the next token.
  void Next();
  /// Goes on behind a sign where it stands there; else false.
  bool Take(const char* sign);
  /// Take, or a fault.
  void Expect(const char* sign);
  /// Ends the reading at a token. The first fault stays.
  void Fault(Token token, const std::string& why);

  // Each gives where the number lies that its part of the text stands for.

  Operand ParseOr();
  Operand ParseAnd();
  Operand ParseComparison();
  Operand ParseSum();
  Operand ParseProduct();
  Operand ParseSigned();
  Operand ParsePower();
  Operand ParsePrimary();
  Operand ParseName(const Token& name);
  /// Reads what stands in parentheses behind a name; another number of values is a fault.
  std::vector<Operand> ParseArguments(const Token& name, std::size_t least, std::size_t most);
  Operand ParseIndex(const Token& name, std::size_t index);

  // Steps. An operand that is given to Emit or Release has been used, once.

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
