// The mesh readers: the OBJ, OFF and STL parsers with the vertex welder of STL, what every reader shares
// (RKMMeshReaderParts.h), and the choice of a reader by the file's extension.

#include "RKMMeshReader.h"
#include "RKMMeshReaderParts.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <exception>
#include <filesystem>
#include <memory>
#include <new>
#include <string_view>
#include <system_error>
#include <unordered_map>
#include <utility>

namespace rkmclash
{
namespace reading
{
namespace
{
// from_chars gives subnormals but calls a value out of range when it rounds to zero or to infinity. Which
// of the two shows in the decimal exponent of the first significant digit; `token` has a form that
// from_chars accepted, [-]digits[.digits][(e|E)[+|-]digits], since inf and nan are never out of range.
bool IsBelowTheSmallestDouble(std::string_view token)
{
  std::size_t i = !token.empty() && token[0] == '-' ? 1 : 0;
  const auto isDigit = [&](std::size_t k) { return k < token.size() && token[k] >= '0' && token[k] <= '9'; };
  const std::size_t integerStart = i;
  while (isDigit(i))
    ++i;
  bool found = false;
  long long lead = 0;
  for (std::size_t k = integerStart; k < i && !found; ++k)
    if (token[k] != '0')
    {
      found = true;
      lead = static_cast<long long>(i - k) - 1;
    }
  if (i < token.size() && token[i] == '.')
    for (const std::size_t fractionStart = ++i; isDigit(i); ++i)
      if (!found && token[i] != '0')
      {
        found = true;
        lead = -static_cast<long long>(i - fractionStart) - 1;
      }
  long long exponent = 0;
  if (i < token.size() && (token[i] == 'e' || token[i] == 'E'))
  {
    const bool negative = ++i < token.size() && token[i] == '-';
    if (i < token.size() && (token[i] == '-' || token[i] == '+'))
      ++i;
    // Saturates far beyond any double's exponent, so that no digit string can overflow it.
    for (; isDigit(i); ++i)
      exponent = std::min(exponent * 10 + (token[i] - '0'), 1000000000000LL);
    if (negative)
      exponent = -exponent;
  }
  return !found || lead + exponent < 0;
}
} // namespace

// Tokens come from untrusted files: keep messages short and printable whatever the bytes are.
std::string Quote(std::string_view token)
{
  constexpr std::size_t kMaxShown = 40;
  std::string out = "'";
  for (std::size_t i = 0; i < token.size() && i < kMaxShown; ++i)
  {
    const auto c = static_cast<unsigned char>(token[i]);
    if (c >= 0x20 && c < 0x7f)
    {
      out += static_cast<char>(c);
    }
    else
    {
      char hex[8];
      std::snprintf(hex, sizeof hex, "\\x%02X", static_cast<unsigned>(c));
      out += hex;
    }
  }
  if (token.size() > kMaxShown)
    out += "...";
  out += "'";
  return out;
}

NumberStatus ParseReal(std::string_view token, double &value)
{
  const NumberStatus status = ParseNumber(token, value);
  if (status != NumberStatus::OutOfRange)
    return status;
  bool ok;
  const std::string_view number = StripPlus(token, ok);
  if (!IsBelowTheSmallestDouble(number))
    return NumberStatus::OutOfRange;
  value = !number.empty() && number[0] == '-' ? -0.0 : 0.0;
  return NumberStatus::Ok;
}

double ParseCoordinate(const Context &ctx, std::size_t line, std::string_view token)
{
  double value = 0.0;
  switch (ParseReal(token, value))
  {
  case NumberStatus::Malformed:
    ctx.FailAt(line, "malformed number " + Quote(token));
  case NumberStatus::OutOfRange:
    ctx.FailAt(line, "number " + Quote(token) + " is out of the range of a double");
  case NumberStatus::Ok:
    break;
  }
  if (!std::isfinite(value))
    ctx.FailAt(line, "coordinate " + Quote(token) + " is not a finite number");
  return value;
}
} // namespace reading

namespace
{
using namespace reading;

bool IsInteger(std::string_view token)
{
  long long value;
  return ParseNumber(token, value) != NumberStatus::Malformed;
}

void AddVertex(const Context &ctx, std::size_t line, Mesh &mesh, const std::array<double, 3> &p)
{
  if (mesh.vertices.size() >= kMaxVertices)
    ctx.FailAt(line, "too many vertices (at most " + Str(kMaxVertices) + ")");
  mesh.vertices.push_back(p);
}

// Accepts the forms i, i/j, i//k and i/j/k and returns i. The texture and normal indices are checked for
// form only: the mesh keeps neither.
long long ParseObjFaceVertex(const Context &ctx, std::size_t line, std::string_view token)
{
  const std::size_t slash = token.find('/');
  const std::string_view vertex = token.substr(0, slash);
  bool ok = true;
  if (slash != std::string_view::npos)
  {
    const std::string_view rest = token.substr(slash + 1);
    const std::size_t slash2 = rest.find('/');
    const std::string_view texture = rest.substr(0, slash2);
    if (slash2 == std::string_view::npos)
      ok = IsInteger(texture);
    else
      ok = (texture.empty() || IsInteger(texture)) && IsInteger(rest.substr(slash2 + 1));
  }
  long long index = 0;
  const NumberStatus status = ParseNumber(vertex, index);
  if (status == NumberStatus::Malformed || !ok)
    ctx.FailAt(line, "malformed face vertex " + Quote(token) + " (expected i, i/j, i//k or i/j/k)");
  if (status == NumberStatus::OutOfRange)
    ctx.FailAt(line, "face index " + Quote(vertex) + " is too large");
  return index;
}

void ParseObj(const Context &ctx, std::string_view text, Progress &progress, Mesh &mesh)
{
  // A positive index may name a vertex defined further down, so it can only be judged at the end.
  struct ForwardReference
  {
    std::size_t line;
    long long index;
  };
  std::vector<ForwardReference> forward;
  LineReader reader(ctx, text, progress);
  std::vector<std::string_view> tokens;
  std::vector<int> polygon;
  while (reader.Next(tokens))
  {
    if (tokens.empty())
      continue;
    const std::size_t line = reader.Line();
    if (tokens[0] == "v")
    {
      // x y z, then an optional w or the r g b that some writers append; only x y z are kept.
      if (tokens.size() < 4)
        ctx.FailAt(line, "vertex needs 3 coordinates, found " + Str(tokens.size() - 1));
      if (tokens.size() > 8)
        ctx.FailAt(line, "vertex has " + Str(tokens.size() - 1) + " values; expected at most 7");
      std::array<double, 3> p;
      for (std::size_t i = 0; i < 3; ++i)
        p[i] = ParseCoordinate(ctx, line, tokens[i + 1]);
      for (std::size_t i = 4; i < tokens.size(); ++i)
        ParseCoordinate(ctx, line, tokens[i]);
      AddVertex(ctx, line, mesh, p);
    }
    else if (tokens[0] == "f")
    {
      if (tokens.size() < 4)
        ctx.FailAt(line, "face with fewer than 3 vertices (" + Str(tokens.size() - 1) + ")");
      const auto defined = static_cast<long long>(mesh.vertices.size());
      polygon.clear();
      for (std::size_t i = 1; i < tokens.size(); ++i)
      {
        const long long index = ParseObjFaceVertex(ctx, line, tokens[i]);
        long long resolved = 0;
        if (index == 0)
          ctx.FailAt(line, "face index 0 is invalid: OBJ indices start at 1 (or count back from -1)");
        if (index > 0)
        {
          if (index > static_cast<long long>(kMaxVertices))
            ctx.FailAt(line, "face index " + Str(index) + " out of range " + Range(1, defined));
          if (index > defined)
            forward.push_back({line, index});
          resolved = index - 1;
        }
        else
        {
          resolved = defined + index;
          if (resolved < 0)
            ctx.FailAt(line, "face index " + Str(index) + " out of range " +
                                 (defined == 0 ? Range(1, 0) : Range(-defined, -1)));
        }
        polygon.push_back(static_cast<int>(resolved));
      }
      AddFan(polygon, mesh.triangles);
    }
    // Everything else (texture coordinates, normals, groups, objects, smoothing, materials, free-form
    // geometry, writers' own extensions) adds nothing to a triangle mesh and is skipped unjudged.
  }
  const auto total = static_cast<long long>(mesh.vertices.size());
  for (const ForwardReference &ref : forward)
    if (ref.index > total)
      ctx.FailAt(ref.line, "face index " + Str(ref.index) + " out of range " + Range(1, total));
  if (mesh.triangles.empty())
    ctx.Fail("no triangles: the file has no 'f' lines");
}

long long ParseOffCount(const Context &ctx, std::size_t line, std::string_view token)
{
  long long value = 0;
  if (ParseNumber(token, value) != NumberStatus::Ok || value < 0)
    ctx.FailAt(line, "malformed count " + Quote(token) + " (expected a non-negative integer)");
  return value;
}

void ParseOff(const Context &ctx, std::string_view text, Progress &progress, Mesh &mesh)
{
  LineReader reader(ctx, text, progress);
  std::vector<std::string_view> tokens;
  const auto nextContent = [&]()
  {
    while (reader.Next(tokens))
      if (!tokens.empty())
        return true;
    return false;
  };

  if (!nextContent())
    ctx.Fail("file is empty (no OFF header)");
  const std::string_view header = tokens[0];
  const std::size_t headerLine = reader.Line();
  const bool endsWithOff = header.size() >= 3 && header.substr(header.size() - 3) == "OFF";
  const std::string_view prefix = endsWithOff ? header.substr(0, header.size() - 3) : std::string_view();
  if (!endsWithOff || prefix.find_first_not_of("STCN4n") != std::string_view::npos)
    ctx.FailAt(headerLine, "expected the header 'OFF', found " + Quote(header));
  // 4OFF and nOFF change the number of coordinates per vertex; texture, colour and normal variants only
  // append values that are skipped below.
  if (prefix.find_first_of("4n") != std::string_view::npos)
    ctx.FailAt(headerLine, "unsupported OFF variant " + Quote(header) + ": only 3D vertices can be read");
  if (tokens.size() > 1 && tokens[1] == "BINARY")
    ctx.FailAt(headerLine, "binary OFF is not supported");

  // The counts usually have a line of their own, but may follow the header on its line.
  std::vector<std::string_view> counts(tokens.begin() + 1, tokens.end());
  if (counts.empty())
  {
    if (!nextContent())
      reader.FailAtEnd("file ends before the vertex and face counts");
    counts = tokens;
  }
  const std::size_t countsLine = reader.Line();
  if (counts.size() < 2 || counts.size() > 3)
    ctx.FailAt(countsLine, "expected the counts 'vertices faces [edges]', found " + Str(counts.size()) + " values");
  const long long vertexCount = ParseOffCount(ctx, countsLine, counts[0]);
  const long long faceCount = ParseOffCount(ctx, countsLine, counts[1]);
  if (counts.size() == 3)
    ParseOffCount(ctx, countsLine, counts[2]);

  // Every vertex and face takes a line of at least 2 bytes, so counts beyond that are refused outright.
  // Counts within it may still overstate a damaged file; reading on then names the line where it ends.
  const std::size_t remaining = text.size() - reader.Offset();
  const auto lines = (static_cast<unsigned long long>(remaining) + 1) / 2;
  const auto nv = static_cast<unsigned long long>(vertexCount);
  const auto nf = static_cast<unsigned long long>(faceCount);
  if (nv > lines || nf > lines || nv + nf > lines)
    ctx.FailAt(countsLine, "counts of " + Str(vertexCount) + " vertices and " + Str(faceCount) +
                               " faces cannot fit in the remaining " + Str(remaining) + " bytes of the file");
  if (faceCount == 0)
    ctx.FailAt(countsLine, "no triangles: the file declares 0 faces");

  // A vertex line takes at least 6 bytes ("0 0 0\n") and a face line 8 ("3 0 0 0\n"): reserving no more
  // than that keeps an overstated count from allocating beyond the size of the file.
  mesh.vertices.reserve(std::min(static_cast<std::size_t>(vertexCount), remaining / 6 + 1));
  for (long long i = 0; i < vertexCount; ++i)
  {
    if (!nextContent())
      reader.FailAtEnd("file ends after " + Str(i) + " of " + Str(vertexCount) + " vertices");
    const std::size_t line = reader.Line();
    if (tokens.size() < 3)
      ctx.FailAt(line, "vertex needs 3 coordinates, found " + Str(tokens.size()));
    AddVertex(ctx, line, mesh,
              {ParseCoordinate(ctx, line, tokens[0]), ParseCoordinate(ctx, line, tokens[1]),
               ParseCoordinate(ctx, line, tokens[2])});
  }

  mesh.triangles.reserve(std::min(static_cast<std::size_t>(faceCount), remaining / 8 + 1));
  std::vector<int> polygon;
  for (long long i = 0; i < faceCount; ++i)
  {
    if (!nextContent())
      reader.FailAtEnd("file ends after " + Str(i) + " of " + Str(faceCount) + " faces");
    const std::size_t line = reader.Line();
    long long corners = 0;
    if (ParseNumber(tokens[0], corners) != NumberStatus::Ok)
      ctx.FailAt(line, "malformed face vertex count " + Quote(tokens[0]));
    if (corners < 3)
      ctx.FailAt(line, "face with fewer than 3 vertices (" + Str(corners) + ")");
    const auto listed = static_cast<long long>(tokens.size() - 1);
    if (corners > listed)
      ctx.FailAt(line, "face declares " + Str(corners) + " vertices but lists only " + Str(listed));
    polygon.clear();
    // Values after the indices are a face colour, which the mesh does not keep.
    for (long long k = 1; k <= corners; ++k)
    {
      const std::string_view token = tokens[static_cast<std::size_t>(k)];
      long long index = 0;
      const NumberStatus status = ParseNumber(token, index);
      if (status == NumberStatus::Malformed)
        ctx.FailAt(line, "malformed face index " + Quote(token));
      if (status == NumberStatus::OutOfRange || index < 0 || index >= vertexCount)
        ctx.FailAt(line, "face index " + (status == NumberStatus::Ok ? Str(index) : Quote(token)) + " out of range " +
                             Range(0, vertexCount - 1));
      polygon.push_back(static_cast<int>(index));
    }
    AddFan(polygon, mesh.triangles);
  }
  // Whatever follows the declared faces is left unread: some writers append data of their own there.
}

// Merges vertices with exactly equal coordinates, which STL repeats for every triangle.
class Welder
{
public:
  Welder(const Context &ctx, Mesh &mesh, std::size_t expectedVertices) : m_ctx(ctx), m_mesh(mesh)
  {
    m_map.reserve(expectedVertices);
  }

