// Text out of XML and HTML parsed by libxml2, never from the network and without expanding
// entities, walked without recursion so that deep markup cannot exhaust the stack.
#pragma once

#include <string>

#include <libxml/tree.h>

namespace extractor {

// The text below `root` (itself included), words separated by one space; elements named
// script, style and head are left out.
void CollectText(const xmlNode* root, std::string& text);

// The first element named `name` (its local name, any namespace) in document order below `root`.
const xmlNode* FindElement(const xmlNode* root, const char* name);

// Runs of white space as one space, none at either end.
std::string Squeezed(const std::string& text);

// The text of an XML document, and the text of its first element named `titleElement` and
// `authorElement` when asked (nullptr not to).
std::string XmlText(const std::string& xml, const char* titleElement, std::string* title, const char* authorElement,
                    std::string* author);

// The text of an HTML page and its title (empty when it has none).
std::string HtmlText(const std::string& html, std::string& title);

}  // namespace extractor
