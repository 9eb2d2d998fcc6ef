#include "ssaopt/client/parser.h"

#include <limits>
#include <utility>

#include "ssaopt/client/lexer.h"

namespace ssaopt::client {

namespace {

const char* const kReservedWords[] = {"var",     "proc", "call", "extern", "goto",  "if",  "else", "end",
                                      "outline", "abs",  "sgn",  "true",   "false", "inf", "nan"};

struct BinaryOperator {
  Token token;
  TermOp op;
};

const BinaryOperator kBinaryOperators[] = {
    {Token::Star, TermOp::Multiply},
    {Token::Slash, TermOp::Divide},
    {Token::Percent, TermOp::Remainder},
    {Token::Plus, TermOp::Add},
    {Token::Minus, TermOp::Subtract},
    {Token::ShiftLeft, TermOp::ShiftLeft},
    {Token::ShiftRight, TermOp::ShiftRight},
    {Token::Less, TermOp::Less},
    {Token::LessEqual, TermOp::LessEqual},
    {Token::Greater, TermOp::Greater},
    {Token::GreaterEqual, TermOp::GreaterEqual},
    {Token::Equal, TermOp::Equal},
    {Token::NotEqual, TermOp::NotEqual},
    {Token::Ampersand, TermOp::BitAnd},
    {Token::Caret, TermOp::BitXor},
    {Token::Pipe, TermOp::BitOr},
    {Token::AndAnd, TermOp::LogicalAnd},
    {Token::OrOr, TermOp::LogicalOr},
};

const BinaryOperator* binaryOperatorOf(Token token) {
  for (const BinaryOperator& entry : kBinaryOperators)
    if (entry.token == token) return &entry;
  return nullptr;
}

std::string quoted(std::string_view text) { return "'" + std::string(text) + "'"; }

SyntaxTerm literalTerm(double number, SourcePos pos) { return SyntaxTerm{TermOp::Literal, pos, number, {}}; }
SyntaxTerm operatorTerm(TermOp op, SourcePos pos) { return SyntaxTerm{op, pos, 0.0, {}}; }
SyntaxTerm variableTerm(TermOp op, const Lexeme& name) { return SyntaxTerm{op, name.pos, 0.0, name.text}; }

class Parser {
public:
  Parser(std::string_view text, DiagnosticList& diagnostics)
      : m_Diagnostics(diagnostics), m_Lexer(text), m_Current(m_Lexer.next()), m_Next(m_Lexer.next()) {}

  // Every declaration and procedure; after an error, reading goes on at the next statement or
  // declaration, until the list has too many errors.
  void parseInto(SyntaxProgram& program) {
    try {
      while (!at(Token::EndOfInput)) parseTopLevelItem(program);
    } catch (const TooManyErrors&) {
    }
    program.endOfInput = m_Current.pos;
  }

private:
  // ---- Recovery --------------------------------------------------------------------------------

  void parseTopLevelItem(SyntaxProgram& program) {
    try {
      if (atWord("var"))
        program.declarations.push_back(parseDeclaration());
      else if (atWord("proc"))
        program.procedures.push_back(parseProcedure());
      else
        fail("expected 'var' or 'proc'");
    } catch (const SourceError& error) {
      m_Diagnostics.error(error);
      skipToDeclaration();
    }
  }

  // Up to the next "var" or "proc" outside braces. The error was at a token other than these or after
  // one of them, so at least one token goes.
  void skipToDeclaration() {
    int depth = 0;
    while (!at(Token::EndOfInput) && !(depth <= 0 && (atWord("var") || atWord("proc")))) {
      Token token = take().token;
      depth += token == Token::LeftBrace ? 1 : token == Token::RightBrace ? -1 : 0;
    }
  }

  void parseBody(std::vector<SyntaxBlock>& blocks) {
    while (!at(Token::RightBrace)) {
      if (at(Token::EndOfInput) || atWord("var") || atWord("proc")) fail("expected '}'");
      std::uint64_t takenBefore = m_Taken;
      try {
        parseItem(blocks);
      } catch (const SourceError& error) {
        m_Diagnostics.error(error);
        skipToStatement();
        if (m_Taken == takenBefore) take();
      }
    }
  }

  // Past the next ';', or up to what starts a block or ends the procedure.
  void skipToStatement() {
    while (!at(Token::EndOfInput) && !at(Token::RightBrace) && !atLabel() && !atWord("outline") &&
           !atWord("var") && !atWord("proc"))
      if (take().token == Token::Semicolon) return;
  }

  // ---- Tokens ----------------------------------------------------------------------------------

  bool at(Token token) const { return m_Current.token == token; }
  bool atWord(std::string_view word) const { return at(Token::Identifier) && m_Current.text == word; }
  bool atLabel() const { return at(Token::Identifier) && m_Next.token == Token::Colon; }

