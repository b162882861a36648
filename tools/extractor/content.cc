#include "content.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include <libxml/HTMLparser.h>

#include "text_safety.h"

namespace extractor {
namespace {

// Bytes read at most: text wants a little more than it keeps (encodings, markup).
constexpr size_t kMaxRead = 8 << 20;

const std::pair<const char*, const char*> kCharsets[] = {
    {"iso-8859-1", "WINDOWS-1252"}, {"unknown-8bit", "WINDOWS-1252"}, {"utf-16le", "UTF-16LE"}, {"utf-16be", "UTF-16BE"}};

bool StartsWith(const std::string& text, const char* prefix) { return text.compare(0, std::strlen(prefix), prefix) == 0; }

std::string ReadUpTo(int fd, size_t limit) {
    std::string bytes(limit, '\0');
    size_t done = 0;
    while (done < limit) {
        const ssize_t got = pread(fd, &bytes[done], limit - done, static_cast<off_t>(done));
        if (got <= 0) break;
        done += static_cast<size_t>(got);
    }
    bytes.resize(done);
    return bytes;
}

// At most `limit` bytes of valid UTF-8, cut at a character's start.
std::string Cut(std::string text, size_t limit) {
    if (text.size() <= limit) return text;
    size_t end = limit;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
    text.resize(end);
    return text;
}

bool Skipped(const xmlNode* node) {
    return node->type == XML_ELEMENT_NODE && node->name != nullptr &&
           (xmlStrcasecmp(node->name, BAD_CAST "script") == 0 || xmlStrcasecmp(node->name, BAD_CAST "style") == 0 ||
            xmlStrcasecmp(node->name, BAD_CAST "head") == 0);
}

// Text of the tree below `root`, walked without recursion so that deep markup cannot exhaust the stack.
void CollectText(const xmlNode* root, std::string& text) {
    const xmlNode* node = root;
    while (node != nullptr) {
        if (node->type == XML_TEXT_NODE && node->content != nullptr) {
            if (!text.empty() && text.back() != ' ') text += ' ';
            text += reinterpret_cast<const char*>(node->content);
        }
        if (node->children != nullptr && !Skipped(node)) {
            node = node->children;
            continue;
        }
        while (node != nullptr && node != root && node->next == nullptr) node = node->parent;
        if (node == nullptr || node == root) break;
        node = node->next;
    }
}

const xmlNode* Find(const xmlNode* root, const char* name) {
    for (const xmlNode* node = root; node != nullptr; node = node->next) {
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

}  // namespace

ContentReader::~ContentReader() {
    for (auto& entry : converters_) iconv_close(entry.second);
    if (magic_ != nullptr) magic_close(magic_);
}

bool ContentReader::Load() {
    magic_ = magic_open(MAGIC_MIME_TYPE | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
    if (magic_ == nullptr || magic_load(magic_, nullptr) != 0) return false;
    for (const auto& [name, charset] : kCharsets) {
        const iconv_t converter = iconv_open("UTF-8", charset);
        if (converter != reinterpret_cast<iconv_t>(-1)) converters_[name] = converter;
    }
    xmlInitParser();
    return true;
}

std::string ContentReader::ToUtf8(const std::string& bytes, const std::string& charset) {
    const auto found = converters_.find(charset);
    if (found == converters_.end()) return bytes;  // UTF-8, ASCII, or a charset read as it stands
    iconv(found->second, nullptr, nullptr, nullptr, nullptr);
    std::string out(bytes.size() * 3 + 4, '\0');
    char* in = const_cast<char*>(bytes.data());
    size_t inLeft = bytes.size();
    char* to = &out[0];
    size_t outLeft = out.size();
    while (inLeft > 0 && iconv(found->second, &in, &inLeft, &to, &outLeft) == static_cast<size_t>(-1)) {
        if (errno != EILSEQ && errno != EINVAL) break;
        ++in;  // a byte the encoding does not know
        --inLeft;
    }
    out.resize(out.size() - outLeft);
    return out;
}

Reply ContentReader::Read(int fd, const Request& request) {
    Reply reply;
    reply.fields = Json::Value(Json::objectValue);
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        reply.problem = "not a regular file";
        return reply;
    }
    const std::string head = ReadUpTo(fd, std::min<size_t>(kMaxRead, std::max<size_t>(request.maxText * 4, 64 * 1024)));
    const char* mime = magic_buffer(magic_, head.data(), head.size());
    reply.mime = mime != nullptr ? mime : "application/octet-stream";
    reply.type = KindOf(reply.mime);
    if (reply.mime == "text/html") {
        std::string title;
        reply.text = Cut(HtmlText(head, title), request.maxText);
        if (!title.empty()) reply.fields["title"] = title;
    } else if (StartsWith(reply.mime, "text/")) {
        magic_setflags(magic_, MAGIC_MIME_ENCODING | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
        const char* charset = magic_buffer(magic_, head.data(), head.size());
        magic_setflags(magic_, MAGIC_MIME_TYPE | MAGIC_NO_CHECK_COMPRESS | MAGIC_ERROR);
        std::string text = tools::ValidUtf8(ToUtf8(head, charset != nullptr ? charset : ""), " ");
        if (StartsWith(text, "\xEF\xBB\xBF")) text.erase(0, 3);  // a byte order mark is no text
        reply.text = Cut(std::move(text), request.maxText);
    }
    return reply;
}

std::string KindOf(const std::string& mime) {
    static const std::pair<const char*, const char*> kinds[] = {
        {"text/", "document"}, {"application/pdf", "document"}, {"application/msword", "document"},
        {"application/vnd.openxmlformats-officedocument.", "document"}, {"application/vnd.oasis.opendocument.", "document"},
        {"application/epub+zip", "document"}, {"application/rtf", "document"}, {"audio/", "audio"},
        {"video/", "video"}, {"image/", "photo"}};
    for (const auto& [prefix, kind] : kinds) {
        if (StartsWith(mime, prefix)) return kind;
    }
    return "";
}

std::string HtmlText(const std::string& html, std::string& title) {
    const int options = HTML_PARSE_RECOVER | HTML_PARSE_NOERROR | HTML_PARSE_NOWARNING | HTML_PARSE_NONET | HTML_PARSE_COMPACT;
    const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> doc(
        htmlReadMemory(html.data(), static_cast<int>(html.size()), nullptr, nullptr, options), xmlFreeDoc);
    if (!doc) return "";
    const xmlNode* root = xmlDocGetRootElement(doc.get());
    if (root == nullptr) return "";
    const xmlNode* head = Find(root->children, "head");
    if (const xmlNode* titleNode = head != nullptr ? Find(head->children, "title") : nullptr) {
        std::string text;
        CollectText(titleNode, text);
        title = Squeezed(text);
    }
    std::string text;
    CollectText(root, text);
    return Squeezed(text);
}

}  // namespace extractor
