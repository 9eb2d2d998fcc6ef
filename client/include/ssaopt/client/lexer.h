// Splits a program text into tokens, one at a time, so that a large program never exists as a list
// of tokens. Comments run from "//" to the end of the line.
#pragma once

#include <cstddef>
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
};

struct Lexeme {
  Token token = Token::EndOfInput;
  std::string_view text;  // points into the program text
  SourcePos pos;
  double number = 0.0;  // of a Number
};

class Lexer {
public:
  // `text` must outlive the lexer and every lexeme it gives.
  explicit Lexer(std::string_view text);

  // The next token; EndOfInput at the end, again and again. Throws SourceError on a character that
  // starts no token and on a malformed number.
  Lexeme next();

private:
  void skipSpaceAndComments();
  Lexeme lexNumber(SourcePos pos);
  Lexeme lexWord(SourcePos pos, Token token, std::size_t from);
  Lexeme lexPunctuation(SourcePos pos);
  char peek(std::size_t ahead = 0) const;
  void advance(std::size_t count = 1);

  std::string_view m_Text;
  std::size_t m_Offset = 0;
  SourcePos m_Pos{1, 1};
};

}  // namespace ssaopt::client
