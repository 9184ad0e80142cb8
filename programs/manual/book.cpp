#include "programs/manual/book.h"

#include "programs/base/pending_file.h"
#include "programs/manual/completion.h"

namespace Manual {
namespace {

namespace fs = std::filesystem;

std::string topicOf(std::vector<std::string> const& path) {
    std::string name;
    for (std::size_t i = 1; i < path.size(); ++i)
        name += (i == 1 ? "" : " ") + path[i];
    return name;
}

class BookWriter {
public:
    BookWriter(fs::path folder, std::span<Topic const> topics, Book const& book)
        : folder_(std::move(folder)), topics_(topics), book_(book) {}

    void write(std::vector<std::string> const& path, Base::CommandInfo const& command) {
        Base::writeFile(folder_ / manFileName(path, book_), manPage(path, command, sectionsFor(path), book_));
        for (Base::CommandInfo const& each : command.commands) {
            std::vector<std::string> below = path;
            below.push_back(each.name);
            write(below, each);
        }
    }

private:
    std::vector<Section> sectionsFor(std::vector<std::string> const& path) const {
        std::vector<Section> sections;
        if (Topic const* const topic = topicNamed(topicOf(path), topics_))
            sections.push_back({"Description", textOf(*topic)});
        if (Topic const* const topic = topicNamed(EXIT_STATUS, topics_))
            sections.push_back({"Exit status", textOf(*topic)});
        return sections;
    }

    fs::path folder_;
    std::span<Topic const> topics_;
    Book book_;
};

} // namespace

void writeBook(fs::path const& folder, Base::CommandInfo const& program, std::span<Topic const> topics,
               Book const& book) {
    fs::remove_all(folder);
    fs::create_directories(folder / "man");
    fs::create_directories(folder / "completion");
    BookWriter(folder / "man", topics, book).write({program.name}, program);
    fs::path const scripts = folder / "completion";
    Base::writeFile(scripts / ('_' + program.name), zshCompletion(program));
    Base::writeFile(scripts / (program.name + ".fish"), fishCompletion(program));
    Base::writeFile(scripts / (program.name + ".bash"), bashCompletion(program));
}

} // namespace Manual
