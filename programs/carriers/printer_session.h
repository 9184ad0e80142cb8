#pragma once
// What a printer is asked and told, by the Internet Printing Protocol.

#include "programs/base/error.h"
#include "programs/carriers/carrier.h"

#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace Carriers {

/// What a printer offers, by the protocol's own words.
struct PrinterFacts {
    std::string name;
    bool takesJobs = false;
    bool takesPdf = false;
    std::vector<std::string> sides;
    std::vector<std::string> colourModes;
    std::vector<std::string> media;
    int mostCopies = 1;
    /// Such as "media-empty"; empty where nothing is to be said.
    std::vector<std::string> reasons;
};

/// How a job is to be printed; what is empty is left to the printer.
struct PrintWishes {
    std::string sides;
    std::string colourMode;
    std::string media;
    int copies = 1;
};

struct PrinterJob {
    enum class State { Waiting, Printing, Printed, Cancelled, Aborted };

    int id = 0;
    std::string name;
    State state = State::Waiting;
    /// Whether the printer has ever begun with it.
    bool wasBegun = false;
    /// Whether it was made and nothing of a document has come, and none is coming.
    bool lacksDocument = false;

    bool isOver() const { return state == State::Cancelled || state == State::Aborted; }
};

/// The printer says that it does not want a document, now and later.
class PrinterRefusal : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The printer was given all of a document and has not said what it makes of it.
class PrinterSilence : public Base::Error {
public:
    using Error::Error;
};

/// facts() comes first: it connects. Each operation throws Error with one line where the printer cannot be
/// had or refuses. Used by one thread at a time.
class PrinterSession {
public:
    /// "ipp://HOST:PORT/PATH"
    /// What hangs is given up when the sign is raised.
    explicit PrinterSession(std::string uri, StopSign stop = {});
    ~PrinterSession();

    PrinterFacts facts();
    /// Those that it knows of, the oldest first.
    std::vector<PrinterJob> jobs();
    PrinterJob job(int id);
    void cancel(int id);
    /// A job without a document, which the printer does nothing with. Gives its number.
    int create(std::string const& name, PrintWishes const& wishes);
    /// Its only document. Where that fails, all of it may have arrived. Throws PrinterRefusal too.
    void send(int id, std::string_view pdf);

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

/// The name that printers have for a sheet of that size, in 1/100 mm; empty where there is none.
std::string mediaNamed(int width, int height);

} // namespace Carriers
