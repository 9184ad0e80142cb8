// Writes the manual pages of vlmail and what shells complete, while the project is built.
#include "programs/base/version.h"
#include "programs/manual/book.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/topics.h"

#include <exception>
#include <iostream>

int main(int argc, char** argv) {
    try {
        if (argc != 2)
            throw Base::UsageError("one folder is wanted");
        Manual::writeBook(argv[1], VlMail::commandInfo(), VlMail::topics(),
                          {"libVLService " + Base::projectVersion(), 1});
        return 0;
    } catch (std::exception const& failure) {
        std::cerr << argv[0] << ": " << failure.what() << '\n';
        return 1;
    }
}
