#include "inventory/HtmlPage.h"

#include <cstdint>
#include <utility>

#include "IC/PropertyValue.h"
#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"
#include "inventory/Summary.h"

namespace inventory {

namespace {

// The page's style sheet. Colours are few and soft; the tree reads as an
// outline with a thin guide line per level.
char const kStyle[] = R"css(
:root {
  --bg: #f4f5f7; --card: #fff; --ink: #1c2230; --muted: #6b7280; --faint: #9aa1ad;
  --line: #e2e5ea; --accent: #2453b8; --accent-soft: #e7edfb; --good: #0f7a55;
  --warn: #b45309; --warn-soft: #fdf0e1;
  --mono: ui-monospace, "SFMono-Regular", Menlo, Consolas, "DejaVu Sans Mono", "Liberation Mono", monospace;
}
* { box-sizing: border-box; }
html { background: var(--bg); }
body {
  margin: 0 auto; max-width: 1200px; padding: 26px 32px 48px; color: var(--ink);
  font: 14px/1.45 system-ui, -apple-system, "Segoe UI", Roboto, "Helvetica Neue", Arial,
    "Liberation Sans", "DejaVu Sans", sans-serif;
}
[hidden] { display: none !important; }
header h1 { font-size: 22px; font-weight: 650; margin: 0 0 2px; }
header p { margin: 0; color: var(--muted); }
section {
  background: var(--card); border: 1px solid var(--line); border-radius: 10px;
  padding: 16px 22px 18px; margin-top: 18px; box-shadow: 0 1px 2px rgba(16, 24, 40, .05);
}
h2 {
  font-size: 12px; font-weight: 650; letter-spacing: .08em; text-transform: uppercase;
  color: var(--muted); margin: 0 0 10px;
}
table.summary { border-collapse: collapse; width: 100%; }
table.summary th, table.summary td { padding: 5px 0; vertical-align: top; text-align: left; }
table.summary th { width: 150px; padding-right: 18px; font-weight: 600; color: #3b4252; white-space: nowrap; }
table.summary tr.first > * { border-top: 1px solid var(--line); }
table.summary tr:first-child > * { border-top: 0; }
.tools { display: flex; gap: 8px; align-items: center; margin-bottom: 12px; }
#filter {
  flex: 0 1 420px; padding: 7px 10px; font: inherit; color: inherit;
  border: 1px solid #cdd3dc; border-radius: 6px; background: #fff;
}
#filter:focus { outline: 3px solid var(--accent-soft); border-color: var(--accent); }
button {
  font: inherit; padding: 6px 12px; color: #374151; background: #fff;
  border: 1px solid #cdd3dc; border-radius: 6px; cursor: pointer;
}
button:hover { background: #f3f5f8; }
#count { margin-left: auto; color: var(--muted); font-size: 13px; }
details.node > summary {
  list-style: none; cursor: pointer; padding: 3px 6px; border-radius: 5px;
}
details.node > summary::-webkit-details-marker { display: none; }
details.node > summary::before {
  content: ""; display: inline-block; width: 0; height: 0; margin: 0 8px 1px 2px;
  border-style: solid; border-width: 5px 0 5px 7px;
  border-color: transparent transparent transparent var(--faint);
  transition: transform .1s;
}
details.node[open] > summary::before { transform: rotate(90deg); }
details.node.leaf > summary::before { visibility: hidden; }
details.node > summary:hover { background: #f1f4f9; }
.desc { font-weight: 600; }
.desc.empty { color: var(--muted); font-weight: 400; font-style: italic; }
.type {
  display: inline-block; margin-left: 8px; padding: 0 8px; border-radius: 9px;
  background: var(--accent-soft); color: var(--accent); font-size: 12px;
}
details.raw > summary .type { background: #eef0f3; color: var(--muted); }
.meta { margin-left: 8px; color: var(--faint); font-size: 12px; }
.meta .warn { color: var(--warn); background: var(--warn-soft); padding: 0 5px; border-radius: 4px; }
.body { margin-left: 12px; padding-left: 14px; border-left: 1px solid var(--line); }
table.props { border-collapse: collapse; margin: 2px 0 6px 6px; }
table.props td { padding: 1px 14px 1px 0; vertical-align: top; }
td.pid { color: var(--faint); font: 12px/1.7 var(--mono); text-align: right; min-width: 30px; }
td.pname { color: #3b4252; white-space: nowrap; }
td.pval { font-family: var(--mono); font-size: 13px; overflow-wrap: anywhere; }
.unit { color: var(--muted); }
.meaning { color: var(--good); font-family: system-ui, sans-serif; }
.none { color: var(--muted); font-style: italic; font-family: system-ui, sans-serif; }
.sep { color: var(--muted); }
table.props tr:hover > td { background: #f6f8fb; }
)css";

// The filter and the buttons. A node stays visible when its description or
// type, one of its properties' names or values, or one of its descendants
// matches; a node whose own description matches keeps all its properties.
// While a filter is set every visible node is open; clearing it gives the
// nodes back the open state they had before.
char const kScript[] = R"js(
(function () {
  "use strict";
  var input = document.getElementById("filter");
  var count = document.getElementById("count");
  var nodes = Array.prototype.slice.call(document.querySelectorAll("#tree details.node"));
  var saved = null;
  function each(list, fn) { Array.prototype.forEach.call(list, fn); }
  function rows(d) { return d.querySelectorAll(":scope > .body > table > tbody > tr"); }
  function kids(d) { return d.querySelectorAll(":scope > .body > details.node"); }
  function label(d) {
    var s = d.querySelector(":scope > summary");
    return (s.querySelector(".desc").textContent + " " + s.querySelector(".type").textContent).toLowerCase();
  }
  function rowText(r) { return (r.cells[1].textContent + " " + r.cells[2].textContent).toLowerCase(); }
  function tell(shown) {
    count.textContent = (shown === nodes.length ? "" : shown + " of ") + nodes.length + " nodes";
  }
  function apply() {
    var q = input.value.trim().toLowerCase();
    var shown = 0;
    if (q && saved === null) {
      saved = nodes.map(function (d) { return d.open; });
    }
    for (var i = nodes.length - 1; i >= 0; --i) {
      var d = nodes[i];
      var visible = true;
      if (q) {
        var own = label(d).indexOf(q) >= 0;
        visible = own;
        each(rows(d), function (r) {
          var match = own || rowText(r).indexOf(q) >= 0;
          r.hidden = !match;
          visible = visible || match;
        });
        each(kids(d), function (k) { visible = visible || !k.hidden; });
        if (visible) { d.open = true; }
      } else {
        each(rows(d), function (r) { r.hidden = false; });
        if (saved !== null) { d.open = saved[i]; }
      }
      d.hidden = !visible;
      if (visible) { ++shown; }
    }
    if (!q) { saved = null; }
    tell(shown);
  }
  input.addEventListener("input", apply);
  input.addEventListener("keydown", function (e) {
    if (e.key === "Escape") { input.value = ""; apply(); }
  });
  document.addEventListener("keydown", function (e) {
    if (e.key === "/" && document.activeElement !== input) { e.preventDefault(); input.focus(); }
  });
  function openAll(open) { nodes.forEach(function (d) { if (!d.hidden) { d.open = open; } }); }
  document.getElementById("expand").addEventListener("click", function () { openAll(true); });
  document.getElementById("collapse").addEventListener("click", function () { openAll(false); });
  tell(nodes.length);
})();
)js";

char const kHexDigits[] = "0123456789ABCDEF";

// The value a property's meanings are looked up by, when it has one.
bool enumeratedValue(IC::PropertyValue const& value, std::uint32_t& number) {
    switch (value.getKind()) {
        case IC::PropertyValue::ENUM: {
            std::int64_t const held = value.getEnum().getValue();
            if (held < 0 || held > 0xFFFFFFFFll) {
                return false;
            }
            number = static_cast<std::uint32_t>(held);
            return true;
        }
        case IC::PropertyValue::BYTE:
            number = value.getByte();
            return true;
        case IC::PropertyValue::NUMBER:
            if (value.getNumber().getKind() != IC::Number::UNSIGNED) {
                return false;
            }
            number = value.getNumber().getUnsigned();
            return true;
        default:
            return false;
    }
}

// A list as the tree prints it ("{1, 9, 12}") without its braces.
std::string listText(std::string const& braced) {
    if (braced.size() >= 2 && braced.front() == '{' && braced.back() == '}') {
        return braced.substr(1, braced.size() - 2);
    }
    return braced;
}

// The value cell: the value, its unit and the meaning of an enumerated
// value, each after a blank so that the cell's text reads as one line.
std::string valueHtml(PropertyInfo const* info, IC::PropertyValue const& value) {
    std::string html;
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            html = value.getString().empty() ? "<span class=\"none\">empty</span>"
                                             : htmlText(value.getString());
            break;
        case IC::PropertyValue::STRINGS:
            for (std::string const& text : value.getStrings()) {
                html += html.empty() ? "" : "<span class=\"sep\">, </span>";
                html += "<span class=\"item\">" + htmlText(text) + "</span>";
            }
            if (value.getStrings().empty()) {
                html = "<span class=\"none\">none</span>";
            }
            break;
        case IC::PropertyValue::NUMBERS: {
            std::string const list = listText(formatValue(value));
            html = list.empty() ? "<span class=\"none\">none</span>" : htmlEscape(list);
            break;
        }
        case IC::PropertyValue::NONE:
            html = "<span class=\"none\">no value</span>";
            break;
        default:
            html = htmlEscape(formatValue(value));
            break;
    }
    if (info == nullptr) {
        return html;
    }
    if (info->unit != nullptr && *info->unit != '\0') {
        html += " <span class=\"unit\">" + htmlEscape(info->unit) + "</span>";
    }
    std::uint32_t number = 0;
    if (enumeratedValue(value, number)) {
        char const* meaning = valueMeaning(*info, number);
        if (meaning != nullptr && *meaning != '\0') {
            html += " <span class=\"meaning\">" + htmlEscape(meaning) + "</span>";
        }
    }
    return html;
}

std::string propertyRow(unsigned int nodeType, unsigned int id, IC::PropertyValue const& value) {
    PropertyInfo const* info = findProperty(nodeType, id);
    std::string const name =
        info != nullptr && info->name != nullptr ? info->name : "property " + std::to_string(id);
    return "<tr><td class=\"pid\">" + std::to_string(id) + "</td><td class=\"pname\">" +
           htmlEscape(name) + "</td><td class=\"pval\" title=\"" +
           htmlEscape(valueKindName(value)) + "\">" + valueHtml(info, value) + "</td></tr>\n";
}

// The opening of a node: its line and its properties; its children follow
// inside the body.
std::string nodeOpening(IC::Node const& node, bool hasChildren) {
    NodeFacts const facts = readFacts(node);
    auto const properties = readProperties(node);
    bool const raw = facts.type == ids::kRawTableNode;
    std::string classes = "node";
    if (raw) {
        classes += " raw";
    }
    if (properties.empty() && !hasChildren) {
        classes += " leaf";
    }
    std::string html = "<details class=\"" + classes + "\" data-type=\"" +
                       std::to_string(facts.type) + "\"" +
                       // Raw table nodes repeat what the other nodes say and
                       // start folded.
                       (raw ? "" : " open") + "><summary>";
    html += facts.description.empty()
                ? "<span class=\"desc empty\">(no description)</span>"
                : "<span class=\"desc\">" + htmlText(facts.description) + "</span>";
    std::string const typeName = nodeTypeName(facts.type);
    html += "<span class=\"type\">" +
            htmlEscape(typeName.empty() ? "type " + std::to_string(facts.type) : typeName) +
            "</span>";
    html += "<span class=\"meta\">type " + std::to_string(facts.type) + " · index " +
            std::to_string(facts.index) + " · id " + std::to_string(facts.id) + " · ";
    html += facts.status == 1
                ? "status 1"
                : "<span class=\"warn\">status " + std::to_string(facts.status) + "</span>";
    if (!facts.path.empty()) {
        html += " · path " + htmlText(facts.path);
    }
    if (!facts.parent.empty()) {
        html += " · parent " + htmlText(facts.parent);
    }
    html += "</span></summary>\n<div class=\"body\">";
    if (!properties.empty()) {
        html += "<table class=\"props\"><tbody>\n";
        for (auto const& property : properties) {
            html += propertyRow(facts.type, property.first, property.second);
        }
        html += "</tbody></table>\n";
    }
    return html;
}

// The node at `start` and everything below it that is not written yet,
// nested; depth first with an explicit stack, each node once.
void writeSubtree(TreeShape const& shape, std::size_t start, std::vector<bool>& written,
                  std::string& out) {
    // A node to open, or (closing) the end of one opened before.
    std::vector<std::pair<std::size_t, bool>> stack;
    stack.emplace_back(start, false);
    while (!stack.empty()) {
        auto const [index, closing] = stack.back();
        stack.pop_back();
        if (closing) {
            out += "</div></details>\n";
            continue;
        }
        if (written[index]) {
            continue;
        }
        written[index] = true;
        auto const& below = shape.children[index];
        bool hasChildren = false;
        for (std::size_t child : below) {
            hasChildren = hasChildren || !written[child];
        }
        out += nodeOpening(*shape.list[index], hasChildren);
        stack.emplace_back(index, true);
        for (auto child = below.rbegin(); child != below.rend(); ++child) {
            if (!written[*child]) {
                stack.emplace_back(*child, false);
            }
        }
    }
}

std::string summaryHtml(SummaryFacts const& facts) {
    std::string html = "<table class=\"summary\"><tbody>\n";
    std::string previous;
    for (auto const& line : summaryLines(facts)) {
        // A label that repeats (processors, firmware) is shown once.
        bool const first = line.first != previous;
        html += std::string(first ? "<tr class=\"first\">" : "<tr>") + "<th>" +
                (first ? htmlEscape(line.first) : std::string()) + "</th><td>" +
                htmlText(line.second) + "</td></tr>\n";
        previous = line.first;
    }
    return html + "</tbody></table>\n";
}

// The machine in a few words, for the title and the heading.
std::string machineName(SummaryFacts const& facts) {
    if (facts.systems.empty()) {
        return std::string();
    }
    SystemFacts const& system = facts.systems.front();
    std::string name = system.product;
    if (!system.manufacturer.empty() &&
        name.compare(0, system.manufacturer.size(), system.manufacturer) != 0) {
        name = system.manufacturer + (name.empty() ? "" : " " + name);
    }
    return name;
}

}  // namespace

std::string htmlEscape(std::string const& text) {
    std::string out;
    out.reserve(text.size());
    for (char c : text) {
        switch (c) {
            case '&':
                out += "&amp;";
                break;
            case '<':
                out += "&lt;";
                break;
            case '>':
                out += "&gt;";
                break;
            case '"':
                out += "&quot;";
                break;
            case '\'':
                out += "&#39;";
                break;
            default:
                out += c;
                break;
        }
    }
    return out;
}

std::string htmlText(std::string const& bytes) {
    std::string text;
    text.reserve(bytes.size());
    for (char c : bytes) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7F) {
            text += "\\x";
            text += kHexDigits[byte >> 4];
            text += kHexDigits[byte & 0x0F];
        } else {
            text += c;
        }
    }
    return htmlEscape(latin1ToUtf8(text));
}

std::string renderHtml(std::vector<IC::Node*> const& nodes) {
    SummaryFacts const facts = collectSummary(nodes);
    std::string const machine = machineName(facts);
    std::string out =
        "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
        "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n<title>";
    out += machine.empty() ? "SMBIOS inventory" : "SMBIOS inventory: " + htmlText(machine);
    out += "</title>\n<style>";
    out += kStyle;
    out += "</style>\n</head>\n<body>\n<header>\n<h1>SMBIOS inventory</h1>\n";
    if (!machine.empty()) {
        out += "<p>" + htmlText(machine) + "</p>\n";
    }
    out += "</header>\n<section id=\"summary\">\n<h2>Summary</h2>\n";
    out += summaryHtml(facts);
    out +=
        "</section>\n<section>\n<h2>Inventory tree</h2>\n<div class=\"tools\">"
        "<input id=\"filter\" type=\"search\" placeholder=\"Filter nodes and properties "
        "(press /)\" autocomplete=\"off\" spellcheck=\"false\" aria-label=\"Filter\">"
        "<button id=\"expand\" type=\"button\">Expand all</button>"
        "<button id=\"collapse\" type=\"button\">Collapse all</button>"
        "<span id=\"count\"></span></div>\n<div id=\"tree\">\n";

    TreeShape const shape = treeShape(nodes);
    std::vector<bool> written(shape.list.size(), false);
    writeTrees(shape, written,
               [&](std::size_t start) { writeSubtree(shape, start, written, out); });
    out += "</div>\n</section>\n<script>";
    out += kScript;
    out += "</script>\n</body>\n</html>\n";
    return out;
}

}  // namespace inventory
