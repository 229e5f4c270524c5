#pragma once

// What the mesh readers share: the error they bail out with, the file's name for messages, progress,
// numbers and the line reader of the text formats. The readers' own header is RKMMeshReader.h.

#include <algorithm>
#include <array>
#include <charconv>
#include <climits>
#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "RKMMeshReader.h"

namespace rkmclash::reading
{
// Parsers bail out from any depth by throwing this; the public functions turn it into a false return, so
// it never reaches the caller.
struct ReadError
{
  std::string message;
};

// Mesh stores int indices, so no mesh may hold more vertices than an int can count.
constexpr std::size_t kMaxVertices = static_cast<std::size_t>(INT_MAX);
constexpr std::size_t kProgressStep = 64 * 1024;

inline std::string Str(std::size_t value) { return std::to_string(value); }
inline std::string Str(long long value) { return std::to_string(value); }

/// A token from an untrusted file, quoted, cut short and made printable for a message.
std::string Quote(std::string_view token);

// Names the file in messages, and with a line for text.
class Context
{
public:
  explicit Context(std::string name) : m_name(std::move(name)) {}

  [[noreturn]] void Fail(const std::string &message) const { throw ReadError{m_name + ": " + message}; }
  [[noreturn]] void FailAt(std::size_t line, const std::string &message) const
  {
    throw ReadError{m_name + ":" + Str(line) + ": " + message};
  }

private:
  std::string m_name;
};

// Reports the fraction of one phase (reading or parsing) mapped into [base, base + span] of the whole,
// at most once per kProgressStep bytes so that a per-line call costs only a comparison.
class Progress
{
public:
  Progress(const std::function<void(double)> *callback, double base, double span)
      : m_callback(callback != nullptr && *callback ? callback : nullptr), m_base(base), m_span(span)
  {
  }

  void Update(std::size_t done, std::size_t total)
  {
    if (m_callback == nullptr || done < m_next)
      return;
    m_next = done + kProgressStep;
    const double fraction = total == 0 ? 1.0 : std::min(1.0, static_cast<double>(done) / static_cast<double>(total));
    (*m_callback)(m_base + m_span * fraction);
  }

private:
  const std::function<void(double)> *m_callback;
  double m_base;
  double m_span;
  std::size_t m_next = 0;
};

enum class NumberStatus
{
  Ok,
  Malformed,
  OutOfRange
};

// std::from_chars is locale-independent and does not accept a leading '+', which files do contain.
inline std::string_view StripPlus(std::string_view token, bool &ok)
{
  ok = true;
  if (!token.empty() && token.front() == '+')
  {
    token.remove_prefix(1);
    ok = !token.empty() && token.front() != '-' && token.front() != '+';
  }
  return token;
}

template <typename T> NumberStatus ParseNumber(std::string_view token, T &value)
{
  bool ok;
  token = StripPlus(token, ok);
  if (!ok || token.empty())
    return NumberStatus::Malformed;
  const char *last = token.data() + token.size();
  const auto [ptr, ec] = std::from_chars(token.data(), last, value);
  if (ptr != last)
    return NumberStatus::Malformed;
  if (ec == std::errc::result_out_of_range)
    return NumberStatus::OutOfRange;
  return ec == std::errc() ? NumberStatus::Ok : NumberStatus::Malformed;
}

/// Doubles as ParseNumber reads them, except that a value too small for a double reads as the nearest
/// one, as strtod gives it; only a value too large is out of range.
NumberStatus ParseReal(std::string_view token, double &value);

/// A coordinate: a finite double, or a failure naming the line.
double ParseCoordinate(const Context &ctx, std::size_t line, std::string_view token);

inline std::string Range(long long first, long long last)
{
  if (last < first)
    return "(no vertices defined)";
  return "(" + Str(first) + ".." + Str(last) + ")";
}

inline void AddFan(const std::vector<int> &polygon, std::vector<std::array<int, 3>> &triangles)
{
  for (std::size_t i = 1; i + 1 < polygon.size(); ++i)
    triangles.push_back({polygon[0], polygon[i], polygon[i + 1]});
}

// Splits text into lines (LF, CRLF or a lone CR) and lines into whitespace-separated tokens, dropping
// '#' comments. Control characters other than whitespace are rejected here, because they mean the file
// is binary or damaged, and saying so beats a confusing complaint about some number further on.
class LineReader
{
public:
  LineReader(const Context &ctx, std::string_view text, Progress &progress)
      : m_ctx(ctx), m_text(text), m_progress(progress)
  {
    if (m_text.substr(0, 3) == "\xEF\xBB\xBF")
      m_pos = 3;
  }

  bool Next(std::vector<std::string_view> &tokens)
  {
    tokens.clear();
    if (m_pos >= m_text.size())
      return false;
    ++m_line;
    m_progress.Update(m_pos, m_text.size());
    const std::size_t start = m_pos;
    std::size_t end = start;
    while (end < m_text.size() && m_text[end] != '\n' && m_text[end] != '\r')
      ++end;
    m_pos = end;
    if (m_pos < m_text.size())
      m_pos += (m_text[m_pos] == '\r' && m_pos + 1 < m_text.size() && m_text[m_pos + 1] == '\n') ? 2 : 1;
    Tokenize(m_text.substr(start, end - start), tokens);
    return true;
  }

  std::size_t Line() const { return m_line; }
  std::size_t Offset() const { return m_pos; }

  [[noreturn]] void FailAtEnd(const std::string &message) const
  {
    if (m_line == 0)
      m_ctx.Fail(message);
    m_ctx.FailAt(m_line, message);
  }

private:
  static bool IsSpace(char c) { return c == ' ' || c == '\t' || c == '\v' || c == '\f'; }

  void Tokenize(std::string_view line, std::vector<std::string_view> &tokens) const
  {
    for (const char c : line)
    {
      const auto u = static_cast<unsigned char>(c);
      if (u < 0x20 && !IsSpace(c))
        m_ctx.FailAt(m_line, "unexpected control character " + Quote(std::string_view(&c, 1)) +
                                 " (binary data in a text file?)");
    }
    std::size_t i = 0;
    while (i < line.size())
    {
      if (IsSpace(line[i]))
      {
        ++i;
        continue;
      }
      if (line[i] == '#')
        break;
      const std::size_t start = i;
      while (i < line.size() && !IsSpace(line[i]) && line[i] != '#')
        ++i;
      tokens.push_back(line.substr(start, i - start));
    }
  }

  const Context &m_ctx;
  std::string_view m_text;
  Progress &m_progress;
  std::size_t m_pos = 0;
  std::size_t m_line = 0;
};

void ParsePly(const Context &ctx, std::string_view data, Progress &progress, Mesh &mesh);
} // namespace rkmclash::reading
