#pragma once
// Pages of PDFs laid on one another, and turned; written with qpdf.
// Without anything that needs C++20: clang takes qpdf's headers up to C++17 only.

#include <memory>
#include <string>
#include <vector>

namespace Production {

/// A page that is laid on others, from a PDF of one page, which is parsed once.
class LaidPage {
public:
    /// Throws Error when it is no such PDF; `where` names it in messages.
    LaidPage(std::string pdf, std::string const& where);
    ~LaidPage();
    LaidPage(LaidPage&&) noexcept;
    LaidPage& operator=(LaidPage&&) noexcept;

    struct Parsed;
    Parsed& parsed() const { return *parsed_; }

private:
    std::unique_ptr<Parsed> parsed_;
};

struct PageChange {
    /// A page that is laid on, and when: one that fits the page as it was is turned along with it.
    struct Laid {
        LaidPage const* page;
        bool isTurnedAlong = false;
    };

    /// Both from below.
    std::vector<Laid> under = {};
    std::vector<Laid> over = {};
    /// Clockwise.
    int quarterTurns = 0;

    bool empty() const { return under.empty() && over.empty() && quarterTurns == 0; }
};

/// The page of a PDF of one page with what `change` says. What is laid on keeps its size to the point; the
/// upper left corners of what the pages show lie on one another. The same input gives the same bytes.
/// Throws Error, whose message begins with `where`.
std::string changedPage(std::string const& pdf, PageChange const& change, std::string const& where);

} // namespace Production
