// is share-indexed | path-indexed | full-path-indexed | contains-indexed | indexable | skip | room:
// answered by the exit status (0 yes, 1 no).
#include "commands.h"
#include "fileindex/fileindex.h"

namespace fileindexctl {
namespace {

void AddQuestion(CLI::App& is, Context& ctx, const char* verb, const char* help, const char* argName,
                 bool (*question)(const std::string&)) {
    auto argument = std::make_shared<std::string>();
    auto* cmd = is.add_subcommand(verb, help);
    cmd->add_option(argName, *argument)->required();
    cmd->callback([&ctx, argument, question] { ctx.status = Answer(ctx.out, question(*argument)); });
}

bool IsPathIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsPathIndexed(path); }
bool IsPathContainIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsPathContainIndexed(path); }
bool IsFullPathIndexed(const std::string& path) { return QIRA::FILEINDEX::IndexMgr::IsFullPathIndexed(path); }

}  // namespace

void AddQuestionCommands(CLI::App& app, Context& ctx) {
    using namespace QIRA::FILEINDEX;
    auto* is = app.add_subcommand("is", "Questions for scripts: exit status 0 = yes, 1 = no");
    is->require_subcommand(1);
    AddQuestion(*is, ctx, "share-indexed", "Does the share hold an indexed folder?", "share", &IndexMgr::IsShareIndexed);
    AddQuestion(*is, ctx, "path-indexed", "Is the share path in an indexed folder?", "path", &IsPathIndexed);
    AddQuestion(*is, ctx, "full-path-indexed", "Is the full path in an indexed folder?", "full_path", &IsFullPathIndexed);
    AddQuestion(*is, ctx, "contains-indexed", "Does the share path contain an indexed folder?", "path",
                &IsPathContainIndexed);
    AddQuestion(*is, ctx, "indexable", "Can the share path be indexed?", "path", &CanPathBeIndexed);
    AddQuestion(*is, ctx, "skipped", "Should the full path be left out of the index?", "full_path", &IsSkipIndex);
    AddQuestion(*is, ctx, "roomy", "Does the share have room for its index?", "share", &IsShareSpaceEnough);
}

}  // namespace fileindexctl
