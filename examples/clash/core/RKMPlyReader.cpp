// The PLY reader: its header's types, properties and elements, and the sources of its text and binary
// bodies. PLY is a header of text lines naming elements and their typed properties, then the elements in
// that order, as text (one element a line) or as packed binary of either byte order. The mesh takes x, y
// and z from 'vertex' and the index list from 'face'; every other element and property is read past.

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

#include "RKMMeshReaderParts.h"

namespace rkmclash::reading
{
namespace
{
enum class PlyType
{
  Int8,
  UInt8,
  Int16,
  UInt16,
  Int32,
  UInt32,
  Float32,
  Float64
};

struct PlyTypeInfo
{
  const char *name;
  const char *alias;
  std::size_t size;
  // The range of an integer type; the two float types are not range-checked.
  double lowest, highest;
};

constexpr PlyTypeInfo kPlyTypes[] = {{"char", "int8", 1, -128.0, 127.0},
                                     {"uchar", "uint8", 1, 0.0, 255.0},
                                     {"short", "int16", 2, -32768.0, 32767.0},
                                     {"ushort", "uint16", 2, 0.0, 65535.0},
                                     {"int", "int32", 4, -2147483648.0, 2147483647.0},
                                     {"uint", "uint32", 4, 0.0, 4294967295.0},
                                     {"float", "float32", 4, 0.0, 0.0},
                                     {"double", "float64", 8, 0.0, 0.0}};

const PlyTypeInfo &Info(PlyType type) { return kPlyTypes[static_cast<int>(type)]; }
bool IsIntegerType(PlyType type) { return type < PlyType::Float32; }

bool PlyTypeFromName(std::string_view name, PlyType &type)
{
  for (std::size_t i = 0; i < std::size(kPlyTypes); ++i)
    if (name == kPlyTypes[i].name || name == kPlyTypes[i].alias)
    {
      type = static_cast<PlyType>(i);
      return true;
    }
  return false;
}

// What the mesh takes from a property: a vertex coordinate (0, 1, 2 for x, y, z) or a face's indices.
constexpr int kPlySkip = -1;
constexpr int kPlyIndices = 3;

struct PlyProperty
{
  std::string name;
  std::size_t line = 0;
  bool list = false;
  PlyType countType = PlyType::UInt8;
  // The type of the value, or of a list's items.
  PlyType type = PlyType::Float32;
  int role = kPlySkip;
};

struct PlyElement
{
  std::string name;
  std::size_t line = 0;
  unsigned long long count = 0;
  std::vector<PlyProperty> properties;
  // The fewest bytes an instance takes in binary: its scalars and its lists' counts.
  std::size_t minimumBytes = 0;
};

enum class PlyEncoding
{
  Ascii,
  LittleEndian,
  BigEndian
};

struct PlyHeader
{
  PlyEncoding encoding = PlyEncoding::Ascii;
  std::vector<PlyElement> elements;
  std::size_t vertexElement = 0, faceElement = 0;
};

void ParsePlyProperty(const Context &ctx, std::size_t line, const std::vector<std::string_view> &tokens,
                      PlyElement &element)
{
  PlyProperty property;
  property.line = line;
  property.list = tokens.size() > 1 && tokens[1] == "list";
  const std::size_t expected = property.list ? 5 : 3;
  if (tokens.size() != expected)
    ctx.FailAt(line, property.list ? "expected 'property list COUNT_TYPE ITEM_TYPE NAME'"
                                   : "expected 'property TYPE NAME'");
  const auto typeOf = [&](std::string_view name, PlyType &type)
  {
    if (!PlyTypeFromName(name, type))
      ctx.FailAt(line, "unknown property type " + Quote(name));
  };
  if (property.list)
  {
    typeOf(tokens[2], property.countType);
    if (!IsIntegerType(property.countType))
      ctx.FailAt(line, "a list count needs an integer type, not " + Quote(tokens[2]));
  }
  typeOf(tokens[expected - 2], property.type);
  property.name = tokens[expected - 1];
  for (const PlyProperty &other : element.properties)
    if (other.name == property.name)
      ctx.FailAt(line, "element " + Quote(element.name) + " has a second property " + Quote(property.name));
  element.minimumBytes += Info(property.list ? property.countType : property.type).size;
  element.properties.push_back(std::move(property));
}

// Gives each property of the vertex and face elements its role, and checks that the mesh finds what it
// needs. `line` is that of end_header, where anything missing is noticed.
void AssignPlyRoles(const Context &ctx, std::size_t line, PlyHeader &header)
{
  bool haveVertex = false, haveFace = false;
  for (std::size_t i = 0; i < header.elements.size(); ++i)
  {
    PlyElement &element = header.elements[i];
    const bool vertex = element.name == "vertex", face = element.name == "face";
    if (vertex)
      header.vertexElement = i;
    if (face)
      header.faceElement = i;
    haveVertex |= vertex;
    haveFace |= face;
    for (PlyProperty &p : element.properties)
      if (vertex && (p.name == "x" || p.name == "y" || p.name == "z"))
      {
        if (p.list)
          ctx.FailAt(p.line, "vertex coordinate " + Quote(p.name) + " is a list");
        p.role = p.name[0] - 'x';
      }
      else if (face && (p.name == "vertex_indices" || p.name == "vertex_index"))
      {
        if (!p.list || !IsIntegerType(p.type))
          ctx.FailAt(p.line, "face property " + Quote(p.name) + " must be a list of integers");
        for (const PlyProperty &other : element.properties)
          if (other.role == kPlyIndices)
            ctx.FailAt(p.line, "face has both 'vertex_indices' and 'vertex_index'");
        p.role = kPlyIndices;
      }
  }
  if (!haveVertex)
    ctx.FailAt(line, "no 'vertex' element in the header");
  if (!haveFace)
    ctx.FailAt(line, "no triangles: no 'face' element in the header");
  const PlyElement &vertex = header.elements[header.vertexElement];
  for (int axis = 0; axis < 3; ++axis)
    if (std::none_of(vertex.properties.begin(), vertex.properties.end(),
                     [&](const PlyProperty &p) { return p.role == axis; }))
      ctx.FailAt(vertex.line, std::string("element 'vertex' has no property '") + static_cast<char>('x' + axis) + "'");
  if (vertex.count > kMaxVertices)
    ctx.FailAt(vertex.line, "too many vertices (at most " + Str(kMaxVertices) + ")");
  const PlyElement &face = header.elements[header.faceElement];
  if (std::none_of(face.properties.begin(), face.properties.end(),
                   [](const PlyProperty &p) { return p.role == kPlyIndices; }))
    ctx.FailAt(face.line, "element 'face' has no 'vertex_indices' list");
  if (face.count == 0)
    ctx.FailAt(face.line, "no triangles: the file declares 0 faces");
}

PlyHeader ParsePlyHeader(const Context &ctx, LineReader &reader, std::size_t size)
{
  std::vector<std::string_view> tokens;
  if (!reader.Next(tokens))
    ctx.Fail("file is empty (no PLY header)");
  if (tokens.size() != 1 || tokens[0] != "ply")
    ctx.FailAt(reader.Line(), "not a PLY file: the first line must be 'ply'");
  PlyHeader header;
  bool haveFormat = false;
  for (;;)
  {
    if (!reader.Next(tokens))
      reader.FailAtEnd("file ends before 'end_header'");
    const std::size_t line = reader.Line();
    if (tokens.empty() || tokens[0] == "comment" || tokens[0] == "obj_info")
      continue;
    const std::string_view keyword = tokens[0];
    if (keyword == "end_header" && tokens.size() == 1 && haveFormat)
      break;
    if (keyword == "format" && !haveFormat)
    {
      if (tokens.size() != 3)
        ctx.FailAt(line, "expected 'format ascii|binary_little_endian|binary_big_endian 1.0'");
      if (tokens[1] == "ascii")
        header.encoding = PlyEncoding::Ascii;
      else if (tokens[1] == "binary_little_endian")
        header.encoding = PlyEncoding::LittleEndian;
      else if (tokens[1] == "binary_big_endian")
        header.encoding = PlyEncoding::BigEndian;
      else
        ctx.FailAt(line, "unknown PLY format " + Quote(tokens[1]));
      if (tokens[2] != "1.0")
        ctx.FailAt(line, "unsupported PLY version " + Quote(tokens[2]) + " (expected 1.0)");
      haveFormat = true;
    }
    else if (!haveFormat)
      ctx.FailAt(line, "expected the 'format' line, found " + Quote(keyword));
    else if (keyword == "element" && tokens.size() == 3)
    {
      PlyElement element;
      element.name = tokens[1];
      element.line = line;
      const NumberStatus status = ParseNumber(tokens[2], element.count);
      if (status == NumberStatus::OutOfRange)
        ctx.FailAt(line, "element count " + Quote(tokens[2]) + " is too large");
      if (status != NumberStatus::Ok)
        ctx.FailAt(line, "malformed element count " + Quote(tokens[2]) + " (expected a non-negative integer)");
      for (const PlyElement &other : header.elements)
        if (other.name == element.name)
          ctx.FailAt(line, "a second element " + Quote(element.name));
      header.elements.push_back(std::move(element));
    }
    else if (keyword == "property" && !header.elements.empty())
      ParsePlyProperty(ctx, line, tokens, header.elements.back());
    else
      ctx.FailAt(line, "unexpected header line " + Quote(keyword) +
                           (keyword == "property" ? " before any element"
                            : keyword == "element" ? " (expected 'element NAME COUNT')"
                                                   : ""));
  }
  AssignPlyRoles(ctx, reader.Line(), header);

  // The counts are never trusted: an element takes at least its minimum bytes in binary, and a line of
  // two bytes in text ("0\n"; the last line may lack its end), so larger counts are refused before
  // anything is allocated. Elements without properties take nothing and are skipped.
  const std::size_t remaining = size - reader.Offset();
  const bool binary = header.encoding != PlyEncoding::Ascii;
  const unsigned long long room = binary ? remaining : remaining + 1;
  unsigned long long needed = 0;
  for (const PlyElement &e : header.elements)
  {
    const unsigned long long each = e.properties.empty() ? 0 : binary ? e.minimumBytes : 2;
    if (each != 0 && (e.count > room / each || (needed += e.count * each) > room))
      ctx.FailAt(e.line, "element " + Quote(e.name) + " declares " + std::to_string(e.count) +
                             " items, more than the remaining " + Str(remaining) + " bytes of the file can hold");
  }
  return header;
}

// The text body: each element instance on a line of its own, its values in the header's order.
class PlyAsciiSource
{
public:
  PlyAsciiSource(const Context &ctx, LineReader &reader) : m_ctx(ctx), m_reader(reader) {}

