// Records as JSON and back, without loss.
//
// A field is a number, or a text that ends at its first NUL. Text that is not UTF-8, or with
// something behind its NUL, is {"hex": "..."}, all bytes of the field. Bytes that no field names
// are left out if they are zero, else written as hexadecimal digits under "unused" with their
// offset.
#ifndef TOOLS_KSICACHE_RECORD_JSON_H_
#define TOOLS_KSICACHE_RECORD_JSON_H_

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/json.h"

namespace ksicache {

using ksi::Json;

// JSON is written with escapes for all characters that are not to be shown.

// What was read, as it would be written.
std::string ToText(const Json& json);

bool IsUtf8(std::string_view text);

// The bytes, two digits each.
std::string ToHex(std::span<const std::byte> bytes);

// Text of any bytes: a string, or {"hex": "..."}.
std::string TextToJson(std::string_view text);
// Fails with a DataError that starts with `where`.
std::string TextFromJson(const Json& json, const std::string& where);
// The same of a text that has no NUL.
std::string PlainTextFromJson(const Json& json, const std::string& where);

// A whole number of 64 bits, signed. Fails likewise.
int64_t NumberFromJson(const Json& json, const std::string& where);

std::string RecordToJson(const ksi::Node& node, std::span<const std::byte> record);

// A field that is not given is zero. Fails with a DataError that names what is wrong.
std::vector<std::byte> RecordFromJson(const ksi::Node& node, const Json& json);

// A number that a field holds, as it is shown.
std::string NumberToText(const ksi::Field& field, std::span<const std::byte> record);

// The text of a field up to its NUL.
std::string_view TextOf(const ksi::Field& field, std::span<const std::byte> record);

// Calls for every run of bytes that no field names and that are not all zero.
void ForEachUnused(
    const ksi::Node& node, std::span<const std::byte> record,
    const std::function<void(const std::string& name, const std::string& hex)>& visit);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RECORD_JSON_H_
