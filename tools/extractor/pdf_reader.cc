#include <memory>

#include <poppler/cpp/poppler-document.h>
#include <poppler/cpp/poppler-global.h>
#include <poppler/cpp/poppler-page.h>

#include "readers.h"
#include "xml_text.h"

namespace extractor {
namespace {

std::string Utf8(const poppler::ustring& text) {
    const poppler::byte_array bytes = text.to_utf8();
    return std::string(bytes.begin(), bytes.end());
}

void Quiet(const std::string&, void*) {}

}  // namespace

void ReadPdf(const std::string& bytes, size_t maxText, Reply& reply) {
    poppler::set_debug_error_function(Quiet, nullptr);
    const std::unique_ptr<poppler::document> doc(
        poppler::document::load_from_raw_data(bytes.data(), static_cast<int>(bytes.size())));
    if (!doc || doc->is_locked()) {
        reply.problem = doc ? "the PDF is encrypted" : "the PDF cannot be read";
        return;
    }
    const std::string title = Squeezed(Utf8(doc->info_key("Title")));
    const std::string author = Squeezed(Utf8(doc->info_key("Author")));
    if (!title.empty()) reply.fields["title"] = title;
    if (!author.empty()) reply.fields["author"] = author;
    reply.fields["pages"] = doc->pages();
    std::string text;
    for (int i = 0; i < doc->pages() && text.size() < maxText; ++i) {
        const std::unique_ptr<poppler::page> page(doc->create_page(i));
        if (page) text += Squeezed(Utf8(page->text())) + "\n";
    }
    reply.text = Cut(std::move(text), maxText);
}

}  // namespace extractor
