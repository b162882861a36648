// The extraction worker: what it reads from files of each kind, the bounds of its requests, its
// sandbox, and the daemon's side living through a worker that stops answering or dies.
#include <thread>

#include "beneath.h"
#include "extractor_client.h"
#include "worker_sandbox.h"
#include "media_fixtures.h"
#include "testkit.h"

namespace {

using fileindexd_ref::ExtractorClient;

class ExtractorTest : public testkit::Sandbox {
protected:
    extractor::Reply Extract(const std::string& name, const std::string& content, size_t maxText = 1024) {
        const std::string path = Path("/" + name);
        testkit::WriteFile(path, content);
        const tools::Fd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC));
        return client_.Extract(fd.Get(), name, maxText);
    }
    ExtractorClient client_{{FILEINDEX_EXTRACTOR, {}, std::chrono::seconds(30)}};
};

// A file's kind is told by what it holds, whatever its name; text is read in its encoding, and
// documents, songs and photos give their fields.
TEST_F(ExtractorTest, KindTextAndFieldsComeFromTheContent) {
    const std::string song = Path("/song"), photo = Path("/photo"), flac = Path("/flac"), video = Path("/video");
    testkit::WriteMp3(song, "So What", "Miles Davis", "Kind of Blue", 1959);
    testkit::WriteFlac(flac, "Naima", "John Coltrane", "Giant Steps", 1960, 261);
    testkit::WriteJpeg(photo, "2019:06:14 10:20:30", "FUJIFILM", "X-T3");
    testkit::WriteVideo(video, 3, "Beach");
    const std::vector<std::tuple<std::string, std::string, std::string, std::string, std::string>> cases = {
        // name, content, type and (where given) MIME type, text, fields (where given)
        {"notes", "An old manuscript\nfrom the attic\n", "document text/plain", "An old manuscript\nfrom the attic\n", ""},
        {"latin", "caf\xE9 cr\xE8me br\xFBl\xE9" "e au four, d\xE9j\xE0 pr\xEAte\n", "document text/plain",
         "café crème brûlée au four, déjà prête\n", ""},
        {"wide", std::string("\xFF\xFEh\0i\0 \0t\0h\0e\0r\0e\0", 18), "document text/plain", "hi there", ""},
        {"page", "<html><head><title>The  Title</title><style>p {}</style></head><body><script>var x;</script>"
                 "<p>Hello <b>bold</b>\n world</p></body></html>", "document text/html", "Hello bold world", R"({"title": "The Title"})"},
        {"blob", std::string("\x01\x02\x03\x04\x00\xFE", 6) + std::string(64, '\0'), " application/octet-stream", "", ""},
        {"report.txt", testkit::MakePdf("Quarterly Report", "Ann Smith", "Revenue grew in the third quarter"), "document",
         "Revenue grew in the third quarter\n", R"({"title": "Quarterly Report", "author": "Ann Smith", "pages": 1})"},
        {"letter", testkit::MakeOfficeDocument(false, "A Letter", "Bob Jones", "Dear reader of docx"), "document",
         "Dear reader of docx\n", R"({"title": "A Letter", "author": "Bob Jones"})"},
        {"notes.doc", testkit::MakeOfficeDocument(true, "Field Notes", "Eve", "Birds seen at dawn"), "document",
         "Birds seen at dawn\n", R"({"title": "Field Notes", "author": "Eve"})"},
        {"track.txt", testkit::ReadFile(song), "audio", "",
         R"({"title": "So What", "artist": "Miles Davis", "album": "Kind of Blue", "year": 1959, "duration": 1})"},
        {"tune", testkit::ReadFile(flac), "audio", "",
         R"({"title": "Naima", "artist": "John Coltrane", "album": "Giant Steps", "year": 1960, "duration": 261})"},
        {"IMG_0001", testkit::ReadFile(photo), "photo", "",
         R"({"taken": "2019-06-14 10:20:30", "camera_make": "FUJIFILM", "camera_model": "X-T3", "width": 1, "height": 1})"},
        {"quirk.jpg", testkit::MakeJpegWithExif(0, 0xFFFFFF00), "photo", "",  // a damaged part beside what was read
         R"({"taken": "2020-02-29 23:59:59", "width": 1, "height": 1})"},
        {"IMG_0002", testkit::MakeHeic("2021:12:24 18:00:00", "Apple", "iPhone 12", 4032, 3024), "photo", "",
         R"({"taken": "2021-12-24 18:00:00", "camera_make": "Apple", "camera_model": "iPhone 12", "width": 4032, "height": 3024})"},
        {"clip.txt", testkit::ReadFile(video), "video", "",
         R"({"duration": 3, "width": 4, "height": 2, "codecs": ["rawvideo"], "title": "Beach"})"},
    };
    for (const auto& [name, content, kind, text, fields] : cases) {
        const extractor::Reply reply = Extract(name, content);
        EXPECT_EQ(reply.problem, "") << name;
        EXPECT_EQ(reply.type + (kind.find(' ') == std::string::npos ? "" : " " + reply.mime), kind) << name;
        EXPECT_EQ(reply.text, text) << name;
        if (!fields.empty()) { EXPECT_EQ(reply.fields, testkit::ParseJson(fields)) << name; }
    }
    // The text is cut to what was asked, at a character's start.
    EXPECT_EQ(Extract("cut", "d\xC3\xA9j\xC3\xA0 vu", 5).text, "d\xC3\xA9j");
    // Damaged files of a kind are typed, with the reason nothing more was read.
    const std::string mp3 = std::string("ID3\x03\x00\x00\x00\x00\x00\x00\xFF\xFB\x90\x64", 14) + std::string(417, '\0');
    const std::vector<std::tuple<std::string, std::string, std::string>> damaged = {
        {testkit::MakePdf("T", "A", "cut short").substr(0, 40), "document", "the PDF cannot be read"},
        {mp3, "audio", "the audio file cannot be read"},
        {std::string("\xFF\xD8\xFF\xE1\x00\x08Exif", 10), "photo", "the photo's metadata cannot be read"},
        {testkit::MakeZipBomb(), "document", "a part of the document is larger than 16 MiB, or all of them together than 64 MiB"},

    };
    for (const auto& [content, type, problem] : damaged) {
        const extractor::Reply reply = Extract("damaged", content);
        EXPECT_EQ(reply.type + ": " + reply.problem, type + ": " + problem);
        EXPECT_EQ(reply.fields, Json::Value(Json::objectValue)) << problem;
    }
}

