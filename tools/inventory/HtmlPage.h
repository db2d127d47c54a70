// The inventory as one self-contained HTML page (--format html): the
// summary on top, then the whole tree with collapsible nodes, the name and
// unit beside every value, and a filter box. Styles and script are inline;
// the page loads nothing from anywhere, so it can be mailed or archived as
// one file and opened offline.
#pragma once

#include <string>
#include <vector>

#include "IC/Node.h"

namespace inventory {

// UTF-8 text made safe for HTML element content and attribute values:
// &, <, >, " and ' become character references.
std::string htmlEscape(std::string const& text);

// Text as the nodes hold it (bytes) for the page: control characters as
// \xNN (they have no place in HTML text), other bytes from 0x80 up as
// Latin-1 letters in UTF-8 as in the JSON output, then escaped for HTML.
std::string htmlText(std::string const& bytes);

// The whole page, ending with a newline.
std::string renderHtml(std::vector<IC::Node*> const& nodes);

}  // namespace inventory
