// Gridded data-file layer, dynamic data: what the time-step, positioning and
// statistics modules share. The cursor (next item, time steps done) lives in
// the header; the section state (1 after the header, 2 in the static items,
// 3 in the dynamic data) in the file's ownerMark.
#pragma once

#include <cstdint>
#include <optional>

#include "grd/grdextremes.h"
#include "grd/grdheader.h"
#include "rcf/rcf_internal.h"
#include "tova/grd.h"

inline constexpr const char* kModGrdTimeStep = "..\\grd\\grdtimestep";
inline constexpr const char* kModGrdPosition = "..\\grd\\grdposition";
inline constexpr const char* kModGrdItemStats = "..\\grd\\grditemstats";

// Section states kept in RcfFile::ownerMark.
inline constexpr uint32_t kSectionHeader = 1;
inline constexpr uint32_t kSectionStatic = 2;
inline constexpr uint32_t kSectionDynamic = 3;

// Whether the item's data are converted on read and write: a conversion mode
// of 1-3 on a float or double item.
bool grdItemDataConverts(const GrdItem* item) noexcept;
// Converts count values of the item's data type in place: toStored (write)
// from the caller's unit into the item's unit, else back (read). Delete
// values are left alone.
void grdConvertItemData(const GrdHeader* header, const GrdItem* item, void* data, int64_t count,
                        bool toStored) noexcept;
// One stored value in the caller's unit (statistics). The double delete value
// passes unchanged.
double grdConvertItemValue(const GrdHeader* header, const GrdItem* item, double value) noexcept;

// Reads the block that opens a time step and makes its time the header's
// current time (the stored time, or the step's index for the equidistant
// file types, as grdCallerTime gives it). 2010 for a block of another kind.
int32_t grdReadTimeStepBlock(GrdHeader* header, FileHandle file);
// A time as callers see it: with the modify-times switch on, the times of a
// non-equidistant axis count from its start.
double grdCallerTime(const GrdHeader* header, double time) noexcept;

// Statistics update of item itemNo (1-based) with its used elements as
// written (converted into the item's unit, gathered when compressed).
// Traced "grdCalcStatistics %d"; 2010 for an unknown statistics type (the
// global extremes are kept all the same).
// started, when not null, is the extremes pass over the same values begun by
// grdStartGlobalStatistics.
int32_t grdCalcStatistics(GrdHeader* header, int32_t itemNo, const void* values,
                          GrdExtremesBeside* started = nullptr);
// Begins the statistics' extremes pass over the n values of item about to be
// written, beside the write (see GrdExtremesBeside), when the header keeps
// global statistics only and the values are floats or doubles; else leaves
// pass empty and grdCalcStatistics does all the work. Meant for records of
// GrdExtremesBeside::kMinBytes and more.
void grdStartGlobalStatistics(const GrdHeader* header, const GrdItem* item, const void* values, int64_t n,
                              std::optional<GrdExtremesBeside>& pass);
