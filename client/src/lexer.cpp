#include "ssaopt/client/lexer.h"

#include <cctype>
#include <cstdlib>
#include <string>

namespace ssaopt::client {

namespace {

bool isWordStart(char c) { return std::isalpha(static_cast<unsigned char>(c)) || c == '_'; }
bool isWordChar(char c) { return std::isalnum(static_cast<unsigned char>(c)) || c == '_'; }
bool isDigit(char c) { return std::isdigit(static_cast<unsigned char>(c)) != 0; }

struct Punctuation {
  std::string_view text;
  Token token;
};

// Longer spellings first, so that "<=" is not read as "<" and "=". None is longer than two.
const Punctuation kPunctuation[] = {
    {"<<", Token::ShiftLeft},    {">>", Token::ShiftRight}, {"<=", Token::LessEqual},
    {">=", Token::GreaterEqual}, {"==", Token::Equal},      {"!=", Token::NotEqual},
    {"&&", Token::AndAnd},       {"||", Token::OrOr},       {"..", Token::DotDot},
    {"(", Token::LeftParen},     {")", Token::RightParen},  {"[", Token::LeftBracket},
    {"]", Token::RightBracket},  {"{", Token::LeftBrace},   {"}", Token::RightBrace},
    {",", Token::Comma},         {";", Token::Semicolon},   {":", Token::Colon},
    {"=", Token::Assign},        {"+", Token::Plus},        {"-", Token::Minus},
    {"*", Token::Star},          {"/", Token::Slash},       {"%", Token::Percent},
    {"<", Token::Less},          {">", Token::Greater},     {"&", Token::Ampersand},
    {"|", Token::Pipe},          {"^", Token::Caret},       {"!", Token::Bang},
    {"~", Token::Tilde},
};

}  // namespace

Lexer::Lexer(std::string_view text) : m_Text(text) {}

char Lexer::peek(std::size_t ahead) const {
  return m_Offset + ahead < m_Text.size() ? m_Text[m_Offset + ahead] : '\0';
}

void Lexer::advance(std::size_t count) {
  for (; count > 0 && m_Offset < m_Text.size(); --count) {
    if (m_Text[m_Offset++] == '\n') {
      ++m_Pos.line;
      m_Pos.column = 1;
    } else {
      ++m_Pos.column;
    }
  }
}

void Lexer::skipSpaceAndComments() {
  for (;;) {
    char c = peek();
    if (c == ' ' || c == '\t' || c == '\r' || c == '\n') {
      advance();
    } else if (c == '/' && peek(1) == '/') {
      while (m_Offset < m_Text.size() && peek() != '\n') advance();
    } else {
      return;
    }
  }
}

Lexeme Lexer::next() {
  skipSpaceAndComments();
  SourcePos pos = m_Pos;
  if (m_Offset >= m_Text.size()) return Lexeme{Token::EndOfInput, {}, pos, 0.0};
  char c = peek();
  if (isDigit(c)) return lexNumber(pos);
  if (isWordStart(c)) return lexWord(pos, Token::Identifier, m_Offset);
  if (c == '#' && isWordChar(peek(1))) {
    std::size_t from = m_Offset;
    advance();
    return lexWord(pos, Token::HashName, from);
  }
  return lexPunctuation(pos);
}

Lexeme Lexer::lexWord(SourcePos pos, Token token, std::size_t from) {
  while (isWordChar(peek())) advance();
  return Lexeme{token, m_Text.substr(from, m_Offset - from), pos, 0.0};
}

// Digits, an optional fraction and an optional exponent. A '.' belongs to the number only when a digit
// follows, so that "0..100" reads as 0, "..", 100.
Lexeme Lexer::lexNumber(SourcePos pos) {
  std::size_t from = m_Offset;
  while (isDigit(peek())) advance();
  if (peek() == '.' && isDigit(peek(1))) {
    advance();
    while (isDigit(peek())) advance();
  }
  if (peek() == 'e' || peek() == 'E') {
    std::size_t sign = (peek(1) == '+' || peek(1) == '-') ? 1 : 0;
    if (!isDigit(peek(1 + sign))) {
      SourcePos exponent = m_Pos;
      advance(1 + sign);
      return invalid(LexProblem::ExponentWithoutDigits, exponent, from);
    }
    advance(1 + sign);
    while (isDigit(peek())) advance();
  }
  if (isWordChar(peek())) {
    SourcePos at = m_Pos;
    std::size_t fault = m_Offset;
    while (isWordChar(peek())) advance();
    return invalid(LexProblem::NumberRunsIntoWord, at, fault);
  }
  std::string_view text = m_Text.substr(from, m_Offset - from);
  std::string copy(text);
  return Lexeme{Token::Number, text, pos, std::strtod(copy.c_str(), nullptr)};
}

Lexeme Lexer::lexPunctuation(SourcePos pos) {
  std::string_view rest = m_Text.substr(m_Offset, 2);
  for (const Punctuation& punctuation : kPunctuation) {
    if (rest.substr(0, punctuation.text.size()) == punctuation.text) {
      advance(punctuation.text.size());
      return Lexeme{punctuation.token, rest.substr(0, punctuation.text.size()), pos, 0.0};
    }
  }
  // One character: a byte, or a whole UTF-8 sequence, so that a letter such as 'é' is one error.
  std::size_t from = m_Offset;
  advance();
  if (static_cast<unsigned char>(m_Text[from]) >= 0xc0)
    while (m_Offset - from < 4 && (static_cast<unsigned char>(peek()) & 0xc0) == 0x80) advance();
  return invalid(LexProblem::UnexpectedCharacter, pos, from);
}

Lexeme Lexer::invalid(LexProblem problem, SourcePos pos, std::size_t from) {
  return Lexeme{Token::Invalid, m_Text.substr(from, m_Offset - from), pos, 0.0, problem};
}

std::string describeProblem(const Lexeme& lexeme) {
  switch (lexeme.problem) {
    case LexProblem::UnexpectedCharacter:
      return "unexpected character '" + escapedText(lexeme.text) + "'";
    case LexProblem::ExponentWithoutDigits:
      return "malformed number: exponent without digits";
    case LexProblem::NumberRunsIntoWord:
      return "malformed number: unexpected '" + std::string(1, lexeme.text[0]) + "'";
    case LexProblem::None:
      break;
  }
  return "";
}

}  // namespace ssaopt::client