  void Begin(const PlyElement &element, unsigned long long index)
  {
    do
      if (!m_reader.Next(m_tokens))
        m_reader.FailAtEnd("file ends after " + std::to_string(index) + " of " + std::to_string(element.count) +
                           " " + Quote(element.name) + " elements");
    while (m_tokens.empty());
    m_next = 0;
  }

  double Scalar(PlyType type, bool coordinate)
  {
    if (m_next == m_tokens.size())
      Fail("too few values for the properties the header declares");
    const std::string_view token = m_tokens[m_next++];
    if (IsIntegerType(type))
    {
      long long value = 0;
      const NumberStatus status = ParseNumber(token, value);
      if (status == NumberStatus::Malformed)
        Fail("malformed integer " + Quote(token));
      if (status == NumberStatus::OutOfRange || value < Info(type).lowest || value > Info(type).highest)
        Fail("value " + Quote(token) + " is out of the range of type '" + Info(type).name + "'");
      return static_cast<double>(value);
    }
    if (coordinate)
      return ParseCoordinate(m_ctx, m_reader.Line(), token);
    // A value the mesh does not keep is checked for its form only.
    double value = 0.0;
    if (ParseReal(token, value) == NumberStatus::Malformed)
      Fail("malformed number " + Quote(token));
    return value;
  }

