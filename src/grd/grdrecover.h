// Gridded data-file layer: the walk over the time steps on disk that crash
// recovery and appending share. It passes over records without reading their
// values and trusts no count or length of the file.
#pragma once

#include <cstdint>

#include "grd/grdheader.h"
#include "tova/grd.h"

struct GrdStepWalk {
    uint32_t section = 1;  // 1 nothing after the header, 2 static items, 3 dynamic data
    int32_t complete = 0;  // complete time steps
    double firstTime = F_DELETE_VALUE_DOUBLE;    // of the complete steps (file type 4)
    double largestTime = F_DELETE_VALUE_DOUBLE;
    int64_t end = 0;     // offset after the last whole block or complete time step
    int64_t length = 0;  // of the file
    bool partial() const { return end < length; }
};

// Whether the time steps of a file type have a fixed layout the walk knows.
bool grdStepsWalkable(int32_t fileType);

// Brings the header's time axis in line with the walk: the number of time
// steps, for a non-equidistant axis its start (the first time) and span;
// also the cursor (time steps done) and the largest time written. Returns
// whether anything changed.
bool grdApplyStepWalk(GrdHeader* header, const GrdStepWalk& walk);

// Walks from the current position (after the header and the encoding keys):
// passes over the blocks before the dynamic data, then counts the complete
// time steps. The file is left at walk->end with no pending error. 0, or the
// status of a file damaged before its dynamic data (reported).
int32_t grdWalkTimeSteps(HeaderHandle header, FileHandle file, GrdStepWalk* walk);
