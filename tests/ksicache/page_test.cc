// ksicache page, as far as a page can be told without a browser; tests/page has the rest.
#include <sys/stat.h>

#include <filesystem>
#include <string>
#include <string_view>

#include "tests/ksicache/export_fixture.h"

namespace ksi {
namespace {

class PageTest : public ExportTest {
 protected:
  static void ExpectHas(const std::string& page, std::string_view text) {
    EXPECT_NE(page.find(text), std::string::npos) << text;
  }
  static size_t CountOf(const std::string& page, std::string_view text) {
    size_t count = 0;
    for (size_t at = 0; (at = page.find(text, at)) != std::string::npos; at += text.size()) ++count;
    return count;
  }
};

TEST_F(PageTest, SaysWithoutScriptsWhereTheMemoryIs) {
  const std::string page = Output({"page", kExample});
  EXPECT_EQ(page.find("<!DOCTYPE html>"), 0);
  ExpectHas(page, "<title>hypervisor.example.org</title>");
  ExpectHas(page, "<h1>hypervisor.example.org</h1>");
  ExpectHas(page, "<p>hypervisor.example.org, 2026-11-21T10:00:00Z</p>");
  ExpectHas(page, "<th scope=\"row\">Free</th><td>134856</td><td>51.4</td>");
  ExpectHas(page, "<th scope=\"row\">Total</th><td>262144</td><td>100.0</td>");
  ExpectHas(page, "<caption>Machines: the largest of 12</caption>");
  ExpectHas(page,
            "<th scope=\"row\">build-linux</th><td>14352</td><td>737</td><td>1474</td>"
            "<td>1228</td><td>1376</td>");
}

TEST_F(PageTest, TellsWithoutScriptsOfTheTightestMoment) {
  const std::string page = Output({"page", kIncident});
  ExpectHas(page, "<h2>At 2026-11-21T10:05:00Z, the least free memory</h2>");
  ExpectHas(page, "<p>Memory state Hard.</p>");
  ExpectHas(page, "<p>Memory state High 80.0 %, Hard 20.0 % of the moments.</p>");
  ExpectHas(page, "<p>Kernel's definitions built ");
  EXPECT_EQ(CountOf(page, "What happened between moments"), 0);
}

// The host's parts add up: what is taken at start and what is in no part are told, too.
TEST_F(PageTest, SaysWithoutScriptsAllThatTheMemoryIs) {
  const std::string page = Output({"page", kExample});
  const auto cell = [&](const std::string& title) {
    const std::string head = "<th scope=\"row\">" + title + "</th><td>";
    const size_t at = page.find(head);
    EXPECT_NE(at, std::string::npos) << title;
    return std::stoll(page.substr(at + head.size()));
  };
  const long long sum = cell("Kernel data and heaps") + cell("Caches and clients of the kernel") +
                        cell("Machines and processes") + cell("Free") + cell("Not told apart") +
                        cell("Taken at start");
  // Of each the fraction of a MB is dropped.
  EXPECT_LE(cell("Total") - sum, 5);
  EXPECT_GE(cell("Total") - sum, 0);
}

// As `ksicache diff` tells them apart.
TEST_F(PageTest, TellsNamesakesApart) {
  const std::string file = ExampleWith("twins.ksi", {{"[1060],\"value\":{\"text\":\"build-linux\"",
                                                      "[1060],\"value\":{\"text\":\"db-orders\""}});
  const std::string page = Output({"page", file});
  ExpectHas(page, "<th scope=\"row\">db-orders 1000</th>");
  ExpectHas(page, "<th scope=\"row\">db-orders 1060</th>");
  EXPECT_EQ(CountOf(page, "<th scope=\"row\">db-orders</th>"), 0);
  ExpectHas(page, "<th scope=\"row\">web-01</th>");
}

// What is no memory has a unit of its own.
TEST_F(PageTest, SaysWithoutScriptsWhoMayRun) {
  const std::string page = Output({"page", kExample});
  ExpectHas(page,
            "<caption>Groups: the largest of 52</caption><tr><th scope=\"col\">name</th>"
            "<th scope=\"col\">consumed (MB)</th><th scope=\"col\">throttlePct (%)</th></tr>"
            "<tr><th scope=\"row\">host</th>");
  ExpectHas(page, "</td><td>100</td></tr>");
}

TEST_F(PageTest, MayRunItsOwnScriptsAndNothingElse) {
  const std::string page = Output({"page", kExample});
  ExpectHas(page, "content=\"default-src 'none'; script-src 'sha256-");
  EXPECT_EQ(CountOf(page, "<script>"), 2);
  EXPECT_EQ(CountOf(page, "<script type=\"application/octet-stream\""), 4);
  EXPECT_EQ(CountOf(page, "{{"), 0);
}

// Each text of a license once, whoever refers to it.
TEST_F(PageTest, HasTheLicensesOfWhatIsInIt) {
  const std::string page = Output({"page", kExample});
  for (const char* part :
       {"array", "color", "format", "interpolate", "time", "time-format", "collection", "scale",
        "path", "shape", "hierarchy", "dispatch", "selection", "axis"}) {
    ExpectHas(page, std::string("\nUpstream-Name: d3-") + part + "\n");
  }
  EXPECT_EQ(CountOf(page, "\nFiles: *\nCopyright: 20"), 14);
  ExpectHas(page, "\nFiles: internmap/*\n");
  EXPECT_EQ(CountOf(page, "\nLicense: ISC\n Permission to use, copy, modify"), 1);
  ExpectHas(page, "\nLicense: BSD-3-Clause\n Redistribution and use");
  ExpectHas(page, "PROCUREMENT OF SUBSTITUTE GOODS OR SERVICES; LOSS OF USE, DATA");
}

TEST_F(PageTest, IsOfAMomentOfASpanOrOfAll) {
  const auto head = [](const std::string& page) {
    const size_t begin = page.find("<p>") + 3;
    return page.substr(begin, page.find("</p>", begin) - begin);
  };
  EXPECT_EQ(head(Output({"page", kIncident + "@10:05Z"})),
            "hypervisor.example.org, 2026-11-21T10:05:00Z");
  EXPECT_EQ(head(Output({"page", kIncident + "@10:03Z..10:04Z"})),
            "hypervisor.example.org, 2026-11-21T10:03:00Z to 2026-11-21T10:04:00Z, 2 moments; "
            "with scripts it shows what happened over time");
  EXPECT_EQ(head(Output({"page", kIncident})),
            "hypervisor.example.org, 2026-11-21T10:02:00Z to 2026-11-21T10:06:00Z, 5 moments; "
            "with scripts it shows what happened over time");
}

TEST_F(PageTest, IsAFileOfItsOwn) {
  const std::string out = Path("page.html");
  EXPECT_EQ(Output({"page", kExample, "-o", out}), "");
  struct stat status = {};
  ASSERT_EQ(stat(out.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
  EXPECT_EQ(FileContent(out), Output({"page", kExample, "--output", "-"}));
  ExpectFailure({"page", kExample, "-o", out}, out + ": exists already (--force replaces it)");
  EXPECT_EQ(Output({"page", kExample, "-o", out, "--force", "--mode", "0644", "--title", "T"}), "");
  ASSERT_EQ(stat(out.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0644U);
  ExpectHas(FileContent(out), "<h1>T</h1>\n<p>hypervisor.example.org, ");
}

TEST_F(PageTest, HasATitleAndAName) {
  ExpectFailure({"page", kExample, "--title", ""}, "--title takes a text that can be seen", 2);
  ExpectFailure({"page", kExample, "--title", " \t"}, "--title takes a text that can be seen", 2);
  ExpectFailure({"page", kExample, "-o", ""}, "a file to make needs a name", 2);
  ExpectHas(Output({"page", kExample, "--title", "caf\xe9"}), "<title>caf%e9</title>");
  ExpectHas(Output({"page", kExample, "--title", "50%20"}), "<title>50%20</title>");
  const std::string file = ExampleWith("host.ksi", {{"\"hypervisor.example.org\"", "\"\""}});
  ExpectHas(Output({"page", file}), "<h1>(no name)</h1>");
}

TEST_F(PageTest, TakesNoZoneThatIsNone) {
  const std::string refusal = "--zone takes the name of a time zone, such as Europe/Berlin: ";
  for (const char* zone :
       {"", "/etc/localtime", "Europe/../UTC", "<b>", "Europe/Berlin ", "right/UTC"}) {
    ExpectFailure({"page", kExample, "--zone", zone}, refusal + zone, 2);
  }
  if (std::filesystem::is_directory("/usr/share/zoneinfo")) {
    ExpectFailure({"page", kExample, "--zone", "Europe/Berln"}, refusal + "Europe/Berln", 2);
    ExpectFailure({"page", kExample, "--zone", "Europe"}, refusal + "Europe", 2);
  }
}

TEST_F(PageTest, TakesNoTextForMarkup) {
  const std::string file =
      ExampleWith("host.ksi", {{"\"build-linux\"", R"("</td><script>'\u202e&\u0007")"}});
  const std::string page = Output({"page", file, "--title", "<b>&\"{{head}}"});
  ExpectHas(page, "<title>&lt;b&gt;&amp;&quot;{{head}}</title>");
  ExpectHas(page, "&lt;/td&gt;&lt;script&gt;&#39;\\xe2\\x80\\xae&amp;\\x07</th>");
  EXPECT_EQ(CountOf(page, "<script>"), 2);
}

TEST_F(PageTest, SaysWhatCouldNotBeRead) {
  WriteContent(Path("empty.json"), JsonWith(""));
  EXPECT_EQ(Output({"load", Path("empty.json"), Path("empty.ksi")}), "");
  const harness::Result result = Run({"page", Path("empty.ksi")});
  EXPECT_EQ(result.status, 1);
  ExpectHas(result.err, "ksicache: " + Path("empty.ksi") + ": comp-stats: 0xbad0003 Not found\n");
  ExpectHas(result.out, "How the memory divides could not be read.");
  ExpectHas(result.out, "<li>comp-stats: 0xbad0003 Not found</li>");
}

TEST_F(PageTest, FailsWithoutAMoment) {
  ExpectFailure({"page", Path("none.ksi")}, Path("none.ksi") + ": No such file or directory");
  ExpectFailure({"page", kIncident + "@11:00Z..12:00Z"},
                kIncident +
                    "@11:00Z..12:00Z: there is no moment in that time: moments are of "
                    "2026-11-21T10:02:00Z to 2026-11-21T10:06:00Z");
  EXPECT_EQ(Run({"page"}).status, 2);
  const std::string own = ExampleWith("own.ksi", {});
  const harness::Result result = Run({"page", own, "-o", own, "--force"});
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(FileContent(own).find("SQLite format"), std::string::npos);
}

}  // namespace
}  // namespace ksi
