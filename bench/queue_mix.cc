#include "queue_mix.h"

namespace bench {

namespace {

std::string FileUnder(const std::string& dir, size_t i) {
    return dir + "/album" + std::to_string(i % 97) + "/track " + std::to_string(i) + ".flac";
}

// The six ways a line turns out malformed: cut short, garbage, last brace missing, a quote
// missing, a broken literal, a colon missing.
std::string MalformedLine(const std::string& dir, size_t i) {
    const std::string path = FileUnder(dir, i);
    switch ((i / 100) % 6) {
        case 0: return "{\"event\":2,\"path\":\"" + path.substr(0, path.size() / 2);
        case 1: return "\x01\x7f garbage ###" + std::to_string(i) + " ~~~";
        case 2: return "{\"event\":2,\"path\":\"" + path + "\",\"data\":{\"dir\":false}";
        case 3: return "{\"event\":2,\"path\":\"" + path + ",\"data\":{\"dir\":false}}";
        case 4: return "{\"event\":2,\"path\":\"" + path + "\",\"data\":{\"dir\":fals}}";
        default: return "{\"event\" 2,\"path\":\"" + path + "\",\"data\":{\"dir\":false}}";
    }
}

std::string Record(int event, const std::string& path, const std::string& data, const std::string& pathOld = "") {
    std::string line = "{\"data\":" + data + ",\"event\":" + std::to_string(event) + ",\"path\":\"" + path + "\"";
    if (!pathOld.empty()) line += ",\"path_old\":\"" + pathOld + "\"";
    return line + "}";
}

std::string WellFormedLine(const std::string& dir, size_t i) {
    const std::string path = FileUnder(dir, i);
    const std::string file = "{\"dir\":false}";
    switch (i % 10) {
        case 0: case 1: case 2: case 3: return Record(2, path, file);
        case 4: return Record(1, path, file);
        case 5: return Record(4, path, file);
        case 6: return Record(8, path, file);
        case 7: return Record(256, path, file, FileUnder(dir, i + 1));
        case 8: return Record(256, path, file);
        default:
            return Record(131072, dir,
                          "{\"audio\":true,\"document\":false,\"photo\":true,\"video\":false,\"name\":\"album " +
                              std::to_string(i) + "\",\"path\":\"" + dir + "\"}");
    }
}

}  // namespace

std::string MixedQueueLine(const std::string& dir, size_t i) {
    return (i % 100 == 99 ? MalformedLine(dir, i) : WellFormedLine(dir, i)) + "\n";
}

}  // namespace bench
