// A generated share that looks like an appliance's: documents (PDF, docx, odt), photos with EXIF,
// tagged songs, short videos and plain-text notes, each made with the same libraries the tests use.
#pragma once

#include <string>
#include <vector>

namespace bench {

struct TreeCounts {
    size_t documents = 0;
    size_t photos = 0;
    size_t songs = 0;
    size_t videos = 0;
    size_t notes = 0;
    size_t Total() const { return documents + photos + songs + videos + notes; }
};

// 2,000 documents, 10,000 photos, 5,000 songs, 300 videos and 2,700 notes times `scale`, at least
// ten of each.
TreeCounts ApplianceCounts(double scale);

// Words that many notes and documents hold.
extern const std::vector<std::string> kCommonWords;

// The `index`th word that exactly one note holds (letters only, none the start of another), for
// index < counts.notes.
std::string RareWord(size_t index);

// Writes the tree under `dir` (made here). One photo in twenty and one note in twenty have no
// extension, so that their kind comes from their content.
void MakeApplianceTree(const std::string& dir, const TreeCounts& counts);

}  // namespace bench
