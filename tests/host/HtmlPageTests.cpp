// smbios-inventory --format html: one self-contained page with the summary
// on top and the whole tree below. The page of the example server is read
// as text (nothing loaded from anywhere, every node and every value with
// its name), then rendered by a real browser, headless Chromium, whose DOM
// must hold every node; the filter box is driven in that browser too. The
// escaping is checked on nodes made here.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "HostFixture.h"
#include "HostRunner.h"
#include "IC/MutableNode.h"
#include "IC/PropertyValue.h"
#include "InventoryJson.h"
#include "TestSupport.h"
#include "inventory/HtmlPage.h"
#include "inventory/PropertyNames.h"

namespace {

using hosttest::Json;

char const kChromium[] = "/usr/bin/chromium";
char const* const NO_CORPUS = "no SMBIOS corpus folder (SMBIOS_CORPUS_DIR); nothing to render";
// A server of the corpus, with processors, memory, slots and firmware.
char const kCorpusServer[] = "SuperMicro-X9DBL";
constexpr unsigned int kRawTableNode = 55;

std::vector<std::string> demoArgs() {
    return {"--dump",    hosttest::sourceDir() + "/examples/demo-server.smbios.txt",
            "--sensors", "processor",
            "--sensors", "disk",
            "--bmc"};
}

std::size_t countOf(std::string const& text, std::string const& part) {
    std::size_t count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos;
         at = text.find(part, at + part.size())) {
        ++count;
    }
    return count;
}

std::string replaceAll(std::string text, std::string const& from, std::string const& to) {
    for (std::size_t at = text.find(from); at != std::string::npos;
         at = text.find(from, at + to.size())) {
        text.replace(at, from.size(), to);
    }
    return text;
}

// UTF-8 text as the page must write it: control characters shown as \xNN,
// then the five HTML specials as character references.
std::string pageText(std::string const& utf8) {
    std::string shown;
    char const hex[] = "0123456789ABCDEF";
    for (char c : utf8) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7F) {
            shown += "\\x";
            shown += hex[byte >> 4];
            shown += hex[byte & 0x0F];
        } else {
            shown += c;
        }
    }
    shown = replaceAll(shown, "&", "&amp;");
    shown = replaceAll(shown, "<", "&lt;");
    shown = replaceAll(shown, ">", "&gt;");
    shown = replaceAll(shown, "\"", "&quot;");
    return replaceAll(shown, "'", "&#39;");
}

// The same text as a browser serializes a text node: only &, <, > and the
// no-break space are written as references.
std::string domText(std::string const& utf8) {
    std::string shown = pageText(utf8);
    shown = replaceAll(shown, "&quot;", "\"");
    shown = replaceAll(shown, "&#39;", "'");
    return replaceAll(shown, "\xC2\xA0", "&nbsp;");
}

// How the page shows a node's description.
std::string descriptionHtml(std::string const& description, bool dom) {
    if (description.empty()) {
        return "<span class=\"desc empty\">(no description)</span>";
    }
    return "<span class=\"desc\">" + (dom ? domText(description) : pageText(description)) +
           "</span>";
}

// Every start tag of the page's <details> elements.
std::vector<std::string> detailsTags(std::string const& html) {
    std::vector<std::string> tags;
    for (std::size_t at = html.find("<details"); at != std::string::npos;
         at = html.find("<details", at + 1)) {
        tags.push_back(html.substr(at, html.find('>', at) - at + 1));
    }
    return tags;
}

bool hasAttribute(std::string const& tag, std::string const& name) {
    return tag.find(" " + name + ">") != std::string::npos ||
           tag.find(" " + name + " ") != std::string::npos ||
           tag.find(" " + name + "=") != std::string::npos;
}

// One node of the page: its id and its property rows (id, name, value cell).
struct PageRow {
    unsigned int id = 0;
    std::string name;
    std::string value;
};
struct PageNode {
    unsigned int id = 0;
    std::vector<PageRow> rows;
};

