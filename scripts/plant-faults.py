#!/usr/bin/python3
"""Plants one fault at a time in src/ and tools/ of a checkout, rebuilds, runs the unit tests and reports
which faults the suite caught. Used to check that a change to the tests loses no catches:
run it on a clone before and after, and compare.

    scripts/plant-faults.py CHECKOUT [--only N,M] [--faults FILE] > report.tsv

--faults takes the faults from FILE instead, a JSON list of [file, text, replacement] triples:
faults written by someone who has not read the tests.

--every runs the whole suite for each fault and names every test that failed, not only the
first: which tests catch a fault that no other test catches, before a test is dropped.

The checkout is changed and restored file by file; use a clone, not the tree you work in.
"""
import argparse
import json
import pathlib
import subprocess
import sys

# (file, text, replacement): the first occurrence of text is replaced.
FAULTS = [
    ("src/utils/utils.cc", "const size_t end = path.find('/', 1);", "const size_t end = path.rfind('/');"),
    ("src/utils/utils.cc",
     "fullPath = (lastSlash == std::string::npos ? std::string() : sharePath.substr(0, lastSlash)) + path;",
     "fullPath = sharePath + (path.find('/', 1) == std::string::npos ? std::string() : path.substr(path.find('/', 1))); (void)lastSlash;"),
    ("src/utils/utils.cc", 'return "/" + newShareName + path.substr(slash);', 'return "/" + newShareName + path.substr(slash + 1);'),
    ("src/utils/utils.cc", "str.size() >= prefix.size()", "str.size() > prefix.size()"),
    ("src/utils/utils.cc", "return lstat(path.c_str(), &st) == 0 && S_ISREG", "return stat(path.c_str(), &st) == 0 && S_ISREG"),
    ("src/utils/utils.cc", "!member->isBool()", "!member->isConvertibleTo(Json::booleanValue)"),
    ("src/folder/folders.cc", "a[key].asBool() != b[key].asBool()", "a[key].asBool() == b[key].asBool()"),
    ("src/folder/folders.cc", "if (governs) chosen = &folder;", "if (governs && chosen == nullptr) chosen = &folder;"),
    ("src/folder/folders.cc", "folders.size() >= MAX_FOLDER_COUNT", "folders.size() > MAX_FOLDER_COUNT"),
    ("src/folder/folders.cc", "upserted.Load(path, request);", "upserted.Reload(path, request);"),
    ("src/folder/folders.cc", "if (found != folders.end()) folders.erase(found);\n        return true;", "return true;"),
    ("src/folder/folders.cc", "SetError(FILEINDEX_ERR_NO_SUCH_FOLDER)", "SetError(FILEINDEX_ERR_BAD_PARAM)"),
    ("src/folder/folders.cc", "SetError(FILEINDEX_ERR_MALFORMED_FOLDERS)", "SetError(FILEINDEX_ERR_LOAD_JSON)"),
    ("src/index/index_upsert.cc", "QIRASMBIsEnableSpotlight() != 0", "QIRASMBIsEnableSpotlight() == 0"),
    ("src/index/index_upsert.cc", 'QLIBServiceStart("fileindexd", 1)', 'QLIBServiceStart("fileindexd", 0)'),
    ("src/index/index_upsert.cc", "|| !config.Save()) return false;", ") return false;\n    config.Save();"),
    ("src/index/index_upsert.cc", '"upsert_folder_setting"', '"upsert_folder_settings"'),
    ("src/index/index_delete.cc", "if (config.Count() == 0) {", "if (config.Count() == 1) {"),
    ("src/index/index_delete.cc", "if (detail::HoldsShare(saved, share)) {", "if (!detail::HoldsShare(saved, share)) {"),
    ("src/index/index_delete.cc", "element.asString().find('\\0') != std::string::npos", "false"),
    ("src/status/status.cc", "return Pause(-1);", "return Pause(0);"),
    ("src/status/status.cc", "if (!IsFlagged(body, kNoSpace, share) && !NotifyNoSpace())", "if (!NotifyNoSpace())"),
    ("src/status/status_mgr.cc", "3600u", "60u"),
    ("src/status/status_mgr.cc", "hours == 0 ? 0 : ResumeTimeAfter(hours)", "ResumeTimeAfter(hours)"),
    ("src/status/status_mgr.cc", '"resume", Json::Value(Json::objectValue)', '"resume", Json::Value()'),
    ("src/status/status_report.cc", "return resumeTime == 0 ||", "return resumeTime <= 0 ||"),
    ("src/status/status_report.cc", "if (!IsFileExist(queuePath) && !IsFileExist(queuePath + \".tmp\")) continue;",
     "if (!IsFileExist(queuePath)) continue;"),
    ("src/status/status_report.cc", "if (ShareIsNoSpace(share)) return kNoSpace;", ""),
    ("src/config/config.cc", "if (!IsFileExist(path)) return true;", "if (!IsFileExist(path)) return false;"),
    ("src/config/config.cc", "chmod(path.c_str(), 0644)", "chmod(path.c_str(), 0600)"),
    ("src/utils/daemon_channel.cc", "static_cast<uint32_t>(text.size() + 1)", "static_cast<uint32_t>(text.size())"),
    ("src/utils/daemon_channel.cc", 'message["type"] = type;', 'message["kind"] = type;'),
    ("src/queue/custom_event.cc", 'record["data"] = data;', 'record["data"] = data.isNull() ? data : Json::Value(Json::objectValue);'),
    ("src/queue/custom_event.cc", " || pending.IsQueued(path, queuePath + \".tmp\")", ""),
    ("src/queue/queue_file.cc", "ShareSetNeedReindex(share, true)", "ShareSetNeedReindex(share, false)"),
    ("src/queue/custom_event.cc", "if (sized && wrote > 0 && ftruncate", "if (sized && wrote < 0 && ftruncate"),
    ("src/index/notifyd_cfg.cc", "kMonitorMask = 65486", "kMonitorMask = 65535"),
    ("src/index/notifyd_cfg.cc", 'ignore.append("@eaDir");', 'ignore.append("@eadir");'),
    ("src/index/share_lifecycle.cc", "if (folders.Count() == 0) detail::StopIndexingServices();", ""),
    ("src/index/share_lifecycle.cc", 'return SendCammandToDaemon("revive_share_worker"', 'return SendCammandToDaemon("resume_share_worker"'),
    ("src/index/share_lifecycle.cc", 'detail::RemoveInEaDir(queuePath + ".tmp");', ""),
    ("src/index/index_reindex.cc", "if (!IndexMgr::IsShareIndexed(share)) return false;", ""),
    ("src/index/index_reindex.cc", "AddCustomEvent(kEventReindex,", "AddCustomEvent(kEventReindex + 1,"),
    ("src/utils/indexability_rules.cc", '{"surveillance", "NetBackup"}', '{"surveillance"}'),
    ("src/utils/indexability_rules.cc", "const bool canonical = real && fullPath == resolved;", "const bool canonical = real;"),
    ("src/utils/indexability_rules.cc", "&& isEncryption == 0;", "&& isEncryption != 0;"),
    ("src/utils/indexability.cc", "kIndexSpaceNeeded = 10485760ULL", "kIndexSpaceNeeded = 1048576ULL"),
    ("src/utils/indexability.cc", "if (type == -1) return false;", "if (type == -1) return true;"),
    ("src/queue/pending_reindex.cc", "if (record.event == static_cast<unsigned>(kEventReindex) && wanted_",
     "if (wanted_"),
    ("src/queue/pending_reindex.cc", "if (std::memchr(begin, '\\\\', static_cast<size_t>(end - begin)) != nullptr) return true;", ""),
    ("src/queue/queue_status.cc", "return answer.refused || answer.under[0] > 0;", "return answer.under[0] > 0;"),
    ("src/queue/queue_record.cc", "case simdjson::dom::element_type::NULL_VALUE:\n            out = 0;\n            return Verdict::Record;",
     "case simdjson::dom::element_type::NULL_VALUE:\n            return Verdict::Malformed;"),
    ("src/queue/queue_record.cc", "value > static_cast<int64_t>(UINT_MAX)", "value >= static_cast<int64_t>(UINT_MAX)"),
    ("src/folder/folders_listing.cc", 'sort_direction == "DESC"', 'sort_direction == "desc"'),
    ("src/folder/folders_listing.cc", "offset < all.size() ? all.size() - offset : 0", "all.size()"),
    ("src/folder/folder.cc", "out = CanPathBeIndexed(path);", "out = true;"),
    ("src/index/index_mgr.cc", "if (detail::IsWithin(folder.path, path)) return true;", "if (detail::IsWithin(path, folder.path)) return true;"),
    ("src/utils/storage_paths.cc", "if (makeLeafDir && !truncated", "if ((makeLeafDir || !makeLeafDir) && !truncated"),
    ("src/utils/ea_dir.cc", " || st.st_nlink > 1", ""),
    ("src/utils/path_rules.cc", " || (path.size() > n && path[n] != '/')", ""),
    # Incremental queue readings.
    ("src/queue/queue_readings.cc", "st.st_size < reading->committed ||", ""),
    ("src/queue/queue_readings.cc", "offset >= reading.loggedUpTo) LogMalformed(", "offset > reading.loggedUpTo) LogMalformed("),
    ("src/queue/queue_readings.cc", "part.malformed.size() >= kMaxHeldMalformed", "part.malformed.size() > kMaxHeldMalformed + 1"),
    ("src/queue/queue_readings.cc", "if (reading.committed == part.begin) {", "if (true) {"),
    ("src/queue/queue_readings.cc", "path[length] != '/'", "path[length] != '/' && false"),
    ("src/queue/queue_readings.cc", "kEventRename && !record.path_old.empty()", "kEventRename && record.path_old.empty()"),
    ("src/queue/queue_readings.cc", "        missing.clear();\n", ""),
    ("src/queue/queue_readings.cc", "if (prefixes == reading.asked) return false;", "if (prefixes.size() == reading.asked.size()) return false;"),
    ("src/queue/queue_readings.cc", "if (parse) reading.loggedUpTo", "reading.loggedUpTo"),
    ("src/queue/progress.cc", "queue.lines + companion.lines", "queue.lines"),
    # The console.
    ("tools/fileindex_web/api.cc", "!req.HasHeader(\"X-Fileindex-Token\") || ", ""),
    ("tools/fileindex_web/host_check.cc", "return port == 80 && names_.count(lower) != 0;", "return names_.count(lower) != 0;"),
    ("tools/fileindex_web/host_check.cc", "lower.size() > suffix.size() &&", "lower.size() >= suffix.size() &&"),
    ("tools/fileindex_web/http_server.cc", "> limits_.maxBody) pending.tooLarge", ">= limits_.maxBody) pending.tooLarge"),
    ("tools/fileindex_web/http_server.cc", "name.empty() || name[0] == '.'", "name.empty()"),
    ("tools/fileindex_web/token.cc", " || (st.st_mode & 077) != 0", ""),
    ("tools/fileindex_web/token.cc", "given.size() == token.size() ? 0 : 1", "0"),
    ("tools/common/pause.cc", "return hours >= 0 &&", "return hours > 0 &&"),
    ("tools/common/pause.cc", 'resumeTime > 0 ? Json::Value(FormatUtc', 'resumeTime >= 0 ? Json::Value(FormatUtc'),
    ("tools/common/pause.cc", "(last - static_cast<long long>(time(nullptr))) / 3600", "(last - static_cast<long long>(time(nullptr))) / 3600 + 1"),
    ("tools/common/service_view.cc", 'if (word != "finished") left = "indexing is " + word;', 'if (word == "processing") left = "indexing is " + word;'),
    ("src/queue/progress.cc", 'if (queue.refused) entry["unread"].append("queue");', 'if (queue.refused) entry["unread"].append("companion");'),
    ("tools/common/share_path_check.cc", 'component == "." || component == ".."', 'component == "."'),
    ("tools/fileindex_web/api.cc", 'text.size() > 9) return fallback;', 'text.size() > 19) return fallback;'),
    ("tools/fileindex_web/api.cc", 'if (name != "status" && name != "is_valid") {', 'if (name != "status" && name != "is_valid" && name != "bogus") {'),
    ("tools/fileindex_web/api.cc", 'return hours.isIntegral() && tools::PauseEndFits', 'return hours.isNumeric() && tools::PauseEndFits'),
    ("tools/fileindex_web/api.cc", 'if (cause.number == QIRA::FILEINDEX::FILEINDEX_ERR_LOCK) res.SetHeader("Retry-After", "1");', ''),
    ("tools/fileindex_web/api.cc", '(!origin.empty() && origin != "http://" + req.Header("Host"))', '(!origin.empty() && origin.rfind("http://" + req.Header("Host"), 0) != 0)'),
    ("tools/fileindex_web/api.cc", 'if (req.Header("Content-Type").rfind("application/json", 0) != 0) {', 'if (req.Header("Content-Type").find("json") == std::string::npos) {'),
    ("src/index/explain.cc", 'if (rule == "snapshot") return "the path lies in a snapshot";', 'if (rule == "snapshot") return "the path lies in a recycle bin";'),
    ("src/index/explain.cc", 'if (facts.isMember("exists")) return "the directory does not exist";', ''),
    ("tools/common/cause.cc", 'if (message == "SendCammandToDaemon failed") {', 'if (message == "SendCommandToDaemon failed") {'),
    ("tools/common/envelope.cc", 'envelope["saved"] = Json::Value(Json::arrayValue);', 'envelope["saved"] = Json::Value();'),
    ("tools/common/share_path_check.cc", "if (path.empty() || path[0] != '/') {", "if (path.empty()) {"),
    ("tools/fileindexctl/commands.h", "constexpr int kExitTimeOut = 3;", "constexpr int kExitTimeOut = 2;"),
]


