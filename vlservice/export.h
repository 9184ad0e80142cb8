#pragma once

/// Marks a class, function or object as part of the library's interface.
/// Everything else is hidden: both libraries are built with hidden visibility.
#define VLSERVICE_EXPORT __attribute__((visibility("default")))