  int Add(const std::array<double, 3> &p)
  {
    Key key;
    for (std::size_t i = 0; i < 3; ++i)
    {
      // -0 and +0 are the same point but not the same bits.
      const double c = p[i] + 0.0;
      std::memcpy(&key[i], &c, sizeof c);
    }
    const auto [it, inserted] = m_map.try_emplace(key, static_cast<int>(m_mesh.vertices.size()));
    if (inserted)
    {
      if (m_mesh.vertices.size() >= kMaxVertices)
        m_ctx.Fail("too many vertices (at most " + Str(kMaxVertices) + ")");
      m_mesh.vertices.push_back(p);
    }
    return it->second;
  }

private:
  using Key = std::array<std::uint64_t, 3>;
  struct KeyHash
  {
    static std::uint64_t Mix(std::uint64_t x)
    {
      x ^= x >> 30;
      x *= 0xBF58476D1CE4E5B9ull;
      x ^= x >> 27;
      x *= 0x94D049BB133111EBull;
      return x ^ (x >> 31);
    }
    std::size_t operator()(const Key &k) const { return static_cast<std::size_t>(Mix(k[0] ^ Mix(k[1] ^ Mix(k[2])))); }
  };

  const Context &m_ctx;
  Mesh &m_mesh;
  std::unordered_map<Key, int, KeyHash> m_map;
};

std::uint32_t ReadLE32(const unsigned char *p)
{
  return static_cast<std::uint32_t>(p[0]) | static_cast<std::uint32_t>(p[1]) << 8 |
         static_cast<std::uint32_t>(p[2]) << 16 | static_cast<std::uint32_t>(p[3]) << 24;
}

float ReadFloatLE(const unsigned char *p)
{
  const std::uint32_t bits = ReadLE32(p);
  float value;
  std::memcpy(&value, &bits, sizeof value);
  return value;
}

constexpr std::size_t kStlHeader = 84;
constexpr std::size_t kStlRecord = 50;

void ParseBinaryStl(const Context &ctx, std::string_view data, Progress &progress, Mesh &mesh)
{
  const std::size_t size = data.size();
  if (size < kStlHeader)
    ctx.Fail("truncated binary STL: " + Str(size) + " bytes, but its header alone takes 84");
  const auto *bytes = reinterpret_cast<const unsigned char *>(data.data());
  const std::uint32_t count = ReadLE32(bytes + 80);
  const std::uint64_t expected = kStlHeader + kStlRecord * static_cast<std::uint64_t>(count);
  if (expected != size)
    ctx.Fail("binary STL header count disagrees with the file size: " + std::to_string(count) + " triangles need " +
             std::to_string(expected) + " bytes, but the file has " + Str(size) +
             (size < expected ? " (truncated file?)" : " (extra data after the triangles?)"));
  if (count == 0)
    ctx.Fail("no triangles: the binary STL header declares 0");
  if (count > kMaxVertices / 3)
    ctx.Fail("too many triangles (" + std::to_string(count) + ")");

  Welder welder(ctx, mesh, count);
  mesh.triangles.reserve(count);
  for (std::size_t t = 0; t < count; ++t)
  {
    const std::size_t offset = kStlHeader + kStlRecord * t;
    progress.Update(offset, size);
    // Each record: normal (3 floats, recomputable, so ignored), 3 vertices, a 16-bit attribute.
    std::array<int, 3> triangle;
    for (std::size_t v = 0; v < 3; ++v)
    {
      const unsigned char *corner = bytes + offset + 12 + 12 * v;
      const std::array<double, 3> p = {ReadFloatLE(corner), ReadFloatLE(corner + 4), ReadFloatLE(corner + 8)};
      if (!std::isfinite(p[0]) || !std::isfinite(p[1]) || !std::isfinite(p[2]))
        ctx.Fail("triangle " + Str(t + 1) + " (byte offset " + Str(offset) + "): vertex " + Str(v + 1) +
                 " has a coordinate that is not a finite number");
      triangle[v] = welder.Add(p);
    }
    mesh.triangles.push_back(triangle);
  }
}

void ParseAsciiStl(const Context &ctx, std::string_view text, Progress &progress, Mesh &mesh)
{
  enum class State
  {
    BeforeSolid,
    InSolid,
    InFacet,
    InLoop,
    AfterLoop,
    AfterSolid
  };
  LineReader reader(ctx, text, progress);
  Welder welder(ctx, mesh, 0);
  std::vector<std::string_view> tokens;
  State state = State::BeforeSolid;
  std::array<int, 3> triangle = {0, 0, 0};
  std::size_t corners = 0;
  while (reader.Next(tokens))
  {
    if (tokens.empty())
      continue;
    const std::size_t line = reader.Line();
    const std::string_view keyword = tokens[0];
    switch (state)
    {
    case State::BeforeSolid:
    case State::AfterSolid:
      // Some writers concatenate several solids into one file.
      if (keyword != "solid")
        ctx.FailAt(line, std::string(state == State::BeforeSolid ? "expected 'solid'"
                                                                 : "expected 'solid' or the end of the file") +
                             ", found " + Quote(keyword));
      state = State::InSolid;
      break;
    case State::InSolid:
      if (keyword == "endsolid")
      {
        state = State::AfterSolid;
        break;
      }
      if (keyword != "facet")
        ctx.FailAt(line, "expected 'facet' or 'endsolid', found " + Quote(keyword));
      if (tokens.size() != 5 || tokens[1] != "normal")
        ctx.FailAt(line, "expected 'facet normal nx ny nz'");
      // The normal is recomputable and so not kept, and writers do emit NaN normals for degenerate
      // facets; only its form is checked.
      for (std::size_t i = 2; i < 5; ++i)
      {
        double ignored;
        if (ParseReal(tokens[i], ignored) == NumberStatus::Malformed)
          ctx.FailAt(line, "malformed number " + Quote(tokens[i]));
      }
      state = State::InFacet;
      break;
    case State::InFacet:
      if (tokens.size() != 2 || keyword != "outer" || tokens[1] != "loop")
        ctx.FailAt(line, "expected 'outer loop', found " + Quote(keyword));
      corners = 0;
      state = State::InLoop;
      break;
    case State::InLoop:
      if (keyword == "endloop")
      {
        if (corners != 3)
          ctx.FailAt(line, "facet has " + Str(corners) + " vertices; an STL facet needs exactly 3");
        state = State::AfterLoop;
        break;
      }
      if (keyword != "vertex")
        ctx.FailAt(line, "expected 'vertex' or 'endloop', found " + Quote(keyword));
      if (tokens.size() != 4)
        ctx.FailAt(line, "vertex needs 3 coordinates, found " + Str(tokens.size() - 1));
      if (corners == 3)
        ctx.FailAt(line, "facet has more than 3 vertices; an STL facet needs exactly 3");
      triangle[corners++] = welder.Add({ParseCoordinate(ctx, line, tokens[1]), ParseCoordinate(ctx, line, tokens[2]),
                                        ParseCoordinate(ctx, line, tokens[3])});
      break;
    case State::AfterLoop:
      if (keyword != "endfacet")
        ctx.FailAt(line, "expected 'endfacet', found " + Quote(keyword));
      mesh.triangles.push_back(triangle);
      state = State::InSolid;
      break;
    }
  }
  if (state == State::BeforeSolid)
    ctx.Fail("file is empty");
  if (state != State::AfterSolid)
    reader.FailAtEnd(state == State::InSolid ? "unexpected end of file: missing 'endsolid'"
                                             : "unexpected end of file inside a facet");
  if (mesh.triangles.empty())
    ctx.Fail("no triangles: the solid has no facets");
}

bool StartsWithSolid(std::string_view data)
{
  const std::size_t start = data.find_first_not_of(" \t\r\n");
  if (start == std::string_view::npos || data.substr(start, 5) != "solid")
    return false;
  if (start + 5 == data.size())
    return true;
  const char next = data[start + 5];
  return next == ' ' || next == '\t' || next == '\r' || next == '\n';
}

std::size_t CountControlBytes(std::string_view data)
{
  return static_cast<std::size_t>(std::count_if(data.begin(), data.end(),
                                                [](char c)
                                                {
                                                  const auto u = static_cast<unsigned char>(c);
                                                  return u < 0x20 && c != '\t' && c != '\n' && c != '\v' && c != '\f' &&
                                                         c != '\r';
                                                }));
}

// A binary STL may start with "solid" too, so the leading word alone decides nothing. A binary file whose
// size matches its triangle count is binary unless it is pure text; otherwise text with at most a few
// stray control bytes is taken for damaged ASCII (its reader then names the line), and anything else of
// at least 84 bytes for binary (whose reader then explains the size mismatch). Below 84 bytes only text
// is possible.
void ParseStl(const Context &ctx, std::string_view data, Progress &progress, Mesh &mesh)
{
  if (data.empty())
    ctx.Fail("file is empty");
  const bool solid = StartsWithSolid(data);
  const std::size_t control = CountControlBytes(data);
  if (data.size() >= kStlHeader)
  {
    const auto *bytes = reinterpret_cast<const unsigned char *>(data.data());
    const std::uint64_t expected = kStlHeader + kStlRecord * static_cast<std::uint64_t>(ReadLE32(bytes + 80));
    if (expected == data.size() && !(solid && control == 0))
      return ParseBinaryStl(ctx, data, progress, mesh);
  }
  if (solid && (control * 100 <= data.size() || data.size() < kStlHeader))
    return ParseAsciiStl(ctx, data, progress, mesh);
  if (data.size() >= kStlHeader)
    return ParseBinaryStl(ctx, data, progress, mesh);
  ctx.Fail("neither ASCII STL (it does not start with 'solid') nor binary STL (" + Str(data.size()) +
           " bytes, but a binary header alone takes 84)");
}

enum class Format
{
  Obj,
  Stl,
  Off,
  Ply,
  Unknown
};

Format FormatFromName(std::string name)
{
  if (!name.empty() && name.front() == '.')
    name.erase(0, 1);
  for (char &c : name)
    c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  if (name == "obj")
    return Format::Obj;
  if (name == "stl")
    return Format::Stl;
  if (name == "off")
    return Format::Off;
  if (name == "ply")
    return Format::Ply;
  return Format::Unknown;
}

std::string BaseName(const std::string &path)
{
  const std::size_t slash = path.find_last_of("/\\");
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

std::string Extension(const std::string &path)
{
  const std::string base = BaseName(path);
  const std::size_t dot = base.find_last_of('.');
  return dot == std::string::npos || dot == 0 ? std::string() : base.substr(dot);
}

std::string Stem(const std::string &path)
{
  std::string base = BaseName(path);
  const std::size_t dot = base.find_last_of('.');
  if (dot != std::string::npos && dot > 0)
    base.erase(dot);
  return base;
}

void Parse(Format format, const Context &ctx, std::string_view data, Progress &progress, Mesh &mesh)
{
  switch (format)
  {
  case Format::Obj:
    return ParseObj(ctx, data, progress, mesh);
  case Format::Stl:
    return ParseStl(ctx, data, progress, mesh);
  case Format::Off:
    return ParseOff(ctx, data, progress, mesh);
  case Format::Ply:
    return ParsePly(ctx, data, progress, mesh);
  case Format::Unknown:
    break;
  }
  ctx.Fail("unknown mesh format");
}

std::string ReadWholeFile(const Context &ctx, const std::string &path, Progress &progress)
{
  std::error_code ec;
  if (std::filesystem::is_directory(path, ec))
    ctx.Fail("is a directory, not a mesh file");
  std::FILE *file = std::fopen(path.c_str(), "rb");
  if (file == nullptr)
    ctx.Fail("cannot open file: " + std::generic_category().message(errno));
  const std::unique_ptr<std::FILE, int (*)(std::FILE *)> closer(file, &std::fclose);
  // The size is only a hint for reserving and for progress: the loop reads until the end whatever it is.
  const std::uintmax_t size = std::filesystem::file_size(path, ec);
  const std::size_t expected = ec ? 0 : static_cast<std::size_t>(size);
  std::string data;
  data.reserve(expected);
  std::vector<char> buffer(kProgressStep);
  for (;;)
  {
    const std::size_t got = std::fread(buffer.data(), 1, buffer.size(), file);
    data.append(buffer.data(), got);
    progress.Update(data.size(), std::max(expected, data.size()));
    if (got < buffer.size())
      break;
  }
  if (std::ferror(file))
    ctx.Fail("cannot read file: " + std::generic_category().message(errno));
  return data;
}

// The last stop for anything thrown below: the public functions promise not to throw.
template <typename Body> bool Guarded(const std::string &name, std::string &error, Body &&body) noexcept
{
  std::string message;
  try
  {
    try
    {
      body();
      return true;
    }
    catch (ReadError &e)
    {
      message = std::move(e.message);
    }
    catch (const std::bad_alloc &)
    {
      message = "out of memory while reading " + name;
    }
    catch (const std::exception &e)
    {
      message = name + ": " + e.what();
    }
    catch (...)
    {
      message = name + ": unexpected error while reading the mesh";
    }
  }
  catch (...)
  {
    // Building the message itself ran out of memory; an empty message still comes with false.
  }
  error.swap(message);
  return false;
}
} // namespace

bool ReadMesh(const std::string &path, Mesh &out, std::string &error, const std::function<void(double)> &progress)
{
  return Guarded(path, error,
                 [&]()
                 {
                   const Context ctx(path);
                   const std::string extension = Extension(path);
                   const Format format = FormatFromName(extension);
                   const std::string expected = "; expected .obj, .stl, .off or .ply";
                   if (format == Format::Unknown)
                     ctx.Fail(extension.empty() ? "has no file extension" + expected
                                                : "unknown mesh file extension " + Quote(extension) + expected);
                   // Reading is much cheaper than parsing, hence the split of the progress range.
                   Progress reading(&progress, 0.0, 0.25);
                   const std::string data = ReadWholeFile(ctx, path, reading);
                   Progress parsing(&progress, 0.25, 0.75);
                   Mesh mesh;
                   Parse(format, ctx, data, parsing, mesh);
                   mesh.name = Stem(path);
                   if (progress)
                     progress(1.0);
                   out = std::move(mesh);
                 });
}

bool ReadMeshFromMemory(const std::string &text, const std::string &formatHint, const std::string &nameForMessages,
                        Mesh &out, std::string &error)
{
  return Guarded(nameForMessages, error,
                 [&]()
                 {
                   const Context ctx(nameForMessages);
                   const Format format = FormatFromName(formatHint);
                   if (format == Format::Unknown)
                     ctx.Fail("unknown mesh format " + Quote(formatHint) + "; expected obj, stl, off or ply");
                   Progress none(nullptr, 0.0, 1.0);
                   Mesh mesh;
                   Parse(format, ctx, text, none, mesh);
                   mesh.name = Stem(nameForMessages);
                   out = std::move(mesh);
                 });
}

bool ParseFiniteNumber(std::string_view token, double &value)
{
  double parsed = 0.0;
  if (ParseReal(token, parsed) != NumberStatus::Ok || !std::isfinite(parsed))
    return false;
  value = parsed;
  return true;
}
} // namespace rkmclash