// Requests are taken within their bounds, on both sides of each.
TEST(ExtractorProtocolTest, RequestsAreTakenWithinTheirBounds) {
    const std::string longest(extractor::kMaxName, 'n');
    const std::vector<std::pair<std::string, std::string>> cases = {
        {R"({"name": ")" + longest + R"(", "max_text": 1048576})", ""},
        {R"({"name": "a", "max_text": 0})", ""},
        {R"({"name": ")" + longest + R"(n", "max_text": 1})", "\"name\" is not a file name of 1 to 255 bytes"},
        {R"({"name": "", "max_text": 1})", "\"name\" is not a file name of 1 to 255 bytes"},
        {R"({"name": "a/b", "max_text": 1})", "\"name\" is not a file name of 1 to 255 bytes"},
        {R"({"name": "a\u0000b", "max_text": 1})", "\"name\" is not a file name of 1 to 255 bytes"},
        {R"({"name": 7, "max_text": 1})", "\"name\" is not a file name of 1 to 255 bytes"},
        {R"({"name": "a", "max_text": 1048577})", "\"max_text\" is not a whole number from 0 to 1048576"},
        {R"({"name": "a", "max_text": -1})", "\"max_text\" is not a whole number from 0 to 1048576"},
        {R"({"name": "a", "max_text": 1.5})", "\"max_text\" is not a whole number from 0 to 1048576"},
        {R"(["a", 1])", "the request is not a JSON object of at most 4096 bytes"},
        {R"({"name": "a", "max_text": 1, "pad": ")" + std::string(4096, 'p') + "\"}", "the request is not a JSON object of at most 4096 bytes"},
    };
    for (const auto& [json, problem] : cases) {
        extractor::Request request;
        std::string found;
        EXPECT_EQ(extractor::DecodeRequest(json, request, found), problem.empty()) << json.substr(0, 60);
        EXPECT_EQ(found, problem) << json.substr(0, 60);
    }
}

