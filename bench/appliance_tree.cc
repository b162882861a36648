#include "appliance_tree.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <random>

#include "media_fixtures.h"

namespace bench {

const std::vector<std::string> kCommonWords = {"harbour", "meadow", "lantern", "orchard", "granite", "violet", "ember",
                                               "thicket", "compass", "saffron", "quarry", "mosaic", "pebble", "tundra"};

namespace {

const std::vector<std::string> kArtists = {"Miles Davis", "John Coltrane", "Nina Simone", "Bill Evans", "Chet Baker",
                                           "Ella Fitzgerald", "Thelonious Monk", "Charles Mingus", "Sonny Rollins",
                                           "Billie Holiday", "Art Blakey", "Dexter Gordon"};
const std::vector<std::pair<std::string, std::string>> kCameras = {
    {"FUJIFILM", "X-T3"}, {"Canon", "EOS R5"}, {"NIKON CORPORATION", "NIKON Z 6"}, {"Apple", "iPhone 12"}, {"SONY", "ILCE-7M3"}};
const std::vector<std::string> kAuthors = {"Ada Marsh", "Ben Okafor", "Chloe Brandt", "Dmitri Vale", "Esme Quist"};

std::string Words(std::mt19937& random, int count) {
    std::string text;
    for (int i = 0; i < count; ++i) text += (i ? " " : "") + kCommonWords[random() % kCommonWords.size()];
    return text;
}

std::string Padded(size_t number, int width) {
    std::string text = std::to_string(number);
    return std::string(static_cast<size_t>(std::max(0, width - static_cast<int>(text.size()))), '0') + text;
}

void Write(const std::string& path, const std::string& bytes) { std::ofstream(path, std::ios::binary) << bytes; }

std::string Dir(const std::string& path) {
    std::filesystem::create_directories(path);
    return path;
}

void MakeDocuments(const std::string& dir, size_t count, std::mt19937& random) {
    for (size_t i = 0; i < count; ++i) {
        const std::string folder = Dir(dir + "/Documents/" + std::to_string(2016 + i % 10));
        const std::string title = "Report " + Words(random, 2) + " " + std::to_string(i);
        const std::string author = kAuthors[i % kAuthors.size()];
        const std::string text = (i % 10 == 0 ? "invoice " : "") + Words(random, 40);
        const std::string name = folder + "/doc" + Padded(i, 5);
        if (i % 4 < 2) Write(name + ".pdf", testkit::MakePdf(title, author, text));
        else Write(name + (i % 4 == 2 ? ".docx" : ".odt"), testkit::MakeOfficeDocument(i % 4 == 3, title, author, text));
    }
}

void MakePhotos(const std::string& dir, size_t count) {
    for (size_t i = 0; i < count; ++i) {
        // Every camera in every year and month.
        const unsigned year = 2015 + static_cast<unsigned>(i / 5 % 10);
        const unsigned month = 1 + static_cast<unsigned>(i / 50 % 12);
        const std::string folder = Dir(dir + "/Photos/" + std::to_string(year) + "/" + Padded(month, 2));
        const auto& [make, model] = kCameras[i % kCameras.size()];
        const std::string taken = std::to_string(year) + ":" + Padded(month, 2) + ":" + Padded(1 + i % 28, 2) + " 12:00:00";
        testkit::WriteJpeg(folder + "/IMG_" + Padded(i, 5) + (i % 20 == 0 ? "" : ".jpg"), taken, make, model);
    }
}

void MakeSongs(const std::string& dir, size_t count, std::mt19937& random) {
    for (size_t i = 0; i < count; ++i) {
        const std::string& artist = kArtists[i % kArtists.size()];
        const std::string album = "Album " + std::to_string(i / kArtists.size() % 40);
        const std::string folder = Dir(dir + "/Music/" + artist + "/" + album);
        const std::string title = Words(random, 2);
        const unsigned year = 1955 + static_cast<unsigned>(i / kArtists.size() % 60);  // every artist in every year
        testkit::WriteMp3(folder + "/" + Padded(i, 5) + " " + title + ".mp3", title, artist, album, year);
    }
}

void MakeVideos(const std::string& dir, size_t count, std::mt19937& random) {
    const std::string folder = Dir(dir + "/Videos");
    for (size_t i = 0; i < count; ++i) {
        // Mostly short clips; one in a hundred longer than an hour.
        const int seconds = i % 100 == 0 ? 3700 : 5 + static_cast<int>(i * 37 % 600);
        testkit::WriteVideo(folder + "/clip" + Padded(i, 4) + ".mkv", seconds, "Clip " + Words(random, 2));
    }
}

void MakeNotes(const std::string& dir, size_t count, std::mt19937& random) {
    for (size_t i = 0; i < count; ++i) {
        const std::string folder = Dir(dir + "/Notes/d" + std::to_string(i / 100));
        Write(folder + "/note" + Padded(i, 5) + (i % 20 == 0 ? "" : ".txt"), Words(random, 30) + " " + RareWord(i) + "\n");
    }
}

}  // namespace

TreeCounts ApplianceCounts(double scale) {
    const auto scaled = [scale](size_t count) { return std::max<size_t>(10, static_cast<size_t>(static_cast<double>(count) * scale)); };
    return {scaled(2000), scaled(10000), scaled(5000), scaled(300), scaled(2700)};
}

std::string RareWord(size_t index) {
    // Three letters each, so that no rare word is the beginning of another.
    std::string word = "zq";
    for (size_t place = 26 * 26; place > 0; place /= 26) word += static_cast<char>('a' + index / place % 26);
    return word;
}

void MakeApplianceTree(const std::string& dir, const TreeCounts& counts) {
    std::mt19937 random(7);
    MakeDocuments(dir, counts.documents, random);
    MakePhotos(dir, counts.photos);
    MakeSongs(dir, counts.songs, random);
    MakeVideos(dir, counts.videos, random);
    MakeNotes(dir, counts.notes, random);
}

}  // namespace bench
