// Splits a program text into tokens, one at a time, so that a large program never exists as a list
// of tokens. Comments run from "//" to the end of the line.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "ssaopt/client/diagnostics.h"

namespace ssaopt::client {

enum class Token {
  EndOfInput,
  Identifier,  // also every keyword: the parser decides where a word is one
  HashName,    // '#' and letters, digits or underscores: "#main", "#block_12"
  Number,
  LeftParen,
  RightParen,
  LeftBracket,
  RightBracket,
  LeftBrace,
  RightBrace,
  Comma,
  Semicolon,
  Colon,
  DotDot,
  Assign,
  Plus,
  Minus,
  Star,
  Slash,
  Percent,
  ShiftLeft,
  ShiftRight,
  Less,
  LessEqual,
  Greater,
  GreaterEqual,
  Equal,
  NotEqual,
  Ampersand,
  AndAnd,
  Pipe,
  OrOr,
  Caret,
  Bang,
  Tilde,
  Invalid,  // what starts no token, or a malformed number: see Lexeme::problem
};

// What is wrong with an Invalid lexeme.
enum class LexProblem {
  None,
  UnexpectedCharacter,    // `text` is the character (all bytes of a UTF-8 sequence)
  ExponentWithoutDigits,  // `text` is the number so far
  NumberRunsIntoWord,     // `text` is the letters and digits that follow the number
};

struct Lexeme {
  Token token = Token::EndOfInput;
  std::string_view text;  // points into the program text
  SourcePos pos;          // of the token; of the fault, for an Invalid lexeme
  double number = 0.0;    // of a Number
  LexProblem problem = LexProblem::None;
};

// "unexpected character '$'", with bytes that are not printable escaped; empty for a valid lexeme.
std::string describeProblem(const Lexeme& lexeme);

class Lexer {
public:
  // `text` must outlive the lexer and every lexeme it gives.
  explicit Lexer(std::string_view text);

  // The next token; EndOfInput at the end, again and again. A character that starts no token and a
  // malformed number are an Invalid lexeme, after which the lexer goes on.
  Lexeme next();

private:
  void skipSpaceAndComments();
  Lexeme lexNumber(SourcePos pos);
  Lexeme lexWord(SourcePos pos, Token token, std::size_t from);
  Lexeme lexPunctuation(SourcePos pos);
  Lexeme invalid(LexProblem problem, SourcePos pos, std::size_t from);
  char peek(std::size_t ahead = 0) const;
  void advance(std::size_t count = 1);

  std::string_view m_Text;
  std::size_t m_Offset = 0;
  SourcePos m_Pos{1, 1};
};

}  // namespace ssaopt::client