  unsigned long long ListCount(const PlyProperty &property)
  {
    const double count = Scalar(property.countType, false);
    if (count < 0.0)
      Fail("negative list length " + Str(static_cast<long long>(count)));
    const std::size_t left = m_tokens.size() - m_next;
    if (count > static_cast<double>(left))
      Fail("list " + Quote(property.name) + " declares " + Str(static_cast<long long>(count)) +
           " values but the line has " + Str(left) + " more");
    return static_cast<unsigned long long>(count);
  }

  void End()
  {
    if (m_next != m_tokens.size())
      Fail("the line has " + Str(m_tokens.size()) + " values, but the header's properties take " + Str(m_next));
  }

  [[noreturn]] void Fail(const std::string &message) const { m_ctx.FailAt(m_reader.Line(), message); }

private:
  const Context &m_ctx;
  LineReader &m_reader;
  std::vector<std::string_view> m_tokens;
  std::size_t m_next = 0;
};

// The binary body: the values packed in the header's order, in the file's byte order.
class PlyBinarySource
{
public:
  PlyBinarySource(const Context &ctx, std::string_view data, std::size_t offset, bool bigEndian, Progress &progress)
      : m_ctx(ctx), m_data(data), m_pos(offset), m_bigEndian(bigEndian), m_progress(progress)
  {
  }

  void Begin(const PlyElement &element, unsigned long long index)
  {
    m_element = &element;
    m_index = index;
    m_start = m_pos;
    m_progress.Update(m_pos, m_data.size());
  }

