// is share-indexed | path-indexed | full-path-indexed | contains-indexed | indexable | skip | room:
// answered by the exit status (0 yes, 1 no).
#include "commands.h"
#include "captured_log.h"
#include "fileindex/fileindex.h"

namespace fileindexctl {
namespace {

enum class Names { Share, SharePath, FullPath };

// The share an argument names, when it names one; false (and `share` empty) for a full path.
bool ShareNamed(const std::string& argument, Names names, std::string& share) {
    if (names == Names::FullPath) return false;
    if (names == Names::Share) share = argument;
    else QIRA::FILEINDEX::GetShareNameByPath(share, argument);
    return true;
}

// A "no" with an error code left (folder.conf unreadable, an unknown share) is no answer; for a
// question whose only log line is a failed share look-up, a log line is none either. A question
// about a share the appliance does not know has no answer either.
void AddQuestion(CLI::App& is, Context& ctx, const char* verb, const char* help, const char* argName, Names names,
                 bool (*question)(const std::string&), bool logMeansUnknown = false) {
    auto argument = std::make_shared<std::string>();
    auto* cmd = is.add_subcommand(verb, help);
    cmd->add_option(argName, *argument)->required();
    cmd->callback([&ctx, argument, names, question, verb, logMeansUnknown] {
        const std::string operation = std::string("is ") + verb;
        std::string share;
        std::string shareDir;
        if (ShareNamed(*argument, names, share) && !QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) {
            ctx.status = ctx.Fail(operation, {"SHARE_UNKNOWN", 0, "no share is named \"" + share + "\"", 404}, kExitUnknown);
            return;
        }
        bool yes = false;
        ctx.Attempt([&] {
            yes = question(*argument);
            return true;
        });
        const bool unknown = !yes && (QIRA::FILEINDEX::ErrorHandler::GetError() != QIRA::FILEINDEX::FILEINDEX_ERR_NONE ||
                                      (logMeansUnknown && !tools::CapturedLog().empty()));
        if (unknown) {
            ctx.Fail(operation);
            ctx.status = kExitUnknown;
            return;
        }
        Json::Value result(Json::objectValue);
        result["answer"] = yes;
        ctx.out.Emit(result, yes ? "yes" : "no");
        ctx.status = yes ? 0 : 1;
    });
}

bool IsPathIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsPathIndexed(path); }
bool IsPathContainIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsPathContainIndexed(path); }
bool IsFullPathIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsFullPathIndexed(path); }

}  // namespace

void AddQuestionCommands(CLI::App& app, Context& ctx) {
    using namespace QIRA::FILEINDEX;
    auto* is = app.add_subcommand("is", "Questions for scripts: exit status 0 = yes, 1 = no, 2 = no answer "
                                        "(folder.conf unreadable, unknown share)");
    is->require_subcommand(1);
    AddQuestion(*is, ctx, "share-indexed", "Does the share hold an indexed folder?", "share", Names::Share,
                &IndexMgr::IsShareIndexed);
    AddQuestion(*is, ctx, "path-indexed", "Is the share path in an indexed folder?", "path", Names::SharePath,
                &IsPathIndexed);
    AddQuestion(*is, ctx, "full-path-indexed", "Is the full path in an indexed folder?", "full_path", Names::FullPath,
                &IsFullPathIndexed);
    AddQuestion(*is, ctx, "contains-indexed", "Does the share path contain an indexed folder?", "path", Names::SharePath,
                &IsPathContainIndexed);
    AddQuestion(*is, ctx, "indexable", "Can the share path be indexed?", "path", Names::SharePath, &CanPathBeIndexed);
    AddQuestion(*is, ctx, "skipped", "Should the full path be left out of the index?", "full_path", Names::FullPath,
                &IsSkipIndex);
    AddQuestion(*is, ctx, "roomy", "Does the share have room for its index?", "share", Names::Share,
                &IsShareSpaceEnough, true);
}

}  // namespace fileindexctl
