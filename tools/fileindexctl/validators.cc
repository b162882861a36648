#include "validators.h"

#include "pause.h"


namespace fileindexctl {

const CLI::Validator ShareName(
    [](std::string& name) -> std::string {
        return name.empty() ? "a share name cannot be empty (the library would take it for every share)" : "";
    },
    "SHARE");

const CLI::Validator PauseHours(
    [](std::string& text) -> std::string {
        long long hours = 0;
        if (!CLI::detail::lexical_cast(text, hours) || hours < 0) return "hours must be a whole number, 0 or more";
        if (!tools::PauseEndFits(hours)) {
            return "a pause of " + text + " hours would end after 2038-01-19 03:14:07 UTC, where the resume time "
                   "wraps and reads as running; use --hours 0 to pause until resumed";
        }
        return "";
    },
    "HOURS");

}  // namespace fileindexctl
