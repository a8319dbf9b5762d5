// Pages of cache files written by hand, as no library would write them.
#ifndef TESTS_KNVLIBS_HOSTILE_PAGES_H_
#define TESTS_KNVLIBS_HOSTILE_PAGES_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace ksi {

// A file of pages of 4096 bytes, counted from 1.
class PageFile {
 public:
  static constexpr size_t kPage = 4096;

  explicit PageFile(std::string content) : content_(std::move(content)) {}

  // The page at the root of a table.
  static uint32_t RootOf(const std::string& fileName, const std::string& table);

  // An empty page at the end.
  uint32_t Append();

  // Fills a page of a table without row numbers with these cells; `rightmost` is the page after the
  // last one, 0 in a leaf.
  void Fill(uint32_t page, const std::vector<std::string>& cells, uint32_t rightmost);

  void Put(uint32_t page, size_t at, uint32_t number);

  // Puts a tree below `root` of `levels` pages in which every cell, `record` as its row, leads to
  // the next page; the last has one row, `last`.
  void PlantTree(uint32_t root, size_t levels, const std::string& record, const std::string& last);

  // With the head in order.
  const std::string& Content();

 private:
  std::string content_;
};

// A row of numbers from 0 to 127 and empty texts: "" is an empty text, "7" a number.
std::string Record(const std::vector<std::string>& columns);

// A cell before which the page `child` lies (0: in a leaf).
std::string Cell(uint32_t child, const std::string& record);

// The same with a row of `size` bytes that begins with `record` and goes on in the page `next`.
std::string OverflowingCell(uint32_t child, const std::string& record, size_t size, uint32_t next);

}  // namespace ksi

#endif  // TESTS_KNVLIBS_HOSTILE_PAGES_H_
