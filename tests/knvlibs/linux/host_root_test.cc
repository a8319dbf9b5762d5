// What a recorded tree's files are, and that nothing in it leads out.
#include "knvlibs/linux/host/host_root.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <string>

#include "knvlibs/linux/host/host.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

enum class By { kKernel, kSteps };

class HostRootTest : public testing::TestWithParam<By> {
 protected:
  HostRootTest() {
    outside_.Write("/secret", "secret");
    outside_.Write("/directory/file", "secret");
    tree_.Write("/proc/file", "inside");
    tree_.Write("/proc/deep/below/file", "below");
  }

  void Link(const std::string& link, const std::string& target) const {
    std::filesystem::create_symlink(target, tree_.Root() + link);
  }

  FileDescriptor Open(const std::string& path, int flags) const {
    if (GetParam() == By::kKernel) return HostRoot(tree_.Root()).Open(path, flags);
    const FileDescriptor root(open(tree_.Root().c_str(), O_PATH));
    return OpenBelow(root.Get(), path, flags);
  }

  // What a file holds, or the error of opening it.
  std::string Content(const std::string& path, int flags = O_RDONLY) const {
    const FileDescriptor file = Open(path, flags);
    if (!file.IsOpen()) return "error " + std::to_string(errno);
    std::array<char, 64> text;
    const ssize_t length = read(file.Get(), text.data(), text.size());
    return length < 0 ? "unreadable" : std::string(text.data(), static_cast<size_t>(length));
  }

  static std::string Error(int error) { return "error " + std::to_string(error); }

  HostTree outside_;
  HostTree tree_;
};

TEST_P(HostRootTest, FilesAreNamedFromTheRoot) {
  EXPECT_EQ(Content("/proc/file"), "inside");
  EXPECT_EQ(Content("proc//./deep/../file"), "inside");
  EXPECT_EQ(Content("/proc/none"), Error(ENOENT));
  EXPECT_EQ(Content("/none/file"), Error(ENOENT));
  EXPECT_EQ(Content("/proc/file/x"), Error(ENOTDIR));
  EXPECT_TRUE(Open("/proc", O_RDONLY | O_DIRECTORY).IsOpen());
  EXPECT_TRUE(Open("/", O_RDONLY | O_DIRECTORY).IsOpen());
  EXPECT_EQ(Content("/proc/file", O_RDONLY | O_DIRECTORY), Error(ENOTDIR));
}

TEST_P(HostRootTest, LinksInsideAreFollowed) {
  Link("/proc/absolute", "/proc/file");
  Link("/proc/deep/relative", "../file");
  Link("/proc/deep/directory", "below");
  Link("/proc/deep/again", "directory");
  EXPECT_EQ(Content("/proc/absolute"), "inside");
  EXPECT_EQ(Content("/proc/deep/relative"), "inside");
  EXPECT_EQ(Content("/proc/deep/again/file"), "below");
  EXPECT_EQ(Content("/proc/deep/again/../../file"), "inside");
  EXPECT_EQ(Content("/proc/absolute", O_RDONLY | O_NOFOLLOW), Error(ELOOP));
}

TEST_P(HostRootTest, NothingLeadsOut) {
  std::string up;
  for (int i = 0; i < 20; ++i) up += "../";
  Link("/proc/absolute", outside_.Root() + "/secret");
  Link("/proc/relative", up + outside_.Root().substr(1) + "/secret");
  Link("/proc/directory", outside_.Root() + "/directory");
  Link("/proc/parent", "../..");
  EXPECT_EQ(Content("/proc/absolute"), Error(ENOENT));
  EXPECT_EQ(Content("/proc/relative"), Error(ENOENT));
  EXPECT_EQ(Content("/proc/directory/file"), Error(ENOENT));
  EXPECT_EQ(Content("/" + up + outside_.Root() + "/secret"), Error(ENOENT));
  // Above the root is the root.
  EXPECT_EQ(Content("/proc/parent/proc/file"), "inside");
  EXPECT_EQ(Content("/" + up + "proc/file"), "inside");
}

TEST_P(HostRootTest, LinksThatGoRoundEnd) {
  Link("/proc/a", "b");
  Link("/proc/b", "a");
  Link("/proc/grows", "grows/grows");
  EXPECT_EQ(Content("/proc/a"), Error(ELOOP));
  EXPECT_EQ(Content("/proc/grows"), Error(ELOOP));
}

