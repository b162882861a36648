#include "folder_view.h"

#include "fileindex/explain.h"

namespace tools {

std::string RefusingRule(const std::string& path) {
    Json::Value explanation;
    if (!QIRA::FILEINDEX::ExplainPath(path, explanation) || explanation["indexable"].asBool()) return "";
    return explanation["refused_by"].asString();
}

void AddRefusingRule(Json::Value& additional, const std::string& path) {
    if (additional["status"] != "paused") return;
    const std::string rule = RefusingRule(path);
    if (!rule.empty()) additional["refused_by"] = rule;
}

void AddRefusingRules(Json::Value& listing) {
    for (auto& folder : listing["folder"]) {
        if (folder["additional"].isMember("status")) AddRefusingRule(folder["additional"], folder["path"].asString());
    }
}

std::string StatusText(const Json::Value& additional) {
    return additional.isMember("refused_by") ? "not indexable: " + additional["refused_by"].asString()
                                             : additional["status"].asString();
}

Json::Value IndexabilityWarnings(const Json::Value& request) {
    Json::Value warnings(Json::arrayValue);
    for (const auto& folder : request) {
        Json::Value explanation;
        const std::string path = folder["path"].asString();
        if (!QIRA::FILEINDEX::ExplainPath(path, explanation) || explanation["indexable"].asBool()) continue;
        warnings.append(path + " cannot be indexed now: " + explanation["problem"].asString() + " (" +
                        explanation["refused_by"].asString() + "); it stays listed as not valid until that changes");
    }
    return warnings;
}

}  // namespace tools
