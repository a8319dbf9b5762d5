// Answers from a cache file.
//
// A report asks for many nodes of one object (a group, a client, a heap) before it goes on to the
// next, and the file keeps an object's readings side by side. So the first read of an object takes
// them all, and the reads after it are answered from memory; an object that follows the last one
// in the file is read on without a search. The cost of a read depends on neither the number of
// objects nor, much, on their order, and the memory is that of a few objects.
#ifndef KNVLIBS_CACHE_SOURCE_H_
#define KNVLIBS_CACHE_SOURCE_H_

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/cache_file.h"
#include "knvlibs/list_walk.h"
#include "knvlibs/source.h"

namespace ksi {

class CacheSource : public Source {
 public:
  // From a file that is open; its name is for messages.
  CacheSource(std::string fileName, std::unique_ptr<CacheFile> file);

  // A key that the file does not have is KSI_STATUS_NOT_FOUND; a read that failed when it was
  // captured fails with its status again. The first that fails because the file is damaged or
  // cannot be read is told, with the reason.
  [[nodiscard]] Status Value(const Node& node, const Keys& keys, Buffer record) override;
  [[nodiscard]] Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;
  // A walk over groups that contain each other, or with clients or volumes that are listed over and
  // over, fails in time, with KSI_STATUS_METADATA_READ_ERROR.
  void Refresh() override { walk_.Restart(); }
  [[nodiscard]] Status WalkStatus() const override { return walk_.WalkStatus(); }
  Definitions KernelDefinitions() const override;
  std::optional<Origin> GetOrigin() const override;

 private:
  struct Reading {
    int64_t node;  // its identifier in the file
    Status status;
    int type;        // SQLite's, of the answer
    int64_t number;  // of an integer
    size_t offset;   // of a blob, in Object::bytes
    size_t size;
  };

  // A key as the file has it; an absent one is the empty text.
  struct OwnKey {
    KeyKind kind = KeyKind::kText;
    int64_t number = 0;
    std::string text;

    bool Is(const Key& key) const;
    void Take(const Key& key);
  };

  struct Object {
    bool valid = false;
    OwnKey keys[kMaxKeys];
    std::vector<Reading> readings;
    std::vector<std::byte> bytes;
    int64_t listed = -1;  // the node, in the file, of the list that `entries` are of, -1: none
    ParamList entries{ParamList::kNoLimit};
  };

  // Over all readings from an object on, or over the entries of all lists.
  struct Cursor {
    Statement rows;
    bool isOnRow = false;
    std::array<std::optional<Key>, kMaxKeys> at;  // the keys of that row

    bool IsAt(const Keys& keys) const;
    int Step();
    void Leave();
    int Seek(sqlite3* database, const Keys& keys, const int64_t* node);
  };

  [[nodiscard]] Status Read(const Node& node, const Keys& keys, Buffer record);
  [[nodiscard]] Status BeginList(const Node& node, const Keys& keys);
  [[nodiscard]] Status Damaged(const char* why);
  [[nodiscard]] Status StatusOfCall(int code);
  void TellWhy(const Node& node);
  [[nodiscard]] Status BeginRead();
  [[nodiscard]] Status Find(const Node& node, Kind kind, const Keys& keys, Object** object,
                            const Reading** reading);
  [[nodiscard]] Status List(const Node& node, const Keys& keys, ParamList& instances);
  [[nodiscard]] Status ReadEntries(const Node& node, const Keys& keys, const Reading& reading,
                                   ParamList& instances);
  [[nodiscard]] Status TakeEntry(const Node& node, ParamList& instances);
  [[nodiscard]] Status FindObject(const Keys& keys, Object** object);
  [[nodiscard]] Status FindCursor(const Keys& keys, Cursor*& cursor);
  [[nodiscard]] Status Load(const Keys& keys, Object& object);
  [[nodiscard]] Status TakeReading(const Statement& row, Object& object);

  std::string fileName_;
  std::unique_ptr<CacheFile> file_;
  ListWalk walk_;
  std::string why_;  // what is wrong with what is being read, empty: nothing
  bool told_ = false;
  // The identifiers that the nodes of the catalogue have in the file, -1: not in it.
  std::array<std::vector<int64_t>, 2> ids_;

  // A report goes in order through several regions of the file: its groups, their clients and their
  // leaders. In each a cursor waits where the next object begins.
  std::array<Cursor, 3> cursors_;
  size_t restedCursor_ = 0;
  Cursor entries_;

  // The objects read last: a report alternates between a group, its client and its leader.
  std::array<Object, 4> objects_;
  size_t oldest_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_CACHE_SOURCE_H_