// The nodes of the page in page order, read from the markup the page
// writes: "· id N ·" in a node's line, then its rows up to the next node.
std::vector<PageNode> pageNodes(std::string const& html) {
    std::vector<PageNode> nodes;
    std::string const start = "<details class=\"node";
    std::size_t at = html.find(start);
    while (at != std::string::npos) {
        std::size_t const next = html.find(start, at + 1);
        std::string const part =
            html.substr(at, next == std::string::npos ? std::string::npos : next - at);
        PageNode node;
        std::size_t const idAt = part.find(" \xC2\xB7 id ");
        EXPECT_NE(idAt, std::string::npos) << part.substr(0, 200);
        if (idAt != std::string::npos) {
            node.id = static_cast<unsigned int>(std::stoul(part.substr(idAt + 7)));
        }
        std::string const rowStart = "<tr><td class=\"pid\">";
        for (std::size_t row = part.find(rowStart); row != std::string::npos;
             row = part.find(rowStart, row + 1)) {
            PageRow entry;
            std::size_t const idEnd = part.find("</td>", row);
            entry.id = static_cast<unsigned int>(std::stoul(part.substr(row + rowStart.size())));
            std::string const nameStart = "<td class=\"pname\">";
            std::size_t const nameAt = part.find(nameStart, idEnd) + nameStart.size();
            std::size_t const nameEnd = part.find("</td>", nameAt);
            entry.name = part.substr(nameAt, nameEnd - nameAt);
            std::size_t const valueAt = part.find('>', part.find("<td class=\"pval\"", nameEnd));
            entry.value = part.substr(valueAt + 1, part.find("</td></tr>", valueAt) - valueAt - 1);
            node.rows.push_back(entry);
        }
        nodes.push_back(node);
        at = next;
    }
    return nodes;
}

class HtmlPageHost : public hosttest::BuiltProgramsTest {
protected:
    // The host's output in a format; fails the test when the run fails.
    static std::string output(std::vector<std::string> args, char const* format) {
        args.insert(args.end(), {"--format", format});
        hosttest::RunResult const run = hosttest::runHost(args);
        EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        return run.out;
    }
};

TEST_F(HtmlPageHost, DemoPageLoadsNothingFromAnywhere) {
    std::string const page = output(demoArgs(), "html");
    EXPECT_EQ(page.compare(0, 15, "<!DOCTYPE html>"), 0) << page.substr(0, 100);
    EXPECT_NE(page.find("<meta charset=\"utf-8\">"), std::string::npos);
    for (char const* outside : {"http://", "https://", "src=", "<link", "url(", "@import", "//"}) {
        EXPECT_EQ(page.find(outside), std::string::npos) << outside;
    }
    EXPECT_EQ(countOf(page, "<style>"), 1u);
    EXPECT_EQ(countOf(page, "<script>"), 1u);
    EXPECT_EQ(countOf(page, "<script"), 1u);
    EXPECT_EQ(page.substr(page.size() - 8), "</html>\n");
}

TEST_F(HtmlPageHost, DemoPageHoldsEveryNodeDescribedAndEscaped) {
    Json const doc = Json::parse(output(demoArgs(), "json"));
    std::string const page = output(demoArgs(), "html");
    std::size_t const nodeCount = doc.at("nodes").size();
    ASSERT_GT(nodeCount, 90u);
    EXPECT_EQ(detailsTags(page).size(), nodeCount);
    for (Json const& node : doc.at("nodes")) {
        std::string const description = node.at("description").get<std::string>();
        EXPECT_NE(page.find(descriptionHtml(description, false)), std::string::npos) << description;
    }
}

TEST_F(HtmlPageHost, DemoPageShowsTheSummaryAboveTheTree) {
    std::string const page = output(demoArgs(), "html");
    std::string const summary = output(demoArgs(), "summary");
    std::size_t const tree = page.find("<div id=\"tree\">");
    ASSERT_NE(tree, std::string::npos);
    std::size_t const table = page.find("<table class=\"summary\">");
    ASSERT_LT(table, tree);
    // Each line's value in a cell of the summary table, in the summary's
    // order.
    std::size_t at = table;
    std::size_t lines = 0;
    for (std::size_t begin = 0; begin < summary.size();) {
        std::size_t const end = summary.find('\n', begin);
        std::string const line = summary.substr(begin, end - begin);
        begin = end + 1;
        std::string const value = line.substr(line.find_first_not_of(' ', line.find(':') + 1));
        at = page.find("<td>" + pageText(value) + "</td>", at);
        ASSERT_LT(at, tree) << line;
        ++lines;
    }
    EXPECT_EQ(lines, 17u);
    EXPECT_NE(page.find("<th>Processor</th><td>CPU 1: Intel(R) Xeon(R) CPU E5-2670 0 @ 2.60GHz"),
              std::string::npos);
    EXPECT_NE(page.find("<th>Memory</th><td>40 GB in 3 devices (2 x 16 GB, 1 x 8 GB)</td>"),
              std::string::npos);
}

