#pragma once
// One line on the terminal that tells how far a batch is.

#include "programs/vlmail/terminal/terminal.h"

#include <chrono>
#include <cstddef>
#include <string>
#include <utility>

namespace VlMail {

/// Shows nothing when nobody watches. The line is taken away when the object is destroyed or hidden.
class ProgressLine {
public:
    ProgressLine(Terminal const& terminal, std::size_t documents);
    ~ProgressLine();
    ProgressLine(ProgressLine const&) = delete;
    ProgressLine& operator=(ProgressLine const&) = delete;

    void documentsDone(std::size_t done);
    void lettersFound(std::size_t letters) { letters_ += letters; }
    /// Takes the line away so that other lines can be written; the next step shows it again.
    void hide();

private:
    void show();

    Terminal const& terminal_;
    std::size_t documents_;
    std::size_t done_ = 0;
    std::size_t letters_ = 0;
    bool visible_ = false;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastShown_;
};

/// One line that tells how much of a mailing is on its way. It is taken away when the object is destroyed.
class UploadLine {
public:
    UploadLine(Terminal const& terminal, std::string name) : terminal_(terminal), name_(std::move(name)) {}
    ~UploadLine();
    UploadLine(UploadLine const&) = delete;
    UploadLine& operator=(UploadLine const&) = delete;

    /// In bytes.
    void show(long long done, long long all);

private:
    Terminal const& terminal_;
    std::string name_;
    bool visible_ = false;
    std::chrono::steady_clock::time_point lastShown_;
};

} // namespace VlMail
