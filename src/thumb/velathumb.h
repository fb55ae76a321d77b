// The parts of the program itself. The main header of this folder.
#pragma once

#include "profiles/directory_job.h"
#include "storage/file_helpers.h"
#include "thumb/directory_pass.h"
#include "thumb/directory_walk.h"
#include "thumb/index_registration.h"
#include "thumb/phase_status.h"
#include "thumb/process_control.h"