TEST_F(HtmlPageHost, EveryValueHasItsNameAndUnitBesideIt) {
    Json const doc = Json::parse(output(demoArgs(), "json"));
    std::vector<PageNode> const nodes = pageNodes(output(demoArgs(), "html"));
    std::map<unsigned int, Json> byId;
    for (Json const& node : doc.at("nodes")) {
        byId[node.at("id").get<unsigned int>()] = node;
    }
    ASSERT_EQ(nodes.size(), byId.size());
    unsigned int units = 0;
    for (PageNode const& pageNode : nodes) {
        ASSERT_EQ(byId.count(pageNode.id), 1u) << pageNode.id;
        Json const& node = byId[pageNode.id];
        unsigned int const type = node.at("type").get<unsigned int>();
        Json const& properties = node.at("properties");
        ASSERT_EQ(pageNode.rows.size(), properties.size()) << "node " << pageNode.id;
        std::size_t i = 0;
        for (auto const& property : properties.items()) {
            PageRow const& row = pageNode.rows[i++];
            unsigned int const id = static_cast<unsigned int>(std::stoul(property.key()));
            EXPECT_EQ(row.id, id);
            inventory::PropertyInfo const* info = inventory::findProperty(type, id);
            std::string const name =
                info != nullptr ? info->name : "property " + std::to_string(id);
            EXPECT_EQ(row.name, pageText(name)) << "type " << type << " property " << id;
            if (info != nullptr && *info->unit != '\0') {
                ++units;
                std::string const unit =
                    " <span class=\"unit\">" + pageText(info->unit) + "</span>";
                EXPECT_NE(row.value.find(unit), std::string::npos)
                    << "type " << type << " property " << id << ": " << row.value;
            }
            Json const& value = property.value().at("value");
            if (value.is_string() && property.value().at("kind") == "string" &&
                !value.get<std::string>().empty()) {
                EXPECT_EQ(row.value.find(pageText(value.get<std::string>())), 0u)
                    << "type " << type << " property " << id << ": " << row.value;
            }
        }
    }
    // At least the computer system's time-zone offset has a unit.
    EXPECT_GT(units, 0u);
}

TEST_F(HtmlPageHost, RawTableNodesStartFoldedAndTheOthersOpen) {
    std::string const page = output(demoArgs(), "html");
    unsigned int raw = 0;
    for (std::string const& tag : detailsTags(page)) {
        if (tag.find("data-type=\"" + std::to_string(kRawTableNode) + "\"") != std::string::npos) {
            ++raw;
            EXPECT_FALSE(hasAttribute(tag, "open")) << tag;
        } else {
            EXPECT_TRUE(hasAttribute(tag, "open")) << tag;
        }
    }
    EXPECT_EQ(raw, 31u);
}

// Nodes made here: text with the HTML specials, a control character and a
// Latin-1 letter.
TEST(HtmlPageText, TextIsEscapedAndLatin1BecomesUtf8) {
    IC::MutableNode node(1, 0, std::vector<unsigned int>{1}, 40, 0);
    node.setDescription("<b>Tom & \"Jerry\"</b> it's\x01 caf\xE9");
    node.setProperty(36, IC::PropertyValue("<script>x</script>", true));
    node.setProperty(39, IC::PropertyValue(std::vector<std::string>{"a<b", "c&d"}, true));
    std::string const page = inventory::renderHtml({&node});
    EXPECT_NE(page.find("<span class=\"desc\">&lt;b&gt;Tom &amp; &quot;Jerry&quot;&lt;/b&gt; "
                        "it&#39;s\\x01 caf\xC3\xA9</span>"),
              std::string::npos)
        << page;
    EXPECT_EQ(page.find("<b>"), std::string::npos);
    EXPECT_EQ(countOf(page, "<script>"), 1u);
    EXPECT_NE(page.find("&lt;script&gt;x&lt;/script&gt;"), std::string::npos);
    EXPECT_NE(page.find("<span class=\"item\">a&lt;b</span><span class=\"sep\">, </span>"
                        "<span class=\"item\">c&amp;d</span>"),
              std::string::npos);
    EXPECT_EQ(inventory::htmlEscape("&<>\"'"), "&amp;&lt;&gt;&quot;&#39;");
    EXPECT_EQ(inventory::htmlText(std::string("\x7F\x80\xFF", 3)), "\\x7F\xC2\x80\xC3\xBF");
}