  Lexeme take() {
    Lexeme taken = m_Current;
    m_Current = m_Next;
    if (!at(Token::EndOfInput)) m_Next = m_Lexer.next();
    ++m_Taken;
    return taken;
  }

  // At an Invalid lexeme, what is wrong with it; otherwise what was expected and what was found.
  [[noreturn]] void fail(const std::string& expected) const {
    if (at(Token::Invalid)) throw SourceError(m_Current.pos, describeProblem(m_Current));
    std::string found = at(Token::EndOfInput) ? "the end of the input" : quoted(m_Current.text);
    throw SourceError(m_Current.pos, expected + ", found " + found);
  }

  Lexeme expect(Token token, const char* spelling) {
    if (!at(token)) fail(std::string("expected '") + spelling + "'");
    return take();
  }

  void expectWord(const char* word) {
    if (!atWord(word)) fail(std::string("expected '") + word + "'");
    take();
  }

  // A name of the program's own: not a reserved word.
  SyntaxName expectName(const char* what) {
    if (!at(Token::Identifier)) fail(std::string("expected ") + what);
    if (isReservedWord(m_Current.text))
      throw SourceError(m_Current.pos,
                        quoted(m_Current.text) + " is a reserved word and cannot name " + what);
    Lexeme name = take();
    return SyntaxName{name.text, name.pos};
  }

  SyntaxName expectProcedureName() {
    if (at(Token::HashName)) {
      Lexeme name = take();
      return SyntaxName{name.text, name.pos};
    }
    return expectName("a procedure");
  }

  // ---- Declarations ----------------------------------------------------------------------------

  SyntaxDeclaration parseDeclaration() {
    expectWord("var");
    SyntaxDeclaration declaration;
    if (!at(Token::Identifier)) fail("expected a data type");
    Lexeme type = take();
    declaration.type = SyntaxName{type.text, type.pos};
    declaration.name = expectName("a variable");
    if (at(Token::LeftBracket)) {
      take();
      declaration.arrayLength = parseNumber();
      expect(Token::RightBracket, "]");
    }
    while (parseAttribute(declaration)) {
    }
    if (at(Token::Assign)) {
      take();
      declaration.initValue = parseSignedConstant();
    }
    expect(Token::Semicolon, ";");
    return declaration;
  }

  // False when no attribute follows.
  bool parseAttribute(SyntaxDeclaration& declaration) {
    if (!at(Token::Identifier)) return false;
    SourcePos pos = m_Current.pos;
    std::string_view word = m_Current.text;
    if (word == "scale") {
      rejectRepeat(declaration.scaleLsb.has_value(), pos, word);
      take();
      expect(Token::LeftParen, "(");
      declaration.scaleLsb = parseSignedConstant();
      declaration.scaleOffset = SyntaxNumber{0.0, pos};
      if (at(Token::Comma)) {
        take();
        declaration.scaleOffset = parseSignedConstant();
      }
      expect(Token::RightParen, ")");
    } else if (word == "saturate") {
      rejectRepeat(declaration.lowerLimit || declaration.upperLimit, pos, word);
      take();
      parseSaturation(declaration, pos);
    } else if (word == "output") {
      rejectRepeat(declaration.isOutput, pos, word);
      take();
      declaration.isOutput = true;
    } else if (word == "volatile") {
      rejectRepeat(declaration.isVolatile, pos, word);
      take();
      declaration.isVolatile = true;
    } else if (word == "erasable") {
      rejectRepeat(declaration.erasablePos.has_value(), pos, word);
      take();
      declaration.erasablePos = pos;
    } else {
      fail("expected an attribute (scale, saturate, output, volatile, erasable), '=' or ';'");
    }
    return true;
  }

  static void rejectRepeat(bool given, SourcePos pos, std::string_view word) {
    if (given) throw SourceError(pos, quoted(word) + " is given twice");
  }

  void parseSaturation(SyntaxDeclaration& declaration, SourcePos pos) {
    declaration.saturatePos = pos;
    expect(Token::LeftParen, "(");
    if (!at(Token::DotDot)) declaration.lowerLimit = parseSignedConstant();
    expect(Token::DotDot, "..");
    if (!at(Token::RightParen)) declaration.upperLimit = parseSignedConstant();
    if (!declaration.lowerLimit && !declaration.upperLimit) fail("expected a lower or an upper limit");
    expect(Token::RightParen, ")");
  }

  SyntaxNumber parseNumber() {
    Lexeme number = expect(Token::Number, "number");
    return SyntaxNumber{number.number, number.pos};
  }