  double Scalar(PlyType type, bool coordinate)
  {
    const std::size_t size = Info(type).size;
    if (size > m_data.size() - m_pos)
      Fail("the file ends inside it (truncated file?)");
    const auto *bytes = reinterpret_cast<const unsigned char *>(m_data.data()) + m_pos;
    m_pos += size;
    std::uint64_t bits = 0;
    for (std::size_t k = 0; k < size; ++k)
      bits = bits << 8 | bytes[m_bigEndian ? k : size - 1 - k];
    double value = 0.0;
    switch (type)
    {
    case PlyType::Int8:
      return static_cast<std::int8_t>(bits);
    case PlyType::Int16:
      return static_cast<std::int16_t>(bits);
    case PlyType::Int32:
      return static_cast<std::int32_t>(bits);
    case PlyType::UInt8:
    case PlyType::UInt16:
    case PlyType::UInt32:
      return static_cast<double>(bits);
    case PlyType::Float32:
    {
      const auto narrow = static_cast<std::uint32_t>(bits);
      float f;
      std::memcpy(&f, &narrow, sizeof f);
      value = f;
      break;
    }
    case PlyType::Float64:
      std::memcpy(&value, &bits, sizeof value);
      break;
    }
    if (coordinate && !std::isfinite(value))
      Fail("a coordinate is not a finite number");
    return value;
  }

  unsigned long long ListCount(const PlyProperty &property)
  {
    const double count = Scalar(property.countType, false);
    if (count < 0.0)
      Fail("negative list length " + Str(static_cast<long long>(count)));
    if (count > static_cast<double>((m_data.size() - m_pos) / Info(property.type).size))
      Fail("its list of " + Str(static_cast<long long>(count)) +
           " values runs past the end of the file (truncated file?)");
    return static_cast<unsigned long long>(count);
  }

  void End() {}

  [[noreturn]] void Fail(const std::string &message) const
  {
    m_ctx.Fail(m_element->name + " " + std::to_string(m_index + 1) + " (byte offset " + Str(m_start) + "): " + message);
  }

private:
  const Context &m_ctx;
  std::string_view m_data;
  std::size_t m_pos;
  bool m_bigEndian;
  Progress &m_progress;
  const PlyElement *m_element = nullptr;
  unsigned long long m_index = 0;
  std::size_t m_start = 0;
};

template <class Source> void ReadPlyElements(const PlyHeader &header, Source &source, Mesh &mesh)
{
  const auto vertexCount = static_cast<long long>(header.elements[header.vertexElement].count);
  mesh.vertices.reserve(static_cast<std::size_t>(vertexCount));
  std::vector<int> polygon;
  for (std::size_t e = 0; e < header.elements.size(); ++e)
  {
    const PlyElement &element = header.elements[e];
    if (element.properties.empty())
      continue;
    for (unsigned long long index = 0; index < element.count; ++index)
    {
      source.Begin(element, index);
      std::array<double, 3> point = {0.0, 0.0, 0.0};
      polygon.clear();
      for (const PlyProperty &p : element.properties)
      {
        const bool coordinate = p.role >= 0 && p.role < 3;
        if (!p.list)
        {
          const double value = source.Scalar(p.type, coordinate);
          if (coordinate)
            point[static_cast<std::size_t>(p.role)] = value;
          continue;
        }
        const unsigned long long count = source.ListCount(p);
        for (unsigned long long k = 0; k < count; ++k)
        {
          const double value = source.Scalar(p.type, false);
          if (p.role != kPlyIndices)
            continue;
          if (!(value >= 0.0 && value < static_cast<double>(vertexCount)))
            source.Fail("face index " + Str(static_cast<long long>(value)) + " out of range " +
                        Range(0, vertexCount - 1));
          polygon.push_back(static_cast<int>(value));
        }
        if (p.role == kPlyIndices && count < 3)
          source.Fail("face with fewer than 3 vertices (" + std::to_string(count) + ")");
      }
      source.End();
      if (e == header.vertexElement)
        mesh.vertices.push_back(point);
      else if (e == header.faceElement)
        AddFan(polygon, mesh.triangles);
    }
  }
}
} // namespace

void ParsePly(const Context &ctx, std::string_view data, Progress &progress, Mesh &mesh)
{
  LineReader reader(ctx, data, progress);
  const PlyHeader header = ParsePlyHeader(ctx, reader, data.size());
  if (header.encoding == PlyEncoding::Ascii)
  {
    PlyAsciiSource source(ctx, reader);
    return ReadPlyElements(header, source, mesh);
  }
  PlyBinarySource source(ctx, data, reader.Offset(), header.encoding == PlyEncoding::BigEndian, progress);
  ReadPlyElements(header, source, mesh);
}
} // namespace rkmclash::reading
