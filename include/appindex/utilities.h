/// @file
/// All of the library's utilities.
#pragma once

#include "appindex/utilities/credentials.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "appindex/utilities/lock_file.h"
#include "appindex/utilities/lock_mutex.h"
