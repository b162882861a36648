// The fast readings of queue lines and folder.conf give the strict readings' answers on every
// input of the fuzz targets' seed corpora (escapes, duplicate keys, number edges, deep nesting,
// invalid UTF-8, byte order marks, comments, trailing garbage).
#include "testkit.h"

#include "folder_conf_reader.h"
#include "line_reader.h"
#include "queue_record.h"

namespace {

std::vector<std::string> Corpus(const std::string& name) {
    const std::string dir = std::string(FUZZ_CORPUS_DIR) + "/" + name;
    std::vector<std::string> files;
    DIR* listing = opendir(dir.c_str());
    if (listing == nullptr) return files;
    while (const dirent* entry = readdir(listing)) {
        if (entry->d_name[0] != '.') files.push_back(dir + "/" + entry->d_name);
    }
    closedir(listing);
    return files;
}

class QueueRecordsTest : public testkit::Sandbox {};

// A member given twice counts by its last value.
TEST_F(QueueRecordsTest, AMemberGivenTwiceCountsByItsLastValue) {
    testkit::WriteFile(Path("/queue"), "{\"path\":\"/a\",\"path\":\"/b\",\"event\":5}\n{\"event\":1,\"path\":\"/a\",\"event\":65536}\n"
                                       "{\"event\":256,\"path\":\"/n\",\"path_old\":\"/x\",\"path_old\":\"/o\"}\n");
    std::vector<std::string> seen;
    const auto keep = [&](const QueueRecordView& r) { seen.push_back(std::to_string(r.event) + " " + r.path + " " + r.path_old); };
    ASSERT_EQ(ReadQueueRecords(Path("/queue"), keep, [](off_t, size_t) {}), QueueReading::Read);
    EXPECT_EQ(seen, (std::vector<std::string>{"5 /b ", "65536 /a ", "256 /n /o"}));
}

TEST(ReaderSamenessTest, QueueLinesReadTheSameBothWays) {
    detail::QueueRecordReader reader;
    const auto files = Corpus("queue_line");
    ASSERT_GE(files.size(), 60u);
    int records = 0;
    detail::QueueRecord fast;  // one record for every line: nothing of one may stay in the next
    for (const auto& file : files) {
        SCOPED_TRACE(file);
        std::string line = testkit::ReadFile(file);
        const size_t size = line.size();
        line.resize(size + detail::LineReader::kPadding);
        detail::QueueRecord strict;
        const bool fastRead = reader.Read(line.data(), line.data() + size, fast);
        ASSERT_EQ(fastRead, detail::ReadQueueRecordStrict(line.data(), line.data() + size, strict));
        if (fastRead) {
            EXPECT_EQ(fast, strict);
            ++records;
        }
    }
    EXPECT_GE(records, 15);  // both verdicts are exercised
}

TEST(ReaderSamenessTest, FolderConfReadsTheSameBothWays) {
    const auto files = Corpus("folder_conf_reading");
    ASSERT_GE(files.size(), 20u);
    int fastReads = 0;
    for (const auto& file : files) {
        SCOPED_TRACE(file);
        const std::string text = testkit::ReadFile(file);
        std::map<std::string, Folder> fast, strict;
        if (!detail::ReadFolderConfFast(text, fast)) continue;
        ++fastReads;
        ASSERT_TRUE(detail::ReadFolderConfStrict(text, strict));
        ASSERT_EQ(fast.size(), strict.size());
        for (auto a = fast.begin(), b = strict.begin(); a != fast.end(); ++a, ++b) {
            EXPECT_EQ(a->first, b->first);
            EXPECT_EQ(a->second.asJson(), b->second.asJson());
        }
    }
    EXPECT_GE(fastReads, 8);
}

}  // namespace
