#pragma once
// Beginning a program again and again without linking it again: see serve_forks.cpp.

struct Arguments {
    int count;
    char** words;
};

/// The socket that FAULT_SERVER in the environment names; less than nothing without one.
int serverSocket();

/// Each request at the socket is a new process. Returns in that alone, with what its main() gets; the process
/// that it was called in ends when the other side closes.
Arguments serveForks(int socket, char* program);
