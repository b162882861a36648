// folder.conf text read both ways: whenever the fast reading answers, the strict reading must
// accept the same text and give every folder the same name and flags.
#include <cstdlib>
#include <map>
#include <string>

#include "folder_conf_reader.h"

using namespace QIRA::FILEINDEX;

namespace {

bool Same(const Folder& a, const Folder& b) {
    return a.name == b.name && a.document == b.document && a.audio == b.audio && a.video == b.video &&
           a.photo == b.photo;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    std::map<std::string, Folder> fast, strict;
    if (!detail::ReadFolderConfFast(text, fast)) return 0;
    if (!detail::ReadFolderConfStrict(text, strict) || fast.size() != strict.size()) std::abort();
    for (auto a = fast.begin(), b = strict.begin(); a != fast.end(); ++a, ++b) {
        if (a->first != b->first || !Same(a->second, b->second)) std::abort();
    }
    return 0;
}
