#include "search_query.h"

#include <algorithm>
#include <cctype>
#include <ctime>
#include <functional>
#include <limits>
#include <map>

#include "search_index.h"

namespace tools {
namespace {

struct Token {
    std::string text;   // as typed, for errors
    std::string field;  // "" for a word
    std::string value;
};

bool IsLetters(const std::string& text) {
    return !text.empty() && std::all_of(text.begin(), text.end(), [](char c) { return std::isalpha(static_cast<unsigned char>(c)); });
}

std::string Lower(std::string text) {
    for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return text;
}

// Splits at white space; "field:" may be followed by a value in double quotes, spaces included.
bool Tokenize(const std::string& text, std::vector<Token>& tokens, std::string& error) {
    size_t at = 0;
    while (true) {
        while (at < text.size() && std::isspace(static_cast<unsigned char>(text[at]))) ++at;
        if (at == text.size()) return true;
        const size_t start = at;
        while (at < text.size() && !std::isspace(static_cast<unsigned char>(text[at])) && text[at] != '"') ++at;
        Token token;
        const size_t colon = text.find(':', start);
        if (colon < at && IsLetters(text.substr(start, colon - start))) {
            token.field = Lower(text.substr(start, colon - start));
            if (at < text.size() && text[at] == '"' && at == colon + 1) {
                const size_t close = text.find('"', at + 1);
                if (close == std::string::npos) {
                    error = "the quote after \"" + text.substr(start, at + 1 - start) + "\" is not closed";
                    return false;
                }
                token.value = text.substr(at + 1, close - at - 1);
                at = close + 1;
            } else {
                token.value = text.substr(colon + 1, at - colon - 1);
            }
        } else {
            while (at < text.size() && !std::isspace(static_cast<unsigned char>(text[at]))) ++at;
        }
        token.text = text.substr(start, at - start);
        if (token.field.empty()) token.value = token.text;
        tokens.push_back(std::move(token));
    }
}

// "N", "a..b", ">N" or "<N" as an inclusive range, each end read by `read`.
bool Range(const std::string& value, const std::function<bool(const std::string&, long long&)>& read, long long& low,
           long long& high) {
    low = std::numeric_limits<long long>::min();
    high = std::numeric_limits<long long>::max();
    const size_t dots = value.find("..");
    if (dots != std::string::npos) return read(value.substr(0, dots), low) && read(value.substr(dots + 2), high) && low <= high;
    if (!value.empty() && value[0] == '>') {
        if (!read(value.substr(1), low)) return false;
        ++low;
        return true;
    }
    if (!value.empty() && value[0] == '<') {
        if (!read(value.substr(1), high)) return false;
        --high;
        return true;
    }
    if (!read(value, low)) return false;
    high = low;
    return true;
}

bool Digits(const std::string& text, size_t most) {
    return !text.empty() && text.size() <= most &&
           std::all_of(text.begin(), text.end(), [](char c) { return std::isdigit(static_cast<unsigned char>(c)); });
}

bool ReadNumber(const std::string& text, long long& number) {
    if (!Digits(text, 15)) return false;
    number = std::stoll(text);
    return true;
}

// "12", "1.5" not taken: whole numbers with a unit of 1024s.
bool ReadSize(const std::string& text, long long& bytes) {
    static const std::map<char, int> kShifts = {{'K', 10}, {'M', 20}, {'G', 30}, {'T', 40}};
    std::string digits = text;
    int shift = 0;
    if (!digits.empty() && kShifts.count(static_cast<char>(std::toupper(static_cast<unsigned char>(digits.back()))))) {
        shift = kShifts.at(static_cast<char>(std::toupper(static_cast<unsigned char>(digits.back()))));
        digits.pop_back();
    }
    if (!Digits(digits, 9)) return false;
    bytes = std::stoll(digits) << shift;
    return true;
}

// "90", "90s", "5m", "2h", "1:30", "1:02:03".
bool ReadDuration(const std::string& text, long long& seconds) {
    if (text.find(':') != std::string::npos) {
        seconds = 0;
        size_t start = 0;
        for (int parts = 0; parts < 3; ++parts) {
            const size_t colon = text.find(':', start);
            const std::string part = text.substr(start, colon == std::string::npos ? std::string::npos : colon - start);
            if (!Digits(part, parts == 0 ? 6 : 2) || (parts > 0 && std::stoll(part) >= 60)) return false;
            seconds = seconds * 60 + std::stoll(part);
            if (colon == std::string::npos) return parts > 0;
            start = colon + 1;
        }
        return false;
    }
    static const std::map<char, long long> kUnits = {{'s', 1}, {'m', 60}, {'h', 3600}};
    std::string digits = text;
    long long unit = 1;
    if (!digits.empty() && kUnits.count(static_cast<char>(std::tolower(static_cast<unsigned char>(digits.back()))))) {
        unit = kUnits.at(static_cast<char>(std::tolower(static_cast<unsigned char>(digits.back()))));
        digits.pop_back();
    }
    if (!Digits(digits, 7)) return false;
    seconds = std::stoll(digits) * unit;
    return true;
}

// A date "YYYY", "YYYY-MM" or "YYYY-MM-DD" as the first second of its period (`end` false) or the
// first second after it (`end` true), UTC.
bool ReadDate(const std::string& text, bool end, long long& epoch) {
    int parts[3] = {0, 1, 1};
    const size_t lengths[3] = {4, 2, 2};
    size_t start = 0;
    int count = 0;
    for (; count < 3; ++count) {
        const size_t dash = text.find('-', start);
        const std::string part = text.substr(start, dash == std::string::npos ? std::string::npos : dash - start);
        if (part.size() != lengths[count] || !Digits(part, 4)) return false;
        parts[count] = std::stoi(part);
        if (dash == std::string::npos) break;
        start = dash + 1;
    }
    if (count == 3 || parts[0] < 1900 || parts[1] < 1 || parts[1] > 12 || parts[2] < 1) return false;
    std::tm day{};
    day.tm_year = parts[0] - 1900;
    day.tm_mon = parts[1] - 1;
    day.tm_mday = parts[2];
    const time_t first = timegm(&day);
    if (day.tm_mday != parts[2]) return false;  // no such day in that month
    if (end) {
        if (count == 0) ++day.tm_year;
        else if (count == 1) ++day.tm_mon;
        else ++day.tm_mday;
    }
    epoch = end ? static_cast<long long>(timegm(&day)) : static_cast<long long>(first);
    return true;
}

// Dates as ranges: the ends of "a..b", ">a" and "<a" are whole periods.
bool DateRange(const std::string& value, long long& low, long long& high) {
    const auto start = [](const std::string& text, long long& epoch) { return ReadDate(text, false, epoch); };
    const auto after = [](const std::string& text, long long& epoch) { return ReadDate(text, true, epoch) && (--epoch, true); };
    const size_t dots = value.find("..");
    low = std::numeric_limits<long long>::min();
    high = std::numeric_limits<long long>::max();
    if (dots != std::string::npos) return start(value.substr(0, dots), low) && after(value.substr(dots + 2), high) && low <= high;
    if (!value.empty() && value[0] == '>') return after(value.substr(1), low) && (++low, true);
    if (!value.empty() && value[0] == '<') return start(value.substr(1), high) && (--high, true);
    return start(value, low) && after(value, high);
}

std::string UtcText(long long epoch) {
    const time_t at = static_cast<time_t>(epoch);
    std::tm day{};
    gmtime_r(&at, &day);
    char text[24];
    std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &day);
    return text;
}

std::string LikeWord(const std::string& word) {
    std::string pattern = "% ";
    for (const char c : Lower(word)) {
        if (c == '%' || c == '_' || c == '\\') pattern += '\\';
        pattern += c;
    }
    return pattern + "%";
}

class Builder {
public:
    explicit Builder(SearchQuery& query) : query_(query) {}

