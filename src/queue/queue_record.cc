#include "queue_record.h"

#include <climits>
#include <cstring>

#include <json/value.h>
#include <simdjson.h>

#include "fileindex/json.h"
#include "line_reader.h"
#include "strict_json.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

static_assert(LineReader::kPadding >= simdjson::SIMDJSON_PADDING, "lines must carry simdjson's padding");

// Deeper lines go to jsoncpp, whose own limit then decides.
constexpr size_t kFastDepthLimit = 64;

enum class Verdict { Record, Malformed, Unsure };

const Json::Value* Member(const Json::Value& object, const char* key) {
    return object.find(key, key + std::strlen(key));
}

// jsoncpp's conversion of a simdjson number or literal to an unsigned integer.
Verdict EventOf(simdjson::dom::element event, unsigned& out) {
    switch (event.type()) {
        case simdjson::dom::element_type::INT64: {
            const int64_t value = event.get_int64().value_unsafe();
            if (value < 0 || value > static_cast<int64_t>(UINT_MAX)) return Verdict::Malformed;
            out = static_cast<unsigned>(value);
            return Verdict::Record;
        }
        case simdjson::dom::element_type::UINT64: {
            const uint64_t value = event.get_uint64().value_unsafe();
            if (value > UINT_MAX) return Verdict::Malformed;
            out = static_cast<unsigned>(value);
            return Verdict::Record;
        }
        case simdjson::dom::element_type::BOOL:
            out = event.get_bool().value_unsafe() ? 1 : 0;
            return Verdict::Record;
        case simdjson::dom::element_type::NULL_VALUE:
            out = 0;
            return Verdict::Record;
        case simdjson::dom::element_type::DOUBLE:
            return Verdict::Unsure;  // jsoncpp's own number reading decides fractions and edges
        default:
            return Verdict::Malformed;
    }
}

bool StartsWithObject(const char* begin, const char* end) {
    while (begin < end && (*begin == ' ' || *begin == '\t' || *begin == '\r' || *begin == '\n')) ++begin;
    return begin < end && *begin == '{';
}

Verdict ReadFast(simdjson::dom::parser& parser, const char* begin, const char* end, QueueRecord& record) {
    if (!StartsWithObject(begin, end)) return Verdict::Unsure;  // a byte order mark, or not an object
    simdjson::dom::element root;
    if (parser.parse(begin, static_cast<size_t>(end - begin), false).get(root) != simdjson::SUCCESS) {
        return Verdict::Unsure;
    }
    simdjson::dom::object object;
    if (root.get_object().get(object) != simdjson::SUCCESS) return Verdict::Unsure;
    simdjson::dom::element event, path, pathOld;
    int events = 0, paths = 0, oldPaths = 0;
    for (const auto field : object) {
        if (field.key == "event") {
            event = field.value;
            ++events;
        } else if (field.key == "path") {
            path = field.value;
            ++paths;
        } else if (field.key == "path_old") {
            pathOld = field.value;
            ++oldPaths;
        }
    }
    if (events > 1 || paths > 1 || oldPaths > 1) return Verdict::Unsure;  // jsoncpp keeps the last
    if (events == 0 || paths == 0 || !path.is_string()) return Verdict::Malformed;
    const Verdict verdict = EventOf(event, record.event);
    if (verdict != Verdict::Record) return verdict;
    record.path.assign(path.get_string().value_unsafe());
    record.path_old.clear();
    if (record.event == kEventRename && oldPaths == 1 && pathOld.is_string()) {
        record.path_old.assign(pathOld.get_string().value_unsafe());
    }
    return Verdict::Record;
}

// The strict reading with a caller's reader.
bool ReadStrict(StrictJsonReader& reader, const char* begin, const char* end, QueueRecord& record) {
    Json::Value value;
    if (!reader.Parse(begin, end, value) || !value.isObject()) return false;
    const Json::Value* event = Member(value, "event");
    const Json::Value* path = Member(value, "path");
    if (event == nullptr || path == nullptr || !event->isConvertibleTo(Json::uintValue) || !path->isString()) {
        return false;
    }
    record.event = event->asUInt();
    record.path = path->asString();
    record.path_old.clear();
    if (record.event == kEventRename) {
        const Json::Value* old = Member(value, "path_old");
        if (old != nullptr && old->isString()) record.path_old = old->asString();
    }
    return true;
}

}  // namespace

bool ReadQueueRecordStrict(const char* begin, const char* end, QueueRecord& record) {
    StrictJsonReader reader;
    return ReadStrict(reader, begin, end, record);
}

struct QueueRecordReader::Parser {
    simdjson::dom::parser parser;
};

QueueRecordReader::QueueRecordReader()
    : parser_(std::make_unique<Parser>()), strict_(std::make_unique<StrictJsonReader>()) {
    // Capacity grows with the longest line; the depth stays below jsoncpp's limit.
    if (parser_->parser.allocate(4096, kFastDepthLimit) != simdjson::SUCCESS) parser_.reset();
}

QueueRecordReader::~QueueRecordReader() = default;

bool QueueRecordReader::Read(const char* begin, const char* end, QueueRecord& record) {
    const Verdict verdict = parser_ ? ReadFast(parser_->parser, begin, end, record) : Verdict::Unsure;
    if (verdict == Verdict::Unsure) return !StrictReadingRefuses(begin, end) && ReadStrict(*strict_, begin, end, record);
    return verdict == Verdict::Record;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
