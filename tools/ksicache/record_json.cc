#include "tools/ksicache/record_json.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <optional>

#include <knvlibs/ksi_records.h>
#include "knvlibs/characters.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

std::optional<unsigned> DigitOf(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  return std::nullopt;
}

std::string FromHex(const Json& json, const std::string& where) {
  std::string bytes;
  const std::string* hex = ksi::TextOf(&json);
  bool good = hex != nullptr && hex->size() % 2 == 0;
  for (size_t i = 0; good && i < hex->size(); i += 2) {
    const auto high = DigitOf((*hex)[i]);
    const auto low = DigitOf((*hex)[i + 1]);
    good = high && low;
    if (good) bytes += static_cast<char>(*high << 4 | *low);
  }
  if (!good) throw DataError(where + ": is not a string of hexadecimal digits (0-9, a-f)");
  return bytes;
}

uint64_t UnsignedAt(const ksi::Field& field, std::span<const std::byte> record) {
  uint64_t number = 0;
  std::memcpy(&number, record.data() + field.offset, field.width);  // little-endian
  return number;
}

int64_t SignedAt(const ksi::Field& field, std::span<const std::byte> record) {
  const int shift = 64 - 8 * field.width;
  return static_cast<int64_t>(UnsignedAt(field, record) << shift) >> shift;
}

bool IsZero(std::span<const std::byte> bytes) {
  return std::ranges::all_of(bytes, [](std::byte byte) { return byte == std::byte{0}; });
}

std::string Quoted(std::string_view text) {
  constexpr std::string_view kCharacters = "\"\\\b\f\n\r\t";
  constexpr std::string_view kEscapes = "\"\\bfnrt";
  std::string quoted = "\"";
  for (const char c : text) {
    const size_t at = kCharacters.find(c);
    if (at != std::string_view::npos) quoted += '\\';
    quoted += at != std::string_view::npos ? kEscapes[at] : c;
  }
  return PrintableJson(quoted + '"');
}

std::string HexJson(std::span<const std::byte> bytes) {
  return R"({"hex":")" + ToHex(bytes) + "\"}";
}

std::string FieldToJson(const ksi::Field& field, std::span<const std::byte> record) {
  switch (field.type) {
    case ksi::FieldType::kUnsigned:
    case ksi::FieldType::kBits:
      return std::to_string(UnsignedAt(field, record));
    case ksi::FieldType::kSigned:
      return std::to_string(SignedAt(field, record));
    case ksi::FieldType::kText:
      break;
  }
  const std::span<const std::byte> bytes = record.subspan(field.offset, field.width);
  const std::string_view text = TextOf(field, record);
  // Inside a record the hexadecimal form stands for the whole field.
  const bool isPlain = IsUtf8(text) && IsZero(bytes.subspan(text.size()));
  return isPlain ? Quoted(text) : HexJson(bytes);
}

// None if it is anything else, or has no room in 64 bits.
std::optional<int64_t> SignedOf(const Json& json) {
  if (json.kind != Json::Kind::kWord) return std::nullopt;
  int64_t number = 0;
  const char* end = json.text.data() + json.text.size();
  const auto [rest, error] = std::from_chars(json.text.data(), end, number);
  if (error != std::errc() || rest != end) return std::nullopt;
  return number;
}

void FieldFromJson(const ksi::Field& field, const Json& json, const std::string& where,
                   std::byte* at) {
  const int bits = 8 * field.width;
  uint64_t number = 0;
  bool good = false;
  if (const auto natural = ksi::NumberOf(&json)) {
    number = *natural;
    const int room = field.type == ksi::FieldType::kSigned ? bits - 1 : bits;
    good = room == 64 || number >> room == 0;
  } else if (const auto negative = SignedOf(json);
             negative && field.type == ksi::FieldType::kSigned) {
    number = static_cast<uint64_t>(*negative);
    good = *negative >> (bits - 1) == -1;
  }
  if (!good) {
    throw DataError(where + ": is not a" +
                    (field.type == ksi::FieldType::kSigned ? " signed" : "n unsigned") +
                    " whole number of " + std::to_string(bits) + " bits");
  }
  std::memcpy(at, &number, field.width);
}

void PutText(const std::string& text, const std::string& where, std::span<std::byte> at) {
  if (text.size() > at.size()) {
    throw DataError(where + ": is longer than " + std::to_string(at.size()) + " bytes");
  }
  std::ranges::transform(text, at.begin(), [](char c) { return static_cast<std::byte>(c); });
}

// Calls for every run of bytes of a record that no field names.
template <class Visit>
void ForEachGap(const ksi::Node& node, Visit&& visit) {
  size_t end = 0;
  const auto gap = [&](size_t next) {
    if (next > end) visit("unused" + std::to_string(end), end, next - end);
  };
  for (const ksi::Field& field : node.fields) {
    gap(field.offset);
    end = size_t{field.offset} + field.width;
  }
  gap(node.recordSize);
}

}  // namespace

