/// @file
/// How the headers mark what programs may use; everything else in the library is hidden.
#pragma once

/// Before a class or a function: the shared library exports it.
#define TEISEIGATRO_EXPORT __attribute__((visibility("default")))
