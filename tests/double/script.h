// The text in which a scenario and a trace of the test double are written: one statement a line,
// words separated by blanks, texts in single quotes.
#ifndef TESTS_DOUBLE_SCRIPT_H_
#define TESTS_DOUBLE_SCRIPT_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace script {

// The environment variable with the path of the scenario.
inline constexpr const char* kScenarioVariable = "TALLY_DOUBLE_SCENARIO";

inline constexpr std::string_view kHexDigits = "0123456789abcdef";

// `text` in single quotes; quotes, backslashes and bytes that do not print become \xNN.
inline std::string Quote(std::string_view text) {
  std::string quoted = "'";
  for (const char c : text) {
    if (c < ' ' || c > '~' || c == '\'' || c == '\\') {
      const auto byte = static_cast<unsigned char>(c);
      quoted += "\\x";
      quoted += kHexDigits[byte >> 4];
      quoted += kHexDigits[byte & 15];
    } else {
      quoted += c;
    }
  }
  return quoted + "'";
}

inline std::string Hex(std::string_view bytes) {
  std::string hex;
  hex.reserve(2 * bytes.size());
  for (const char c : bytes) {
    const auto byte = static_cast<unsigned char>(c);
    hex += kHexDigits[byte >> 4];
    hex += kHexDigits[byte & 15];
  }
  return hex;
}

inline std::string Unhex(std::string_view hex) {
  std::string bytes;
  for (size_t i = 0; i + 1 < hex.size(); i += 2) {
    bytes += static_cast<char>(kHexDigits.find(hex[i]) << 4 | kHexDigits.find(hex[i + 1]));
  }
  return bytes;
}

// The text of a quoted word.
inline std::string Unquote(std::string_view quoted) {
  std::string text;
  for (size_t i = 1; i + 1 < quoted.size(); ++i) {
    if (quoted[i] == '\\') {
      text += Unhex(quoted.substr(i + 2, 2));
      i += 3;
    } else {
      text += quoted[i];
    }
  }
  return text;
}

// The words of a line; blanks inside quotes do not separate.
inline std::vector<std::string> Words(std::string_view line) {
  std::vector<std::string> words;
  bool quoted = false;
  bool inWord = false;
  for (const char c : line) {
    if (c == '\'') quoted = !quoted;
    if (c == ' ' && !quoted) {
      inWord = false;
      continue;
    }
    if (!inWord) words.emplace_back();
    inWord = true;
    words.back() += c;
  }
  return words;
}

// A status as people write it.
inline std::string Status(uint32_t status) {
  if (status == 0) return "0";
  std::string digits;
  for (; status != 0; status >>= 4) digits.insert(digits.begin(), kHexDigits[status & 15]);
  return "0x" + digits;
}

}  // namespace script

#endif  // TESTS_DOUBLE_SCRIPT_H_
