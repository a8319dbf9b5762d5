#include "knvlibs/linux/linux_source.h"

#include "knvlibs/linux/handlers.h"

namespace ksi {

Status LinuxSource::Value(const Node& node, const Keys& keys, Buffer record) {
  const ValueHandler handler = HandlersOf(IdOf(node)).value;
  return handler == nullptr ? KSI_STATUS_NO_HANDLER : handler(host_, keys, record);
}

Status LinuxSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  const ListHandler handler = HandlersOf(IdOf(node)).list;
  return handler == nullptr ? KSI_STATUS_NO_HANDLER : handler(host_, keys, instances);
}

}  // namespace ksi
