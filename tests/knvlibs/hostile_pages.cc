#include "tests/knvlibs/hostile_pages.h"

#include <stdexcept>

#include "knvlibs/sqlite.h"
#include "tests/knvlibs/cache_fixture.h"

namespace ksi {
namespace {

std::string BigEndian(uint64_t number, size_t width) {
  std::string text(width, '\0');
  for (size_t i = width; i-- > 0; number >>= 8) text[i] = static_cast<char>(number & 255);
  return text;
}

// SQLite's numbers of variable length: seven bits a byte, the highest first.
std::string Varint(uint64_t number) {
  std::string text(1, static_cast<char>(number & 127));
  while ((number >>= 7) != 0) text.insert(0, 1, static_cast<char>(128 | (number & 127)));
  return text;
}

}  // namespace

uint32_t PageFile::RootOf(const std::string& fileName, const std::string& table) {
  const Database database = OpenAsOwner(fileName);
  Statement rows;
  rows.Prepare(database.get(), "SELECT rootpage FROM sqlite_schema WHERE name = ?1");
  rows.Bind(1, table);
  if (rows.Step() != SQLITE_ROW) throw std::runtime_error("no table " + table);
  return static_cast<uint32_t>(rows.Number(0));
}

uint32_t PageFile::Append() {
  content_.resize(content_.size() + kPage);
  return static_cast<uint32_t>(content_.size() / kPage);
}

void PageFile::Put(uint32_t page, size_t at, uint32_t number) {
  content_.replace((page - 1) * kPage + at, 4, BigEndian(number, 4));
}

void PageFile::Fill(uint32_t page, const std::vector<std::string>& cells, uint32_t rightmost) {
  std::string pointers;
  std::string area;
  for (const std::string& cell : cells) {
    area.insert(0, cell);
    pointers += BigEndian(kPage - area.size(), 2);
  }
  std::string text(1, rightmost == 0 ? '\12' : '\2');
  text += BigEndian(0, 2) + BigEndian(cells.size(), 2) + BigEndian(kPage - area.size(), 2) +
          std::string(1, '\0');
  if (rightmost != 0) text += BigEndian(rightmost, 4);
  text += pointers;
  if (text.size() + area.size() > kPage) throw std::runtime_error("too many cells");
  text.resize(kPage - area.size());
  content_.replace((page - 1) * kPage, kPage, text + area);
}

void PageFile::PlantTree(uint32_t root, size_t levels, const std::string& record,
                         const std::string& last) {
  uint32_t page = root;
  for (; levels > 1; --levels) {
    const uint32_t next = Append();
    const std::string cell = Cell(next, record);
    Fill(page, std::vector<std::string>((kPage - 12) / (cell.size() + 2), cell), next);
    page = next;
  }
  Fill(page, {Cell(0, last)}, 0);
}

const std::string& PageFile::Content() {
  Put(1, 28, static_cast<uint32_t>(content_.size() / kPage));
  return content_;
}

std::string Record(const std::vector<std::string>& columns) {
  std::string types;
  std::string body;
  for (const std::string& column : columns) {
    types += column.empty() ? '\15' : '\1';
    if (!column.empty()) body += static_cast<char>(std::stoi(column));
  }
  return Varint(types.size() + 1) + types + body;
}

std::string Cell(uint32_t child, const std::string& record) {
  return (child == 0 ? "" : BigEndian(child, 4)) + Varint(record.size()) + record;
}

std::string OverflowingCell(uint32_t child, const std::string& record, size_t size, uint32_t next) {
  // How much of a row a page keeps follows from its size.
  constexpr size_t kMost = (PageFile::kPage - 12) * 64 / 255 - 23;
  constexpr size_t kLeast = (PageFile::kPage - 12) * 32 / 255 - 23;
  const size_t surplus = kLeast + (size - kLeast) % (PageFile::kPage - 4);
  std::string local = record;
  local.resize(surplus <= kMost ? surplus : kLeast);
  return (child == 0 ? "" : BigEndian(child, 4)) + Varint(size) + local + BigEndian(next, 4);
}

}  // namespace ksi