// In the sandbox a process may read what it was handed and make threads, but opening a file
// fails, and starting a program, a process or a socket ends it.
TEST(ExtractorSandboxTest, OnlyWhatWasHandedOverCanBeReached) {
    const std::vector<std::pair<std::string, std::function<int()>>> cases = {
        {"thread", [] { std::thread([] {}).join(); return 0; }},
        {"open", [] { return open("/etc/hostname", O_RDONLY) < 0 && errno == EACCES ? 0 : 1; }},
        {"socket", [] { return socket(AF_UNIX, SOCK_STREAM, 0) >= 0 ? 0 : 1; }},
        {"fork", [] { return fork() >= 0 ? 0 : 1; }},
        {"exec", [] { execl("/bin/true", "true", nullptr); return 1; }},
    };
    for (const auto& [name, attempt] : cases) {
        const pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0) _exit(extractor::EnterSandbox({}) ? attempt() : 2);
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        const bool allowed = name == "thread" || name == "open";
        EXPECT_EQ(WIFEXITED(status) && WEXITSTATUS(status) == 0, allowed) << name << " status " << status;
        EXPECT_EQ(WIFSIGNALED(status) && WTERMSIG(status) == SIGSYS, !allowed) << name << " status " << status;
    }
}

// A worker that stops answering costs its file a name-only entry and is replaced; so does one
// that died: the next file is read by a new worker.
TEST_F(ExtractorTest, AWorkerThatHangsOrDiesIsReplaced) {
    ASSERT_EQ(Extract("first", "first words\n").text, "first words\n");
    ExtractorClient quick({FILEINDEX_EXTRACTOR, {}, std::chrono::seconds(2)});
    const std::string path = Path("/first");
    const tools::Fd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    // A worker that answers: on a loaded machine a first start may run past the deadline.
    ASSERT_TRUE(testkit::WaitFor([&] { return quick.Extract(fd.Get(), "first", 100).problem.empty(); }));
    const pid_t hung = quick.Worker();
    ASSERT_EQ(kill(hung, SIGSTOP), 0);
    EXPECT_EQ(quick.Extract(fd.Get(), "first", 100).problem, "the extractor took longer than 2000 ms");
    EXPECT_EQ(quick.Worker(), 0);
    EXPECT_NE(kill(hung, 0), 0);  // killed and reaped
    EXPECT_TRUE(testkit::WaitFor([&] { return quick.Extract(fd.Get(), "first", 100).text == "first words\n"; }));
    const std::vector<std::pair<int, std::string>> deaths = {
        {SIGKILL, "the extractor was stopped by signal 9"},
        {SIGSYS, "the extractor tried a system call its sandbox forbids"},
        {SIGXCPU, "the extractor ran past its CPU time limit"},
    };
    for (const auto& [signal, problem] : deaths) {
        const pid_t worker = client_.Worker();
        ASSERT_GT(worker, 0);
        ASSERT_EQ(kill(worker, signal), 0);
        EXPECT_EQ(Extract("again", "more words\n").problem, problem);
        EXPECT_EQ(Extract("again", "more words\n").text, "more words\n");
        EXPECT_NE(client_.Worker(), worker);
    }
    // A file that keeps the worker busy without end: the CPU limit ends it well before the deadline.
    ExtractorClient bounded({FILEINDEX_EXTRACTOR, {512, 1}, std::chrono::minutes(10)});
    testkit::WriteFile(Path("/endless.pdf"), testkit::MakeEndlessPdf());
    const tools::Fd endless(open(Path("/endless.pdf").c_str(), O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(bounded.Extract(endless.Get(), "endless.pdf", 100).problem, "the extractor ran past its CPU time limit");
    ExtractorClient missing({Path("/no-such-program"), {}, std::chrono::seconds(1)});
    EXPECT_EQ(missing.Extract(fd.Get(), "first", 100).problem, "the extractor cannot be started");
}

}  // namespace