def run(cmd, cwd):
    return subprocess.run(cmd, cwd=cwd, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)


def first_failure(ctest_output):
    for line in ctest_output.splitlines():
        if "***Failed" in line or "***Timeout" in line or "***Exception" in line:
            return line.split(" - ")[-1].split()[0] if " - " in line else line.strip()
    return ""


def every_failure(ctest_output):
    listed = ctest_output.split("The following tests FAILED:", 1)[-1] if "tests FAILED:" in ctest_output else ""
    return ",".join(line.split(" - ", 1)[1].split(" (")[0] for line in listed.splitlines() if " - " in line)


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("checkout", type=pathlib.Path)
    parser.add_argument("--only", help="comma-separated fault numbers (1-based)")
    parser.add_argument("--faults", type=pathlib.Path, help="a JSON list of [file, text, replacement]")
    parser.add_argument("--every", action="store_true", help="run every test and name each that failed")
    args = parser.parse_args()
    faults = [tuple(fault) for fault in json.loads(args.faults.read_text())] if args.faults else FAULTS
    tree = args.checkout.resolve()
    build = tree / "build-faults"
    if run(["cmake", "-S", ".", "-B", str(build), "-DCMAKE_BUILD_TYPE=Debug"], tree).returncode != 0:
        sys.exit("configure failed")
    if run(["cmake", "--build", str(build), "-j2"], tree).returncode != 0:
        sys.exit("the unchanged tree does not build")
    chosen = {int(n) for n in args.only.split(",")} if args.only else None
    caught = planted = 0
    for number, (name, text, replacement) in enumerate(faults, 1):
        if chosen and number not in chosen:
            continue
        path = tree / name
        original = path.read_text()
        if text not in original:
            print(f"{number}\t{name}\tnot-applicable\t{text!r}", flush=True)
            continue
        path.write_text(original.replace(text, replacement, 1))
        try:
            if run(["cmake", "--build", str(build), "-j2"], tree).returncode != 0:
                verdict, detail = "build-error", ""
            else:
                ctest = ["ctest", "--timeout", "120", "-j4"] if args.every else ["ctest", "--timeout", "60", "--stop-on-failure", "-j2"]
                tests = run(ctest, build)
                verdict = "caught" if tests.returncode != 0 else "missed"
                detail = every_failure(tests.stdout) if args.every else first_failure(tests.stdout)
                planted += 1
                caught += verdict == "caught"
        finally:
            path.write_text(original)
        print(f"{number}\t{name}\t{verdict}\t{detail}", flush=True)
    run(["cmake", "--build", str(build), "-j2"], tree)
    print(f"# caught {caught} of {planted}", flush=True)


if __name__ == "__main__":
    main()
