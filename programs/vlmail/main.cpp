#include "programs/vlmail/command.h"

#include <iostream>
#include <unistd.h>

int main(int argc, char** argv) {
    return VlMail::run(argc, argv, VlMail::Terminal{std::cout, std::cerr, ::isatty(STDERR_FILENO) == 1});
}