std::string ToText(const Json& json) {
  if (json.kind == Json::Kind::kWord) return json.text;
  if (json.kind == Json::Kind::kText) return Quoted(json.text);
  const bool isObject = json.kind == Json::Kind::kObject;
  std::string text;
  for (const auto& [name, value] : json.members) {
    text += text.empty() ? "" : ",";
    text += (isObject ? Quoted(name) + ":" : "") + ToText(value);
  }
  return isObject ? "{" + text + "}" : "[" + text + "]";
}

bool IsUtf8(std::string_view text) {
  while (!text.empty()) {
    const ksi::Character first = ksi::FirstOf(text);
    if (!first.isValid) return false;
    text.remove_prefix(first.size);
  }
  return true;
}

std::string ToHex(std::span<const std::byte> bytes) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string hex;
  for (const std::byte byte : bytes) {
    hex += kDigits[std::to_integer<unsigned>(byte) >> 4];
    hex += kDigits[std::to_integer<unsigned>(byte) & 15];
  }
  return hex;
}

std::string TextToJson(std::string_view text) {
  return IsUtf8(text) ? Quoted(text) : HexJson(std::as_bytes(std::span(text)));
}

std::string TextFromJson(const Json& json, const std::string& where) {
  if (const std::string* text = ksi::TextOf(&json)) return *text;
  const Json* hex = json.members.size() == 1 ? ksi::FindMember(&json, "hex") : nullptr;
  if (hex == nullptr) throw DataError(where + R"(: is neither a string nor {"hex": "..."})");
  return FromHex(*hex, where + ".hex");
}

std::string PlainTextFromJson(const Json& json, const std::string& where) {
  std::string text = TextFromJson(json, where);
  if (text.find('\0') != std::string::npos) throw DataError(where + ": holds a NUL");
  return text;
}

int64_t NumberFromJson(const Json& json, const std::string& where) {
  const std::optional<int64_t> number = SignedOf(json);
  if (!number) throw DataError(where + ": is not a whole number of 64 bits");
  return *number;
}

std::string RecordToJson(const ksi::Node& node, std::span<const std::byte> record) {
  JsonWriter json;
  for (const ksi::Field& field : node.fields) json.Json(field.name, FieldToJson(field, record));
  ForEachUnused(node, record, [&](const std::string& name, const std::string& hex) {
    json.Json(name, Quoted(hex));
  });
  return json.Object();
}

std::vector<std::byte> RecordFromJson(const ksi::Node& node, const Json& json) {
  if (json.kind != Json::Kind::kObject) throw DataError("value: is not an object");
  std::vector<std::byte> record(node.recordSize);
  for (const Json::Member& member : json.members) {
    const std::string& name = member.name;
    const Json& value = member.value;
    const std::string where = "value." + Cut(name);
    const auto field = std::ranges::find_if(
        node.fields, [&](const ksi::Field& each) { return each.name == name; });
    if (field != node.fields.end() && field->type == ksi::FieldType::kText) {
      PutText(TextFromJson(value, where), where,
              std::span(record).subspan(field->offset, field->width));
      continue;
    }
    if (field != node.fields.end()) {
      FieldFromJson(*field, value, where, record.data() + field->offset);
      continue;
    }
    bool found = false;
    ForEachGap(node, [&](const std::string& gap, size_t offset, size_t size) {
      if (gap != name) return;
      found = true;
      PutText(FromHex(value, where), where, std::span(record).subspan(offset, size));
    });
    if (!found) throw DataError(where + ": the record has no such field");
  }
  return record;
}

std::string NumberToText(const ksi::Field& field, std::span<const std::byte> record) {
  const uint64_t number = UnsignedAt(field, record);
  switch (field.type) {
    case ksi::FieldType::kSigned:
      return std::to_string(SignedAt(field, record));
    case ksi::FieldType::kBits:
      return Hex(number);
    default:
      break;
  }
  if (field.width >= 4 && number == KSI_NO_VALUE_OF(8 * field.width)) return "no value";
  return std::to_string(number);
}

std::string_view TextOf(const ksi::Field& field, std::span<const std::byte> record) {
  const char* text = reinterpret_cast<const char*>(record.data()) + field.offset;
  return {text, strnlen(text, field.width)};
}

void ForEachUnused(
    const ksi::Node& node, std::span<const std::byte> record,
    const std::function<void(const std::string& name, const std::string& hex)>& visit) {
  ForEachGap(node, [&](const std::string& name, size_t offset, size_t size) {
    const std::span<const std::byte> bytes = record.subspan(offset, size);
    if (!IsZero(bytes)) visit(name, ToHex(bytes));
  });
}

}  // namespace ksicache