TEST(HtmlPageText, APropertyWithoutANameIsCalledByItsId) {
    IC::MutableNode node(1, 0, std::vector<unsigned int>{1}, 9999, 0);
    node.setProperty(4242, IC::PropertyValue("v", true));
    ASSERT_EQ(inventory::findProperty(9999, 4242), nullptr);
    std::string const page = inventory::renderHtml({&node});
    EXPECT_NE(page.find("<td class=\"pname\">property 4242</td>"), std::string::npos) << page;
    EXPECT_NE(page.find("<span class=\"type\">type 9999</span>"), std::string::npos);
}

TEST(HtmlPageText, ANodeLinkedToItselfIsWrittenOnceAndTheMarkupIsBalanced) {
    IC::MutableNode looped(7, 7, std::vector<unsigned int>{1}, 41, 0);
    looped.setDescription("loop");
    IC::MutableNode child(8, 7, std::vector<unsigned int>{1}, 4, 0);
    child.setDescription("child");
    std::string const page = inventory::renderHtml({&looped, &child});
    EXPECT_EQ(countOf(page, "<details"), 2u);
    EXPECT_EQ(countOf(page, "</details>"), 2u);
    // The child inside its parent: the two nodes end together.
    std::size_t const childAt = page.find("<span class=\"desc\">child</span>");
    ASSERT_NE(childAt, std::string::npos);
    EXPECT_LT(page.find("<span class=\"desc\">loop</span>"), childAt);
    EXPECT_NE(page.find("</div></details>\n</div></details>\n", childAt), std::string::npos);
}

// Headless Chromium, for the tests that render the page.
class HtmlPageBrowser : public HtmlPageHost {
protected:
    void SetUp() override {
        HtmlPageHost::SetUp();
        if (access(kChromium, X_OK) != 0) {
            GTEST_SKIP() << kChromium << " is absent (Debian package chromium); the page is not "
                         << "rendered in a browser";
        }
    }

    static std::string quoted(std::string const& text) {
        return "'" + replaceAll(text, "'", "'\\''") + "'";
    }

    // The DOM Chromium builds of the page, serialized, after its script
    // ran; "" after a failure is added.
    static std::string renderedDom(std::string const& page) {
        smbiostest::TempDir dir;
        std::string const pageFile = dir.file("inventory.html");
        smbiostest::writeFile(pageFile, page);
        std::string const dom = dir.file("dom.html");
        std::string const log = dir.file("chromium.log");
        // A fresh profile each run, removed with the folder; no network,
        // no updates; killed (with its helpers) after a minute.
        std::string const command =
            "timeout -k 5 60 " + std::string(kChromium) +
            " --headless --no-sandbox --disable-gpu --disable-quic --no-first-run"
            " --disable-background-networking --disable-component-update --disable-sync"
            " --user-data-dir=" +
            quoted(dir.file("profile")) + " --dump-dom " + quoted("file://" + pageFile) + " >" +
            quoted(dom) + " 2>" + quoted(log) + " </dev/null";
        int const status = std::system(command.c_str());
        std::string const text = smbiostest::fileText(dom);
        if (status != 0 || text.empty()) {
            ADD_FAILURE() << "chromium failed (status " << status << ")\n"
                          << smbiostest::fileText(log);
            return std::string();
        }
        return text;
    }

    // The DOM holds every node of the inventory, described; the raw table
    // nodes are folded; the script ran and counted the nodes.
    static void expectEveryNode(Json const& doc, std::string const& dom) {
        std::size_t const nodeCount = doc.at("nodes").size();
        std::vector<std::string> const tags = detailsTags(dom);
        EXPECT_EQ(tags.size(), nodeCount);
        for (Json const& node : doc.at("nodes")) {
            std::string const description = node.at("description").get<std::string>();
            EXPECT_NE(dom.find(descriptionHtml(description, true)), std::string::npos)
                << description;
        }
        unsigned int raw = 0;
        for (std::string const& tag : tags) {
            if (tag.find("data-type=\"55\"") != std::string::npos) {
                ++raw;
                EXPECT_FALSE(hasAttribute(tag, "open")) << tag;
            }
        }
        EXPECT_EQ(raw, hosttest::nodesOfType(doc, kRawTableNode).size());
        EXPECT_NE(dom.find("<span id=\"count\">" + std::to_string(nodeCount) + " nodes</span>"),
                  std::string::npos)
            << "the page's script did not run";
    }
};