TEST_P(HostRootTest, ALinkItselfCanBeOpened) {
  Link("/proc/link", "socket:[7]");
  const FileDescriptor link = Open("/proc/link", O_PATH | O_NOFOLLOW);
  ASSERT_TRUE(link.IsOpen());
  std::array<char, 64> text;
  EXPECT_EQ(readlinkat(link.Get(), "", text.data(), text.size()), 10);
}

INSTANTIATE_TEST_SUITE_P(Ways, HostRootTest, testing::Values(By::kKernel, By::kSteps),
                         [](const auto& way) {
                           return std::string(way.param == By::kKernel ? "ByTheKernel" : "InSteps");
                         });

TEST(HostRoot, OneThatIsNotThereTellsSo) {
  const HostRoot root("/nowhere/at/all");
  EXPECT_FALSE(root.Open("/proc/meminfo", O_RDONLY).IsOpen());
  EXPECT_EQ(errno, ENOENT);
}

TEST(HostRoot, LinksLeadOutWhereTheTreeHasNothingOfTheName) {
  const HostTree tree;
  tree.Write("/proc/file", "inside");
  const HostRoot root(tree.Root());
  const auto link = [&](const char* name, const char* target) {
    std::filesystem::create_symlink(target, tree.Root() + name);
  };
  link("/absolute", "/outside");
  link("/climbing", "proc/../../outside");
  link("/inside", "/proc/file");
  link("/broken", "proc/none");
  link("/round", "/round");
  EXPECT_TRUE(root.LeadsOut("/absolute"));
  EXPECT_TRUE(root.LeadsOut("/absolute/file"));
  EXPECT_TRUE(root.LeadsOut("/climbing"));
  for (const char* name : {"/inside", "/broken", "/round", "/none", "/proc/file"}) {
    EXPECT_FALSE(root.LeadsOut(name)) << name;
  }
  EXPECT_FALSE(HostRoot("/").LeadsOut("/none"));
}

TEST(HostRoot, AHostIsReadBelowItsRootAlone) {
  const HostTree outside;
  const HostTree tree;
  outside.Write("/meminfo", "MemTotal: 1 kB\n");
  tree.Write("/proc/version", "6.1\n");
  std::filesystem::create_symlink(outside.Root() + "/meminfo", tree.Root() + "/proc/meminfo");
  std::filesystem::create_directory_symlink(outside.Root(), tree.Root() + "/sys");
  const LinuxHost host(tree.Root());
  std::string content;
  std::vector<LinuxHost::Entry> entries;
  testing::internal::CaptureStderr();
  EXPECT_EQ(host.Read("/proc/none", content), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(host.LossStatus(), kOk);
  EXPECT_EQ(host.Read("/proc/meminfo", content), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(host.List("/sys", entries), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(host.LossStatus(), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/proc/meminfo: leads out of the recorded tree: what cannot be read is left out or has "
            "no value\n");
  EXPECT_EQ(host.ReadLink("/proc/meminfo", content), kOk);
  EXPECT_EQ(content, outside.Root() + "/meminfo");
}

TEST(HostRoot, APipeInATreeIsAnEmptyFile) {
  const HostTree tree;
  ASSERT_EQ(mkfifo((tree.Root() + "/meminfo").c_str(), 0600), 0);
  std::string content = "old";
  EXPECT_EQ(LinuxHost(tree.Root()).Read("/meminfo", content), kOk);
  EXPECT_EQ(content, "");
}

TEST(HostRoot, AFileIsReadWholeOrNotAtAll) {
  constexpr size_t kTooLarge = size_t{64} << 20;
  const HostTree tree;
  tree.Write("/meminfo", "MemTotal");
  const LinuxHost host(tree.Root());
  std::string content;
  std::filesystem::resize_file(tree.Root() + "/meminfo", kTooLarge - 1);
  EXPECT_EQ(host.Read("/meminfo", content), kOk);
  EXPECT_EQ(content.size(), kTooLarge - 1);
  EXPECT_TRUE(content.starts_with("MemTotal"));

  std::filesystem::resize_file(tree.Root() + "/meminfo", kTooLarge);
  testing::internal::CaptureStderr();
  EXPECT_EQ(host.Read("/meminfo", content), KSI_STATUS_READ_ERROR);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/meminfo: File too large: what cannot be read is left out or has no value\n");
}

}  // namespace
}  // namespace ksi