    void Words(const std::string& column, const std::string& value) {
        for (size_t at = 0; at < value.size();) {
            const size_t space = value.find(' ', at);
            const std::string word = value.substr(at, space == std::string::npos ? std::string::npos : space - at);
            if (!word.empty()) {
                // The text index holds the words of the text fields too: it finds the few files
                // the comparison needs to look at.
                const std::string match = MatchExpression(word);
                if (!match.empty()) Add("f.id IN (SELECT rowid FROM search WHERE search MATCH ?)", {match});
                Add("(' ' || lower(coalesce(" + column + ", '')) || ' ') LIKE ? ESCAPE '\\'", {LikeWord(word)});
            }
            at = space == std::string::npos ? value.size() : space + 1;
        }
    }
    void Between(const std::string& column, long long low, long long high) {
        Add(column + " BETWEEN ? AND ?", {low, high});
    }
    void TextBetween(const std::string& column, long long low, long long high) {
        Add(column + " BETWEEN ? AND ?", {low == std::numeric_limits<long long>::min() ? std::string() : UtcText(low),
                                         high == std::numeric_limits<long long>::max() ? std::string("~") : UtcText(high)});
    }
    void Equal(const std::string& column, const std::string& value) { Add(column + " = ?", {value}); }

private:
    void Add(const std::string& condition, std::vector<QueryParam> params) {
        query_.where = query_.where == "1" ? condition : query_.where + " AND " + condition;
        for (auto& param : params) query_.params.push_back(std::move(param));
    }
    SearchQuery& query_;
};

bool Filter(const Token& token, Builder& build, std::string& error) {
    static const std::map<std::string, std::string> kTextFields = {
        {"title", "f.title"}, {"author", "f.author"}, {"artist", "f.artist"},
        {"album", "f.album"}, {"genre", "f.genre"},   {"camera", "f.camera"}};
    const std::string& field = token.field;
    const std::string& value = token.value;
    long long low = 0, high = 0;
    const auto fail = [&](const std::string& expected) {
        error = "\"" + token.text + "\": " + expected;
        return false;
    };
    if (field == "type") {
        if (!IsSearchTypeName(value)) return fail("a type is document, audio, video or photo");
        build.Equal("f.type", value);
    } else if (kTextFields.count(field)) {
        if (value.empty()) return fail("give a word to look for");
        build.Words(kTextFields.at(field), value);
    } else if (field == "year" || field == "pages") {
        if (!Range(value, ReadNumber, low, high)) return fail("give a whole number N, a range a..b, >N or <N");
        build.Between("f." + field, low, high);
    } else if (field == "size") {
        if (!Range(value, ReadSize, low, high)) return fail("give a size such as 200K, 1M or 2G, a range a..b, >N or <N");
        build.Between("f.size", low, high);
    } else if (field == "duration") {
        if (!Range(value, ReadDuration, low, high)) return fail("give a duration such as 90s, 5m, 1h or 1:30, a range a..b, >N or <N");
        build.Between("f.duration", low, high);
    } else if (field == "taken" || field == "modified") {
        if (!DateRange(value, low, high)) return fail("give a date YYYY, YYYY-MM or YYYY-MM-DD, a range a..b, >date or <date");
        if (field == "taken") build.TextBetween("f.taken", low, high);
        else build.Between("f.mtime", low, high);
    } else {
        return fail("there is no field \"" + field + "\"; the fields are type, title, author, artist, album, genre, camera, "
                    "year, pages, size, duration, taken and modified");
    }
    return true;
}

}  // namespace

bool IsSearchTypeName(const std::string& type) {
    return type == "document" || type == "audio" || type == "video" || type == "photo";
}

bool ParseSearchQuery(const std::string& text, SearchQuery& query, std::string& error) {
    query = SearchQuery();
    error.clear();
    if (text.size() > kMaxQueryBytes) {
        error = "the query is longer than " + std::to_string(kMaxQueryBytes) + " bytes";
        return false;
    }
    std::vector<Token> tokens;
    if (!Tokenize(text, tokens, error)) return false;
    if (tokens.size() > kMaxQueryWords) {
        error = "the query has more than " + std::to_string(kMaxQueryWords) + " words";
        return false;
    }
    Builder build(query);
    std::string words;
    for (const auto& token : tokens) {
        if (token.field.empty()) words += token.value + " ";
        else if (!Filter(token, build, error)) return false;
    }
    query.match = MatchExpression(words);
    if (query.Empty()) {
        error = "the query holds no word";
        return false;
    }
    return true;
}

}  // namespace tools