  // A number with an optional sign, inf, nan, true or false.
  SyntaxNumber parseSignedConstant() {
    SourcePos pos = m_Current.pos;
    if (atWord("true") || atWord("false")) return SyntaxNumber{take().text == "true" ? 1.0 : 0.0, pos};
    bool negative = at(Token::Minus);
    if (negative) take();
    double magnitude = 0.0;
    if (at(Token::Number))
      magnitude = take().number;
    else if (atWord("inf"))
      magnitude = (take(), std::numeric_limits<double>::infinity());
    else if (atWord("nan"))
      magnitude = (take(), std::numeric_limits<double>::quiet_NaN());
    else
      fail("expected a number");
    return SyntaxNumber{negative ? -magnitude : magnitude, pos};
  }

  // ---- Procedures and blocks -------------------------------------------------------------------

  SyntaxProcedure parseProcedure() {
    expectWord("proc");
    SyntaxProcedure procedure;
    procedure.name = expectProcedureName();
    if (at(Token::LeftParen)) procedure.formals = parseNameList("a formal parameter");
    expect(Token::LeftBrace, "{");
    parseBody(procedure.blocks);
    take();
    if (procedure.blocks.empty()) procedure.blocks.emplace_back();
    return procedure;
  }

  // "(" [ name { "," name } ] ")"
  std::vector<SyntaxName> parseNameList(const char* what) {
    std::vector<SyntaxName> names;
    expect(Token::LeftParen, "(");
    if (!at(Token::RightParen)) {
      names.push_back(expectName(what));
      while (at(Token::Comma)) {
        take();
        names.push_back(expectName(what));
      }
    }
    expect(Token::RightParen, ")");
    return names;
  }

  void parseItem(std::vector<SyntaxBlock>& blocks) {
    if (atWord("outline") || atLabel()) {
      blocks.push_back(parseBlockHeader());
      return;
    }
    if (blocks.empty()) blocks.emplace_back();
    SyntaxBlock& block = blocks.back();
    if (block.terminator.kind != SyntaxTerminator::Kind::FallThrough)
      throw SourceError(m_Current.pos, "this cannot be reached after 'goto' or 'if'; give it a label");
    if (atWord("goto") || atWord("if"))
      block.terminator = parseTerminator();
    else
      block.statements.push_back(parseStatement());
  }

  SyntaxBlock parseBlockHeader() {
    SyntaxBlock block;
    if (atWord("outline")) block.outlinePos = take().pos;
    block.label = expectName("a label");
    expect(Token::Colon, ":");
    return block;
  }

  SyntaxTerminator parseTerminator() {
    SyntaxTerminator terminator;
    terminator.pos = m_Current.pos;
    if (atWord("goto")) {
      take();
      terminator.kind = SyntaxTerminator::Kind::Goto;
      terminator.onTrue = parseTarget();
    } else {
      expectWord("if");
      terminator.kind = SyntaxTerminator::Kind::Branch;
      terminator.condition = parseExpression();
      expectWord("goto");
      terminator.onTrue = parseTarget();
      expectWord("else");
      terminator.onFalse = parseTarget();
    }
    expect(Token::Semicolon, ";");
    return terminator;
  }

  SyntaxTarget parseTarget() {
    SyntaxTarget target;
    if (atWord("end")) {
      Lexeme end = take();
      target.label = SyntaxName{end.text, end.pos};
      target.isEnd = true;
      return target;
    }
    target.label = expectName("a label");
    return target;
  }

  // ---- Statements ------------------------------------------------------------------------------

  SyntaxStatement parseStatement() {
    SyntaxStatement statement;
    statement.pos = m_Current.pos;
    if (atWord("call")) {
      take();
      statement.kind = SyntaxStatement::Kind::Call;
      statement.name = expectProcedureName();
      statement.arguments = parseArguments();
    } else if (atWord("extern")) {
      take();
      statement.kind = SyntaxStatement::Kind::ExternCall;
      statement.name = expectName("an external function");
      if (atWord("uses")) statement.uses = (take(), parseNameList("a variable"));
      if (atWord("modifies")) statement.modifies = (take(), parseNameList("a variable"));
    } else {
      if (!at(Token::Identifier)) fail("expected a statement");
      statement.name = expectName("a variable");
      if (at(Token::LeftBracket)) {
        take();
        statement.index = parseExpression();
        expect(Token::RightBracket, "]");
      }
      expect(Token::Assign, "=");
      statement.value = parseExpression();
    }
    expect(Token::Semicolon, ";");
    return statement;
  }

  std::vector<SyntaxExpression> parseArguments() {
    std::vector<SyntaxExpression> arguments;
    expect(Token::LeftParen, "(");
    if (!at(Token::RightParen)) {
      arguments.push_back(parseExpression());
      while (at(Token::Comma)) {
        take();
        arguments.push_back(parseExpression());
      }
    }
    expect(Token::RightParen, ")");
    return arguments;
  }

