#include "folder_conf_reader.h"

#include <optional>

#include <simdjson.h>

#include "fileindex/json.h"
#include "folder_fields.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

// Deeper files go to jsoncpp, whose own limit then decides.
constexpr size_t kFastDepthLimit = 64;

bool StartsWithObject(const std::string& text) {
    const size_t first = text.find_first_not_of(" \t\r\n");
    return first != std::string::npos && text[first] == '{';
}

// One stored folder: the last occurrence of each member counts, as in jsoncpp, and only with
// exactly the right type.
Folder FolderOf(simdjson::dom::element value) {
    Folder folder;
    simdjson::dom::object object;
    if (value.get_object().get(object) != simdjson::SUCCESS) return folder;
    std::optional<simdjson::dom::element> name, document, audio, video, photo;
    for (const auto field : object) {
        if (field.key == "name") name = field.value;
        else if (field.key == "document") document = field.value;
        else if (field.key == "audio") audio = field.value;
        else if (field.key == "video") video = field.value;
        else if (field.key == "photo") photo = field.value;
    }
    std::string_view text;
    if (name && name->get_string().get(text) == simdjson::SUCCESS) folder.name.assign(text);
    for (const auto& [element, flag] : {std::pair{document, &folder.document}, std::pair{audio, &folder.audio},
                                        std::pair{video, &folder.video}, std::pair{photo, &folder.photo}}) {
        bool on;
        if (element && element->get_bool().get(on) == simdjson::SUCCESS) *flag = on;
    }
    return folder;
}

}  // namespace

bool ReadFolderConfFast(const std::string& text, std::map<std::string, Folder>& folders) {
    if (!StartsWithObject(text)) return false;  // a byte order mark, or not an object
    simdjson::dom::parser parser;
    if (parser.allocate(text.size(), kFastDepthLimit) != simdjson::SUCCESS) return false;
    const simdjson::padded_string padded(text);
    simdjson::dom::object top;
    if (parser.parse(padded).get_object().get(top) != simdjson::SUCCESS) return false;
    std::map<std::string, Folder> read;
    for (const auto field : top) {
        if (!read.emplace(std::string(field.key), FolderOf(field.value)).second) return false;  // repeated name
    }
    folders.swap(read);
    return true;
}

bool ReadFolderConfStrict(const std::string& text, std::map<std::string, Folder>& folders) {
    Json::Value body;
    if (!fromString(body, text) || !body.isObject()) return false;
    folders.clear();
    for (auto it = body.begin(); it != body.end(); ++it) {
        Folder folder;
        MergeFolderFields(folder, *it);
        folders.emplace(it.name(), folder);
    }
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
