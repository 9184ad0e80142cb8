#pragma once
// Sets text on sheets of A4 and makes a PDF of them.

#include <string>
#include <vector>

namespace LetterSet {

class Document {
public:
    Document() { newPage(); }

    void newPage() { pages_.emplace_back(); }
    /// Places in millimetres from the top left corner, sizes in points; `text` is UTF-8 with characters of
    /// Windows-1252.
    void text(double x, double y, std::string const& text, double size = 11);
    /// With so much room between the letters, in points.
    void spaced(double x, double y, std::string const& text, double room, double size = 11);

    std::string pdf() const;

private:
    std::vector<std::string> pages_;
};

} // namespace LetterSet