  // ---- Expressions -----------------------------------------------------------------------------

  // Counts the nesting of the recursive descent; each level is a handful of frames.
  class Nesting {
  public:
    Nesting(Parser& parser, SourcePos pos) : m_Parser(parser) {
      if (++m_Parser.m_Depth > kMaxExpressionNesting)
        throw SourceError(
            pos, "expression nested deeper than " + std::to_string(kMaxExpressionNesting) + " levels");
    }
    ~Nesting() { --m_Parser.m_Depth; }
    Nesting(const Nesting&) = delete;
    Nesting& operator=(const Nesting&) = delete;

  private:
    Parser& m_Parser;
  };

  SyntaxExpression parseExpression() {
    SyntaxExpression expression;
    expression.pos = m_Current.pos;
    parseBinary(expression.terms, 0);
    return expression;
  }

  // Precedence climbing: operators of equal precedence associate to the left in the loop, so a long
  // chain a + b + c + ... does not recurse.
  void parseBinary(std::vector<SyntaxTerm>& terms, int minPrecedence) {
    parseUnary(terms);
    for (const BinaryOperator* pOperator = binaryOperatorOf(m_Current.token);
         pOperator && precedenceOf(pOperator->op) >= minPrecedence;
         pOperator = binaryOperatorOf(m_Current.token)) {
      SourcePos pos = take().pos;
      parseBinary(terms, precedenceOf(pOperator->op) + 1);
      terms.push_back(operatorTerm(pOperator->op, pos));
    }
  }

  void parseUnary(std::vector<SyntaxTerm>& terms) {
    Nesting nesting(*this, m_Current.pos);
    SourcePos pos = m_Current.pos;
    if (at(Token::Minus) &&
        (m_Next.token == Token::Number ||
         (m_Next.token == Token::Identifier && (m_Next.text == "inf" || m_Next.text == "nan")))) {
      terms.push_back(literalTerm(parseSignedConstant().value, pos));
      return;
    }
    TermOp prefix = at(Token::Minus)   ? TermOp::Negate
                    : at(Token::Bang)  ? TermOp::Not
                    : at(Token::Tilde) ? TermOp::Complement
                                       : TermOp::Literal;
    if (prefix != TermOp::Literal) {
      take();
      parseUnary(terms);
      terms.push_back(operatorTerm(prefix, pos));
      return;
    }
    parsePrimary(terms);
  }

  void parsePrimary(std::vector<SyntaxTerm>& terms) {
    SourcePos pos = m_Current.pos;
    if (at(Token::LeftParen)) {
      take();
      parseBinary(terms, 0);
      expect(Token::RightParen, ")");
    } else if (at(Token::Number) || atWord("true") || atWord("false") || atWord("inf") || atWord("nan")) {
      terms.push_back(literalTerm(parseSignedConstant().value, pos));
    } else if (atWord("abs") || atWord("sgn")) {
      TermOp op = take().text == "abs" ? TermOp::Abs : TermOp::Sgn;
      expect(Token::LeftParen, "(");
      parseBinary(terms, 0);
      expect(Token::RightParen, ")");
      terms.push_back(operatorTerm(op, pos));
    } else if (at(Token::Identifier) && !isReservedWord(m_Current.text)) {
      parseVariable(terms);
    } else {
      fail("expected an expression");
    }
  }

  void parseVariable(std::vector<SyntaxTerm>& terms) {
    Lexeme name = take();
    if (at(Token::LeftParen))
      throw SourceError(name.pos, quoted(name.text) + " is not a function; procedures are called by 'call " +
                                      std::string(name.text) + "(...);'");
    if (!at(Token::LeftBracket)) {
      terms.push_back(variableTerm(TermOp::Variable, name));
      return;
    }
    take();
    parseBinary(terms, 0);
    expect(Token::RightBracket, "]");
    terms.push_back(variableTerm(TermOp::ElementRead, name));
  }

  DiagnosticList& m_Diagnostics;
  Lexer m_Lexer;
  Lexeme m_Current;
  Lexeme m_Next;
  std::uint64_t m_Taken = 0;  // lexemes taken so far, to see whether recovery moved on
  int m_Depth = 0;
};

}  // namespace

bool isReservedWord(std::string_view word) {
  for (const char* reserved : kReservedWords)
    if (word == reserved) return true;
  return false;
}

SyntaxProgram parseProgram(std::string text, DiagnosticList& diagnostics) {
  SyntaxProgram program;
  program.text = std::make_unique<const std::string>(std::move(text));
  Parser(*program.text, diagnostics).parseInto(program);
  return program;
}

}  // namespace ssaopt::client
