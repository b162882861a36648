// A program built against an installed libfileindex: it names the share's queue, lists the
// indexed folders and asks whether the share is indexed. Exit 0 when all three answer.
#include <cstdio>
#include <string>

#include <fileindex/fileindex.h>

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: %s SHARE\n", argv[0]);
        return 2;
    }
    char queue[4096];
    if (FILEIDXQueuePathGet(argv[1], queue, sizeof queue) < 0) return 1;
    Json::Value listing;
    if (!QIRA::FILEINDEX::IndexMgr::List(listing, 0, 10, "path", "ASC", Json::Value(Json::arrayValue))) return 1;
    std::printf("queue %s\nfolders %u\nindexed %d\n", queue, listing["total"].asUInt(), FILEIDXIsShareIndexed(argv[1]));
    return FILEIDXIsShareIndexed(argv[1]) == 1 ? 0 : 1;
}
