#include "xml_text.h"

#include <memory>

#include <libxml/HTMLparser.h>
#include <libxml/parser.h>

namespace extractor {
namespace {

using Doc = std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)>;

bool Skipped(const xmlNode* node) {
    return node->type == XML_ELEMENT_NODE && node->name != nullptr &&
           (xmlStrcasecmp(node->name, BAD_CAST "script") == 0 || xmlStrcasecmp(node->name, BAD_CAST "style") == 0 ||
            xmlStrcasecmp(node->name, BAD_CAST "head") == 0);
}

// The next node in document order below `root`, into children unless `skip`; nullptr at the end.
const xmlNode* Next(const xmlNode* node, const xmlNode* root, bool skip) {
    if (!skip && node->children != nullptr) return node->children;
    while (node != nullptr && node != root && node->next == nullptr) node = node->parent;
    return node == nullptr || node == root ? nullptr : node->next;
}

std::string TextOf(const xmlNode* node) {
    std::string text;
    if (node != nullptr) CollectText(node, text);
    return Squeezed(text);
}

}  // namespace

void CollectText(const xmlNode* root, std::string& text) {
    for (const xmlNode* node = root; node != nullptr; node = Next(node, root, Skipped(node))) {
        if ((node->type == XML_TEXT_NODE || node->type == XML_CDATA_SECTION_NODE) && node->content != nullptr) {
            if (!text.empty() && text.back() != ' ') text += ' ';
            text += reinterpret_cast<const char*>(node->content);
        }
    }
}

const xmlNode* FindElement(const xmlNode* root, const char* name) {
    for (const xmlNode* node = root; node != nullptr; node = Next(node, root, false)) {
        if (node->type == XML_ELEMENT_NODE && xmlStrcasecmp(node->name, BAD_CAST name) == 0) return node;
    }
    return nullptr;
}

std::string Squeezed(const std::string& text) {
    std::string out;
    for (const char c : text) {
        const bool space = c == ' ' || c == '\n' || c == '\r' || c == '\t' || c == '\f' || c == '\v';
        if (!space) out += c;
        else if (!out.empty() && out.back() != ' ') out += ' ';
    }
    if (!out.empty() && out.back() == ' ') out.pop_back();
    return out;
}

std::string XmlText(const std::string& xml, const char* titleElement, std::string* title, const char* authorElement,
                    std::string* author) {
    const Doc doc(xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr,
                                XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_COMPACT),
                  xmlFreeDoc);
    const xmlNode* root = doc ? xmlDocGetRootElement(doc.get()) : nullptr;
    if (root == nullptr) return "";
    if (title != nullptr) *title = TextOf(FindElement(root, titleElement));
    if (author != nullptr) *author = TextOf(FindElement(root, authorElement));
    return TextOf(root);
}

std::string HtmlText(const std::string& html, std::string& title) {
    const int options = HTML_PARSE_RECOVER | HTML_PARSE_NOERROR | HTML_PARSE_NOWARNING | HTML_PARSE_NONET | HTML_PARSE_COMPACT;
    const Doc doc(htmlReadMemory(html.data(), static_cast<int>(html.size()), nullptr, nullptr, options), xmlFreeDoc);
    const xmlNode* root = doc ? xmlDocGetRootElement(doc.get()) : nullptr;
    if (root == nullptr) return "";
    const xmlNode* head = FindElement(root, "head");
    title = TextOf(head != nullptr ? FindElement(head, "title") : nullptr);
    return TextOf(root);
}

}  // namespace extractor
