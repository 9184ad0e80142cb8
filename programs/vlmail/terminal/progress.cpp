#include "programs/vlmail/terminal/progress.h"

#include <ostream>
#include <string>

namespace VlMail {
namespace {

using namespace std::chrono_literals;

constexpr char const* CLEAR_LINE = "\r\x1b[K";

std::string inWords(std::chrono::seconds time) {
    auto const minutes = std::chrono::duration_cast<std::chrono::minutes>(time);
    std::string const seconds = std::to_string((time - minutes).count()) + " s";
    return minutes.count() > 0 ? std::to_string(minutes.count()) + " min " + seconds : seconds;
}

} // namespace

ProgressLine::ProgressLine(Terminal const& terminal, std::size_t documents)
    : terminal_(terminal), documents_(documents) {}

ProgressLine::~ProgressLine() { hide(); }

void ProgressLine::documentsDone(std::size_t done) {
    done_ = done;
    auto const now = std::chrono::steady_clock::now();
    if (!terminal_.showsProgress || documents_ < 2 || now - lastShown_ < 100ms)
        return;
    lastShown_ = now;
    show();
}

void ProgressLine::hide() {
    if (visible_)
        terminal_.err << CLEAR_LINE << std::flush;
    visible_ = false;
}

void ProgressLine::show() {
    auto const elapsed = std::chrono::steady_clock::now() - start_;
    auto const left = std::chrono::duration_cast<std::chrono::seconds>(
        elapsed / static_cast<double>(done_) * static_cast<double>(documents_ - done_));
    terminal_.err << CLEAR_LINE << done_ << " of " << documents_ << " documents, " << letters_ << " letters, "
                  << inWords(left) << " left" << std::flush;
    visible_ = true;
}

UploadLine::~UploadLine() {
    if (visible_)
        terminal_.err << CLEAR_LINE << std::flush;
}

void UploadLine::show(long long done, long long all) {
    auto const now = std::chrono::steady_clock::now();
    if (!terminal_.showsProgress || now - lastShown_ < 100ms)
        return;
    lastShown_ = now;
    visible_ = true;
    terminal_.err << CLEAR_LINE << "sending " << name_ << ": " << (done >> 20) << " of " << (all >> 20)
                  << " MiB" << std::flush;
}

} // namespace VlMail