TEST_F(HtmlPageBrowser, ChromiumRendersEveryNodeOfTheDemo) {
    Json const doc = Json::parse(output(demoArgs(), "json"));
    std::string const dom = renderedDom(output(demoArgs(), "html"));
    ASSERT_FALSE(dom.empty());
    expectEveryNode(doc, dom);
    EXPECT_NE(dom.find("<th>Chassis type</th><td>Rack Mount Chassis</td>"), std::string::npos);
}

TEST_F(HtmlPageBrowser, ChromiumRendersEveryNodeOfACorpusServer) {
    if (smbiostest::corpusDir().empty()) {
        GTEST_SKIP() << NO_CORPUS;
    }
    std::vector<std::string> const args = {"--from-bin",
                                           smbiostest::corpusDir() + "/" + kCorpusServer + ".bin"};
    Json const doc = Json::parse(output(args, "json"));
    std::string const dom = renderedDom(output(args, "html"));
    ASSERT_FALSE(dom.empty());
    expectEveryNode(doc, dom);
    EXPECT_NE(dom.find("<th>Manufacturer</th><td>Thomas-Krenn.AG</td>"), std::string::npos);
}

// The id of each node the DOM shows and of each it hides.
void visibleNodes(std::string const& dom, std::vector<unsigned int>& shown,
                  std::vector<unsigned int>& hidden) {
    std::string const start = "<details class=\"node";
    for (std::size_t at = dom.find(start); at != std::string::npos; at = dom.find(start, at + 1)) {
        std::string const tag = dom.substr(at, dom.find('>', at) - at + 1);
        std::size_t const idAt = dom.find(" \xC2\xB7 id ", at);
        unsigned int const id = static_cast<unsigned int>(std::stoul(dom.substr(idAt + 7)));
        (hasAttribute(tag, "hidden") ? hidden : shown).push_back(id);
    }
}

TEST_F(HtmlPageBrowser, FilterShowsMatchingNodesWithTheirAncestors) {
    // The page as the host writes it, then a script that types into the
    // filter box as a person would.
    std::string page = output(demoArgs(), "html");
    std::string const typing =
        "<script>var f = document.getElementById(\"filter\"); f.value = \"SAMSUNG\";"
        " f.dispatchEvent(new Event(\"input\"));</script>\n</body>";
    page = replaceAll(page, "</body>", typing);
    std::string const dom = renderedDom(page);
    ASSERT_FALSE(dom.empty());

    std::vector<unsigned int> shown;
    std::vector<unsigned int> hidden;
    visibleNodes(dom, shown, hidden);
    // The three memory devices (ids 36 to 38) and the raw table nodes of
    // their structures (63, 64, 66), with their ancestors: the management
    // interface, root, computer system, chassis and planar (1 to 5).
    EXPECT_EQ(shown, (std::vector<unsigned int>{1, 2, 3, 4, 5, 36, 37, 38, 63, 64, 66}));
    EXPECT_EQ(shown.size() + hidden.size(), 93u);
    EXPECT_NE(dom.find("<span id=\"count\">11 of 93 nodes</span>"), std::string::npos);
    // Within a memory device only the manufacturer's row is shown.
    std::size_t const device = dom.find("<span class=\"desc\">DIMM_A1:BANK 0</span>");
    ASSERT_NE(device, std::string::npos);
    std::string const rows = dom.substr(device, dom.find("</table>", device) - device);
    EXPECT_EQ(countOf(rows, "<tr>"), 1u) << rows;
    EXPECT_NE(rows.find("Samsung"), std::string::npos) << rows;
    // The ancestors are opened to show the matches.
    for (std::string const& tag : detailsTags(dom)) {
        if (!hasAttribute(tag, "hidden")) {
            EXPECT_TRUE(hasAttribute(tag, "open")) << tag;
        }
    }
}

}  // namespace
