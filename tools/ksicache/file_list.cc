#include "tools/ksicache/file_list.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <memory>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

constexpr size_t kLongestList = size_t{64} << 20;

std::string ContentOf(std::FILE* file, const std::string& name) {
  std::string content;
  std::array<char, 65536> block;
  while (const size_t size = std::fread(block.data(), 1, block.size(), file)) {
    content.append(block.data(), size);
    if (content.size() > kLongestList) throw Error(name + ": is larger than 64 MiB");
  }
  if (std::ferror(file) != 0) throw SystemError(name, errno);
  return content;
}

std::string ContentOf(const std::string& name, bool isStandardInput) {
  if (isStandardInput) return ContentOf(stdin, name);
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(name.c_str(), "re"),
                                                             std::fclose);
  if (file == nullptr) throw SystemError(name, errno);
  return ContentOf(file.get(), name);
}

}  // namespace

std::vector<std::string> NamesIn(const std::string& list) {
  const bool isStandardInput = list == "-";
  const std::string name = isStandardInput ? "standard input" : list;
  const std::string content = ContentOf(name, isStandardInput);
  const char separator = content.find('\0') == std::string::npos ? '\n' : '\0';
  std::vector<std::string> names;
  for (size_t begin = 0; begin < content.size();) {
    const size_t end = std::min(content.find(separator, begin), content.size());
    if (end > begin) names.push_back(content.substr(begin, end - begin));
    begin = end + 1;
  }
  if (names.empty()) throw Error(name + ": names no file");
  return names;
}

}  // namespace ksicache
