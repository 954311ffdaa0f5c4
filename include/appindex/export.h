// Marks what programs that link the library may use; everything else in it is hidden.
#pragma once

#define TEISEIGATRO_EXPORT __attribute__((visibility("default")))
