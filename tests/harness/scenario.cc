#include "tests/harness/scenario.h"

#include <ctime>

#include "tests/double/script.h"

namespace harness {
namespace {

constexpr int64_t kNow = 1795255200;  // Sat Nov 21 10:00:00 2026

std::string Read(std::string_view node, const Items& keys) {
  std::string read = std::string(node) + " [";
  for (size_t i = 0; i < keys.size(); ++i) read += (i == 0 ? "" : ",") + keys[i].Text();
  return read + "]";
}

}  // namespace

Item::Item(std::string_view text) : text_(script::Quote(text)) {}

Item Item::Unreadable(uint32_t status) {
  Item item;
  item.text_ = "!" + script::Status(status);
  return item;
}

Scenario::Scenario() { Time(kNow); }

Scenario& Scenario::Statement(std::string_view statement) {
  text_ += statement;
  text_ += '\n';
  return *this;
}

Scenario& Scenario::Time(int64_t seconds) { return Statement("time " + std::to_string(seconds)); }

Scenario& Scenario::Signature(uint32_t status, std::string_view kernelBuild,
                              std::string_view appBuild) {
  return Statement("signature " + script::Status(status) + " " + script::Quote(kernelBuild) + " " +
                   script::Quote(appBuild));
}

Scenario& Scenario::Cache(uint32_t status) { return Statement("cache " + script::Status(status)); }

Scenario& Scenario::Bytes(std::string_view node, const Items& keys, std::string_view bytes) {
  return Statement("value " + Read(node, keys) + " " + script::Hex(bytes));
}

Scenario& Scenario::List(std::string_view node, const Items& keys, const Items& entries) {
  std::string statement = "list " + Read(node, keys);
  for (const Item& entry : entries) statement += " " + entry.Text();
  return Statement(statement);
}

Scenario& Scenario::Count(std::string_view node, const Items& keys, uint32_t count) {
  return Statement("count " + Read(node, keys) + " " + std::to_string(count));
}

Scenario& Scenario::Fails(std::string_view node, const Items& keys, uint32_t status) {
  return Statement("status " + Read(node, keys) + " " + script::Status(status));
}

Scenario& Scenario::OthersFail(uint32_t status) {
  return Statement("others " + script::Status(status));
}

Scenario& Scenario::FailCall(int number, uint32_t status) {
  return Statement("fail " + std::to_string(number) + " " + script::Status(status));
}

Scenario& Scenario::FailCall(std::string_view operation, int number, uint32_t status) {
  return Statement("fail " + std::string(operation) + " " + std::to_string(number) + " " +
                   script::Status(status));
}

}  // namespace harness
