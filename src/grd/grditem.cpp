// Gridded data-file layer, module grditem: items (identity, settings,
// reference coordinates, sizes and element counts, static associations,
// encoding keys) and their spatial axes (one setter/getter pair per axis
// kind, built on one generic setter and getter).
#include <cmath>
#include <cstring>
#include <limits>

#include "common/capi.h"
#include "grd/grdheader.h"
#include "grd/grdio.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdItem;
constexpr int64_t kInt32Max = std::numeric_limits<int32_t>::max();

// Reports code for an item (with its owner header) and returns it.
int32_t report(const GrdItem* item, int32_t code, int32_t line) {
    return grdReportError(item ? item->owner : nullptr, nullptr, 0, code, kModule, line);
}

// A value getter of an item: traced, the fallback for a null item.
template <class T, class Fn>
T getItemValue(const char* name, ItemHandle item, int32_t line, T fallback, Fn fn) {
    return grdTracedGet(name, item, grdCheckItem, kModule, line, fallback, fn);
}

// An operation on a checked item; fn returns a status.
template <class Fn, class... Args>
int32_t withItem(ItemHandle item, int32_t line, Fn fn, const char* format, Args... args) {
    return grdTracedDo(item, grdCheckItem, kModule, line, fn, format, args...);
}

// An operation on item itemNo of a checked header.
template <class Fn, class... Args>
int32_t withItemNo(HeaderHandle header, int32_t itemNo, int32_t line, Fn fn, const char* format, Args... args) {
    GrdApiTrace trace(format, args...);
    const int32_t status = grdCheckHeaderItemNo(header, itemNo, kModule, line);
    return trace.done(status != F_NO_ERROR ? status : fn(header, &header->items[itemNo - 1]));
}

// ---- Unit conversion of axis values and reference coordinates --------------------

enum class Direction {
    RefSet,   // caller -> stored, reference coordinates
    AxisSet,  // caller -> stored, axis values (mode 3 converts from the base unit)
    Get       // stored -> caller, both
};

double convertValue(const GrdItem* item, double value, Direction dir) {
    const int32_t geometry = grdAxisGeometryType(item->axisType);
    const int32_t axisUnit = item->axisUnit;
    double out = value;  // the unit library leaves it untouched on failure
    switch (item->axisConvMode) {
        case 1:
            if (dir == Direction::Get) qtyConvertToUserUnit(geometry, axisUnit, value, &out);
            else qtyConvertFromUserUnit(geometry, axisUnit, value, &out);
            break;
        case 2:
            if (dir == Direction::Get) qtyConvertUnit(axisUnit, value, item->axisConvUnit, &out);
            else qtyConvertUnit(item->axisConvUnit, value, axisUnit, &out);
            break;
        case 3:
            if (dir == Direction::AxisSet) qtyConvertUnit(grdBaseUnit(geometry), value, axisUnit, &out);
            else qtyConvertUnit(axisUnit, value, grdBaseUnit(geometry), &out);
            break;
        default:
            break;
    }
    return out;
}

float convertFloat(const GrdItem* item, float value, Direction dir) {
    return static_cast<float>(convertValue(item, value, dir));
}

// Converts a coordinate array in place (set: into the stored unit; get: out
// of it).
void convertArray(const GrdItem* item, double* array, int64_t count, bool toStored) {
    if (array == nullptr || count <= 0 || count > kInt32Max) return;
    const int32_t n = static_cast<int32_t>(count);
    const int32_t geometry = grdAxisGeometryType(item->axisType);
    const int32_t axisUnit = item->axisUnit;
    const double del = item->owner ? item->owner->deleteValDouble : F_DELETE_VALUE_DOUBLE;
    switch (item->axisConvMode) {
        case 1:
            if (toStored) qtyConvertItemArrayFromUserUnitD(geometry, axisUnit, array, n, del);
            else qtyConvertItemArrayToUserUnitD(geometry, axisUnit, array, n, del);
            break;
        case 2:
            if (toStored) qtyConvertItemArrayD(item->axisConvUnit, axisUnit, array, n, del);
            else qtyConvertItemArrayD(axisUnit, item->axisConvUnit, array, n, del);
            break;
        case 3:
            if (toStored) qtyConvertItemArrayD(grdBaseUnit(geometry), axisUnit, array, n, del);
            else qtyConvertItemArrayD(axisUnit, grdBaseUnit(geometry), array, n, del);
            break;
        default:
            break;
    }
}

// ---- Item info -------------------------------------------------------------------

// The common part of the info setters. unitText is used when byText is set.
int32_t assignItemInfo(HeaderHandle header, GrdItem* item, int32_t itemType, const char* name, int32_t unit,
                       const char* unitText, bool byText, int32_t dataType, int32_t axisType, int32_t line) {
    int32_t status = grdCheckItem(item, kModule, line);
    if (status == F_NO_ERROR) status = grdCheckHeader(header, kModule, line);
    if (status != F_NO_ERROR) return status;
    if (!byText && !qtyItemUnitEqv(itemType, unit)) return grdReportError(header, nullptr, 0, F_ERR_UNIT, kModule, line);
    if (axisType >= F_CURVE_LINEAR_AXIS_D2)
        return grdReportError(header, nullptr, 0, F_ERR_DATA_TYPE, kModule, line);

    grdItemReset(item);
    if (!item->name.assign(name ? name : "") || (byText && !item->unitText.assign(unitText))) {
        item->name.reset();
        item->unitText.reset();
        status = grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, line);
    }
    item->unit = byText ? 0 : unit;
    item->itemType = itemType;
    item->dataType = dataType;
    item->axisType = axisType;
    item->owner = header;
    ++header->layoutSerial;
    if (!item->isStatic) {
        const int32_t stats = grdItemInitStatistics(header, item, kModule, line);
        if (status == F_NO_ERROR) status = stats;
    }
    return status;
}

// ---- Sizes -------------------------------------------------------------------------

// A count for the 32-bit interface: 0 with 2010 reported when it has none or
// does not fit.
int32_t reportedCount(const GrdItem* item, int64_t count, int32_t line) {
    if (count < 0 || count > kInt32Max) return report(item, F_ERR_VALUE, line), 0;
    return static_cast<int32_t>(count);
}

int32_t bytesOf(const GrdItem* item, int64_t count, int32_t line) {
    const int32_t n = reportedCount(item, count, line);
    const int64_t bytes = int64_t{n} * grdSimpleTypeSize(item->dataType);
    return reportedCount(item, bytes, line);
}

// ---- Axes -------------------------------------------------------------------------------

// Number of directions of an axis kind (the sizes it takes).
int32_t axisDirections(int32_t axisType) {
    switch (axisType) {
        case F_EQ_AXIS_D0:
            return 0;
        case F_EQ_AXIS_D1:
        case F_NEQ_AXIS_D1:
        case F_TVAR_AXIS_D1:
            return 1;
        case F_EQ_AXIS_D2:
        case F_NEQ_AXIS_D2:
        case F_TVAR_AXIS_D2:
        case F_CURVE_LINEAR_AXIS_D2:
            return 2;
        case F_EQ_AXIS_D3:
        case F_NEQ_AXIS_D3:
        case F_TVAR_AXIS_D3:
        case F_CURVE_LINEAR_AXIS_D3:
            return 3;
        case F_EQ_AXIS_D4:
            return 4;
        default:
            return -1;
    }
}

// Values held by coordinate array d of an axis with the given sizes: size + 1
// boundaries (non-equidistant), or one per node (curvilinear). Saturates far
// above the 32-bit range.
int64_t coordinateCount(int32_t axisType, const int32_t* sizes, int32_t d) {
    const int32_t dirs = axisDirections(axisType);
    switch (grdAxisFamily(axisType)) {
        case GrdAxisFamily::NonEquidistant:
            return int64_t{sizes[d]} + 1;
        case GrdAxisFamily::CurveLinear: {
            int64_t nodes = 1;
            for (int32_t i = 0; i < dirs; ++i) {
                nodes *= int64_t{sizes[i]} + 1;  // each factor <= 2^31: no overflow before the check
                if (nodes > kInt32Max) return kInt32Max + 1;
            }
            return nodes;
        }
        default:
            return 0;
    }
}

bool hasCoordinates(int32_t axisType) {
    const GrdAxisFamily f = grdAxisFamily(axisType);
    return f == GrdAxisFamily::NonEquidistant || f == GrdAxisFamily::CurveLinear;
}

bool fileTypeAllows(int32_t fileType, int32_t axisType) {
    if (grdAxisFamily(axisType) == GrdAxisFamily::TimeVarying)
        return fileType == F_EQTIME_TVARSPACE_ALLITEMS || fileType == F_NEQTIME_TVARSPACE_VARITEMS;
    return fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS ||
           fileType == F_NEQTIME_FIXEDSPACE_VARITEMS;
}

// What an axis setter was given: the sizes, origins and steps or coordinate
// arrays of its directions (unused entries are ignored).
struct AxisIn {
    int32_t sizes[4] = {0, 0, 0, 0};
    float origins[4] = {0, 0, 0, 0};
    float steps[4] = {0, 0, 0, 0};
    const double* arrays[3] = {nullptr, nullptr, nullptr};
};

// Checks the arguments of an axis setter (a static item skips the file-type
// and value checks; negative sizes and counts beyond the 32-bit interfaces
// are refused for every item).
int32_t checkAxisArguments(GrdItem* item, int32_t axisType, const AxisIn& in, int32_t line) {
    const GrdHeader* header = item->owner;
    const int32_t dirs = axisDirections(axisType);
    const GrdAxisFamily family = grdAxisFamily(axisType);
    for (int32_t d = 0; d < dirs; ++d)
        if (in.sizes[d] < 0) return report(item, F_ERR_ARGUMENT, line);
    if (!item->isStatic) {
        if (!fileTypeAllows(header->fileType, axisType)) return report(item, F_ERR_VALUE, line);
        for (int32_t d = 0; d < dirs; ++d) {
            if (in.sizes[d] < 1) return report(item, F_ERR_ARGUMENT, line);
            if (family == GrdAxisFamily::Equidistant && !(in.steps[d] > 0.0f))
                return report(item, F_ERR_ARGUMENT, line);
            if (hasCoordinates(axisType) && d < 3 && in.arrays[d] == nullptr)
                return report(item, F_ERR_ARGUMENT, line);
        }
    }
    GrdItem probe;
    probe.axisType = axisType;
    for (int32_t d = 0; d < dirs; ++d) probe.size[d] = in.sizes[d];
    if (grdItemFullElements(&probe) > kInt32Max) return report(item, F_ERR_VALUE, line);
    if (hasCoordinates(axisType))
        for (int32_t d = 0; d < dirs; ++d)
            if (coordinateCount(axisType, in.sizes, d) > kInt32Max) return report(item, F_ERR_VALUE, line);
    return F_NO_ERROR;
}

// The generic axis setter.
int32_t setAxis(ItemHandle item, int32_t axisType, int32_t unit, const AxisIn& in, const GrdApiTrace& trace,
                int32_t line) {
    int32_t status = grdCheckItem(item, kModule, line);
    if (status != F_NO_ERROR) return status;
    if (item->owner == nullptr) return report(item, F_ERR_ARGUMENT, line);
    status = checkAxisArguments(item, axisType, in, line);
    if (status != F_NO_ERROR) return status;

    // Copy the arrays before anything changes: when memory fails the item
    // keeps its previous axis.
    const int32_t dirs = axisDirections(axisType);
    GrdArray<double> copies[3];
    if (hasCoordinates(axisType)) {
        for (int32_t d = 0; d < dirs; ++d) {
            if (in.arrays[d] == nullptr) continue;  // a static item may leave a direction out
            const int64_t count = coordinateCount(axisType, in.sizes, d);
            trace.print("Reassign %d %d", static_cast<int32_t>(count), 8);
            copies[d] = grdAllocArray<double>(count);
            if (!copies[d]) return report(item, F_ERR_MEMORY, line);
            std::memcpy(copies[d].get(), in.arrays[d], static_cast<size_t>(count) * sizeof(double));
        }
    }

    int64_t before = item->axisType == F_UNDEFINED_AXIS ? 0 : grdItemElementCount(item);
    item->axisType = axisType;
    item->axisUnit = unit;
    if (item->owner != nullptr) ++item->owner->layoutSerial;
    for (int32_t d = 0; d < 4; ++d) {
        item->size[d] = d < dirs ? in.sizes[d] : 0;
        item->origin[d] = 0.0f;
        item->step[d] = 0.0f;
    }
    for (int32_t d = 0; d < 3; ++d) item->coords[d] = std::move(copies[d]);
    item->diskPoints.reset();  // the points read from a file belonged to the old axis
    item->diskPointCount = 0;
    if (grdAxisFamily(axisType) == GrdAxisFamily::Equidistant) {
        for (int32_t d = 0; d < dirs; ++d) {
            item->origin[d] = convertFloat(item, in.origins[d], Direction::AxisSet);
            item->step[d] = convertFloat(item, in.steps[d], Direction::AxisSet);
        }
    }
    for (int32_t d = 0; d < dirs && d < 3; ++d)
        convertArray(item, item->coords[d].get(), coordinateCount(axisType, item->size, d), true);

    if (!item->isStatic && grdItemElementCount(item) != (before < 0 ? 0 : before))
        status = grdItemInitStatistics(item->owner, item, kModule, line);
    return status;
}

// Out arguments of an axis getter.
struct AxisOut {
    int32_t* sizes[4] = {nullptr, nullptr, nullptr, nullptr};
    float* origins[4] = {nullptr, nullptr, nullptr, nullptr};
    float* steps[4] = {nullptr, nullptr, nullptr, nullptr};
    const double** arrays[3] = {nullptr, nullptr, nullptr};
};

// The generic axis getter. Coordinate arrays are converted in place.
int32_t getAxis(ItemHandle item, int32_t axisType, int32_t* unit, const char** unitText, const AxisOut& out,
                int32_t line) {
    const int32_t status = grdCheckItem(item, kModule, line);
    if (status != F_NO_ERROR) return status;
    if (item->axisType != axisType) return report(item, F_ERR_ARGUMENT, line);
    if (unit) *unit = item->axisUnit;
    if (unitText) {
        const char* text = nullptr;
        *unitText = qtyGetUnitKey(item->axisUnit, &text) && text ? text : "";
    }
    const int32_t dirs = axisDirections(axisType);
    for (int32_t d = 0; d < dirs; ++d) {
        if (out.sizes[d]) *out.sizes[d] = item->size[d];
        if (out.origins[d]) *out.origins[d] = convertFloat(item, item->origin[d], Direction::Get);
        if (out.steps[d]) *out.steps[d] = convertFloat(item, item->step[d], Direction::Get);
    }
    for (int32_t d = 0; d < dirs && d < 3; ++d) {
        if (!hasCoordinates(axisType)) break;
        convertArray(item, item->coords[d].get(), coordinateCount(axisType, item->size, d), false);
        if (out.arrays[d]) *out.arrays[d] = item->coords[d].get();
    }
    return F_NO_ERROR;
}

}  // namespace

extern "C" {

// ---- Item access ---------------------------------------------------------------------

int32_t TOVA_CALL grdGetNoOfItems(HeaderHandle header) {
    return grdTracedGet("grdGetNoOfItems", header, grdCheckHeader, kModule, __LINE__, 0,
                        [](HeaderHandle h) { return h->noOfItems; });
}

ItemHandle TOVA_CALL grdItemD(HeaderHandle header, int32_t itemNo) {
    GrdApiTrace trace("grdItemD %d", itemNo);
    if (trace.done(grdCheckHeaderItemNo(header, itemNo, kModule, __LINE__)) != F_NO_ERROR) return nullptr;
    return grdHeaderItem(header, itemNo);
}

ItemHandle TOVA_CALL grdItemS(ItemHandle staticItem) {
    GrdApiTrace trace("grdItemS");
    if (trace.done(grdCheckVector(staticItem, kModule, __LINE__)) != F_NO_ERROR) return nullptr;
    return staticItem;
}

// ---- Identity ---------------------------------------------------------------------------

int32_t TOVA_CALL grdSetItemInfo(HeaderHandle header, ItemHandle item, int32_t itemType, const char* name,
                                 int32_t unit, int32_t dataType) {
    GrdApiTrace trace("grdSetItemInfo %d <%s> %d %d", itemType, grdTraceText(name), unit, dataType);
    return trace.done(
        assignItemInfo(header, item, itemType, name, unit, nullptr, false, dataType, F_EQ_AXIS_D0, __LINE__));
}

int32_t TOVA_CALL grdSetItemInfo_(HeaderHandle header, ItemHandle item, int32_t itemType, const char* name,
                                  const char* unitText, int32_t dataType) {
    GrdApiTrace trace("grdSetItemInfo_ %d <%s> <%s> %d", itemType, grdTraceText(name), grdTraceText(unitText),
                      dataType);
    return trace.done(
        assignItemInfo(header, item, itemType, name, 0, unitText, true, dataType, F_EQ_AXIS_D0, __LINE__));
}

int32_t TOVA_CALL grdUpdateItemInfo(HeaderHandle header, ItemHandle item, int32_t itemType, const char* name,
                                    int32_t unit) {
    GrdApiTrace trace("grdUpdateItemInfo %d <%s> %d", itemType, grdTraceText(name), unit);
    int32_t status = grdCheckItem(item, kModule, __LINE__);
    if (status == F_NO_ERROR) status = grdCheckHeader(header, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    if (!qtyItemUnitEqv(itemType, unit))
        return trace.done(grdReportError(header, nullptr, 0, F_ERR_UNIT, kModule, __LINE__));
    // The item is on disk already: its name keeps the stored length.
    item->name.overwriteKeepLength(name);
    item->itemType = itemType;
    item->unit = unit;
    item->unitText.reset();
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdGetItemInfo(ItemHandle item, int32_t* itemType, const char** itemTypeText, const char** name,
                                 int32_t* unit, const char** unitText, int32_t* dataType) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            if (itemType) *itemType = it->itemType;
            if (itemTypeText) {
                const char* text = nullptr;
                *itemTypeText = qtyGetItemTypeKey(it->itemType, &text) && text ? text : "";
            }
            if (name) *name = it->name.orEmpty();
            if (unit) *unit = it->unit;
            if (unitText) *unitText = grdUnitText(it->unit, it->unitText, unit);
            if (dataType) *dataType = it->dataType;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetItemInfo");
}

int32_t TOVA_CALL grdGetItemInfo_(ItemHandle item, int32_t* itemType, const char** name, const char** unitText,
                                  int32_t* dataType) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            if (itemType) *itemType = it->itemType;
            if (name) *name = it->name.get();
            if (unitText) *unitText = it->unitText.get();
            if (dataType) *dataType = it->dataType;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetItemInfo_");
}

// ---- Settings stored unchanged ---------------------------------------------------------------

int32_t TOVA_CALL grdSetItemValueType(ItemHandle item, int32_t valueType) {
    return withItem(
        item, __LINE__, [&](GrdItem* it) { return it->valueType = valueType, F_NO_ERROR; },
        "grdSetItemValueType %d", valueType);
}

int32_t TOVA_CALL grdGetItemValueType(ItemHandle item, int32_t* valueType) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            if (valueType == nullptr) return report(it, F_ERR_ARGUMENT, __LINE__);
            *valueType = it->valueType;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetItemValueType");
}

int32_t TOVA_CALL grdSetItemUnitConversion(ItemHandle item, int32_t mode, int32_t unit) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            it->itemConvMode = mode;
            it->itemConvUnit = unit;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdSetItemUnitConversion %d %d", mode, unit);
}

int32_t TOVA_CALL grdGetItemUnitConversion(ItemHandle item, int32_t* mode, int32_t* unit) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            if (mode) *mode = it->itemConvMode;
            if (unit) *unit = it->itemConvUnit;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetItemUnitConversion");
}

int32_t TOVA_CALL grdSetItemAxisUnitConversion(ItemHandle item, int32_t mode, int32_t unit) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            it->axisConvMode = mode;
            it->axisConvUnit = unit;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdSetItemAxisUnitConversion %d %d", mode, unit);
}

int32_t TOVA_CALL grdGetItemAxisUnitConversion(ItemHandle item, int32_t* mode, int32_t* unit) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            if (mode) *mode = it->axisConvMode;
            if (unit) *unit = it->axisConvUnit;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetItemAxisUnitConversion");
}

int32_t TOVA_CALL grdSetItemAxisOrientation(ItemHandle item, float alpha, float phi, float theta) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            it->alpha = alpha;
            it->phi = phi;
            it->theta = theta;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdSetItemAxisOrientation %g %g %g", static_cast<double>(alpha), static_cast<double>(phi),
        static_cast<double>(theta));
}

// Gives three floats of an item, or -1e-35 in each for a null item.
int32_t TOVA_CALL grdGetItemAxisOrientation(ItemHandle item, float* alpha, float* phi, float* theta) {
    GrdApiTrace trace("grdGetItemAxisOrigin");  // its historical trace name
    const int32_t status = grdCheckItem(item, kModule, __LINE__);
    const bool ok = status == F_NO_ERROR;
    if (alpha) *alpha = ok ? item->alpha : F_DELETE_VALUE_FLOAT;
    if (phi) *phi = ok ? item->phi : F_DELETE_VALUE_FLOAT;
    if (theta) *theta = ok ? item->theta : F_DELETE_VALUE_FLOAT;
    return trace.done(status);
}

int32_t TOVA_CALL grdSetItemRefCoords(ItemHandle item, float x, float y, float z) {
    return withItem(
        item, __LINE__,
        [&](GrdItem* it) {
            it->refX = convertFloat(it, x, Direction::RefSet);
            it->refY = convertFloat(it, y, Direction::RefSet);
            it->refZ = convertFloat(it, z, Direction::RefSet);
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdSetItemRefCoords %g %g %g", static_cast<double>(x), static_cast<double>(y), static_cast<double>(z));
}

int32_t TOVA_CALL grdGetItemRefCoords(ItemHandle item, float* x, float* y, float* z) {
    GrdApiTrace trace("grdGetItemRefCoords");
    const int32_t status = grdCheckItem(item, kModule, __LINE__);
    const bool ok = status == F_NO_ERROR;
    if (x) *x = ok ? convertFloat(item, item->refX, Direction::Get) : F_DELETE_VALUE_FLOAT;
    if (y) *y = ok ? convertFloat(item, item->refY, Direction::Get) : F_DELETE_VALUE_FLOAT;
    if (z) *z = ok ? convertFloat(item, item->refZ, Direction::Get) : F_DELETE_VALUE_FLOAT;
    return trace.done(status);
}

// ---- Geometry, sizes, element counts -----------------------------------------------------------

int32_t TOVA_CALL grdGetItemGeometryType(ItemHandle item) {
    return getItemValue("grdGetItemGeometryType", item, __LINE__, 0,
                        [](GrdItem* it) { return grdAxisGeometryType(it->axisType); });
}

int32_t TOVA_CALL grdGetItemGeometryUnit(ItemHandle item) {
    return getItemValue("grdGetItemGeometryUnit", item, __LINE__, 0, [](GrdItem* it) {
        return it->axisType >= F_EQ_AXIS_D0 && it->axisType <= F_CURVE_LINEAR_AXIS_D3 ? it->axisUnit : 0;
    });
}

int32_t TOVA_CALL grdGetItemDim(ItemHandle item) {
    return getItemValue("grdGetItemDim", item, __LINE__, -1, [](GrdItem* it) {
        // Curvilinear axes report -1 on purpose.
        const GrdAxisFamily f = grdAxisFamily(it->axisType);
        return f == GrdAxisFamily::Undefined || f == GrdAxisFamily::CurveLinear ? -1 : axisDirections(it->axisType);
    });
}

int32_t TOVA_CALL grdGetItemXSize(ItemHandle item) {
    return getItemValue("grdGetItemXSize", item, __LINE__, 0, [](GrdItem* it) {
        if (it->axisType == F_EQ_AXIS_D0) return 1;
        if (it->axisType < F_EQ_AXIS_D1 || it->axisType > F_CURVE_LINEAR_AXIS_D3) return reportedCount(it, -1, __LINE__);
        return reportedCount(it, it->size[0], __LINE__);
    });
}

int32_t TOVA_CALL grdGetItemXYSize(ItemHandle item) {
    return getItemValue("grdGetItemXYSize", item, __LINE__, 0, [](GrdItem* it) {
        switch (it->axisType) {
            case F_EQ_AXIS_D0:
            case F_EQ_AXIS_D1:
                return 1;
            case F_NEQ_AXIS_D1:  // refused while EqD1 is accepted: the required behaviour
            case F_TVAR_AXIS_D1:
                return reportedCount(it, -1, __LINE__);
            default:
                if (it->axisType < F_EQ_AXIS_D2 || it->axisType > F_CURVE_LINEAR_AXIS_D3)
                    return reportedCount(it, -1, __LINE__);
                if (it->size[0] < 0 || it->size[1] < 0) return reportedCount(it, -1, __LINE__);
                return reportedCount(it, int64_t{it->size[0]} * it->size[1], __LINE__);
        }
    });
}

int32_t TOVA_CALL grdGetItemXYZSize(ItemHandle item) {
    return getItemValue("grdGetItemXYZSize", item, __LINE__, 0,
                        [](GrdItem* it) { return reportedCount(it, grdItemFullElements(it), __LINE__); });
}

int32_t TOVA_CALL grdGetItemElements(ItemHandle item) {
    return getItemValue("grdGetItemElements", item, __LINE__, 0,
                        [](GrdItem* it) { return reportedCount(it, grdItemElementCount(it), __LINE__); });
}

int32_t TOVA_CALL grdGetUsedItemElements(ItemHandle item) {
    return getItemValue("grdGetUsedItemElements", item, __LINE__, 0,
                        [](GrdItem* it) { return reportedCount(it, grdItemUsedElementCount(it), __LINE__); });
}

int32_t TOVA_CALL grdGetItemBytes(ItemHandle item) {
    return getItemValue("grdGetItemBytes", item, __LINE__, 0,
                        [](GrdItem* it) { return bytesOf(it, grdItemElementCount(it), __LINE__); });
}

int32_t TOVA_CALL grdGetUsedItemBytes(ItemHandle item) {
    return getItemValue("grdGetUsedItemBytes", item, __LINE__, 0,
                        [](GrdItem* it) { return bytesOf(it, grdItemUsedElementCount(it), __LINE__); });
}

// ---- Static associations -------------------------------------------------------------------------

int32_t TOVA_CALL grdSetAssocStatic(HeaderHandle header, int32_t itemNo, int32_t staticNo) {
    return withItemNo(
        header, itemNo, __LINE__,
        [&](HeaderHandle h, GrdItem* it) {
            if (staticNo < 1) return grdReportError(h, nullptr, 0, F_ERR_ITEMNO, kModule, __LINE__);
            const int32_t status = tova::guarded([&] {
                it->assocStatic.push_back(staticNo);
                return static_cast<int32_t>(F_NO_ERROR);
            });
            return status == F_NO_ERROR ? status : grdReportError(h, nullptr, 0, status, kModule, __LINE__);
        },
        "grdSetAssocStatic %d %d", itemNo, staticNo);
}

int32_t TOVA_CALL grdGetNoAssocStatic(HeaderHandle header, int32_t itemNo) {
    int32_t count = 0;
    withItemNo(
        header, itemNo, __LINE__,
        [&](HeaderHandle, GrdItem* it) {
            count = static_cast<int32_t>(it->assocStatic.size());
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetNoAssocStatic %d", itemNo);
    return count;
}

int32_t TOVA_CALL grdGetAssocStatic(HeaderHandle header, int32_t itemNo, int32_t index, int32_t* staticNo) {
    return withItemNo(
        header, itemNo, __LINE__,
        [&](HeaderHandle h, GrdItem* it) {
            if (index < 1) return grdReportError(h, nullptr, 0, F_ERR_ITEMNO, kModule, __LINE__);
            if (staticNo) *staticNo = static_cast<size_t>(index) <= it->assocStatic.size() ? it->assocStatic[index - 1] : 0;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetAssocStatic %d %d", itemNo, index);
}

// ---- Encoding keys ---------------------------------------------------------------------------------

int32_t TOVA_CALL grdSetEncodeKey(HeaderHandle header, const int32_t* xKey, const int32_t* yKey,
                                  const int32_t* zKey, int32_t length) {
    GrdApiTrace trace("grdSetEncodeKey %d", length);
    const int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    if (length < 0) return trace.done(grdReportError(header, nullptr, 0, F_ERR_VALUE, kModule, __LINE__));
    const int32_t* given[3] = {xKey, yKey, zKey};
    GrdArray<int32_t> copies[3];
    for (int k = 0; k < 3; ++k) {
        if (given[k] == nullptr) continue;
        copies[k] = grdAllocArray<int32_t>(length);
        if (!copies[k]) return trace.done(grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__));
        if (length > 0) std::memcpy(copies[k].get(), given[k], static_cast<size_t>(length) * sizeof(int32_t));
    }
    header->keyX = std::move(copies[0]);
    header->keyY = std::move(copies[1]);
    header->keyZ = std::move(copies[2]);
    header->keyLength = length;
    header->fileCompressed = 1;
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdGetEncodeKey(HeaderHandle header, int32_t* xKey, int32_t* yKey, int32_t* zKey) {
    GrdApiTrace trace("grdGetEncodeKey");
    const int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status != F_NO_ERROR || header->keyLength < 1) return trace.done(status);
    const size_t bytes = static_cast<size_t>(header->keyLength) * sizeof(int32_t);
    if (xKey && header->keyX) std::memcpy(xKey, header->keyX.get(), bytes);
    if (yKey && header->keyY) std::memcpy(yKey, header->keyY.get(), bytes);
    if (zKey && header->keyZ) std::memcpy(zKey, header->keyZ.get(), bytes);
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdGetEncodeKeySize(HeaderHandle header) {
    return grdTracedGet("grdGetEncodeKeySize", header, grdCheckHeader, kModule, __LINE__, 0,
                        [](HeaderHandle h) { return h->keyLength; });
}

int32_t TOVA_CALL grdIsFileCompressed(HeaderHandle header) {
    return grdTracedGet("grdIsFileCompressed", header, grdCheckHeader, kModule, __LINE__, 0,
                        [](HeaderHandle h) { return h->fileCompressed; });
}

HeaderHandle TOVA_CALL grdItemEnableCompression(HeaderHandle header) {
    GrdApiTrace trace("grdItemEnableCompression");
    if (header != nullptr) header->itemCompressionEnabled = 1;  // a null header is ignored
    return header;
}

int32_t TOVA_CALL grdIsItemCompressed(ItemHandle item, int32_t* length) {
    GrdApiTrace trace("grdIsItemCompressed");
    if (length) *length = 0;
    const int32_t status = grdCheckItem(item, kModule, __LINE__);
    if (status == F_NO_ERROR && length && item->owner && item->owner->keyX && item->owner->keyY)
        *length = item->owner->keyLength;
    return trace.done(status);
}

// ---- Axes --------------------------------------------------------------------------------------------

int32_t TOVA_CALL grdGetItemAxisType(ItemHandle item) {
    return getItemValue("grdGetItemAxisType", item, __LINE__, 0, [](GrdItem* it) { return it->axisType; });
}

int32_t TOVA_CALL grdSetItemAxisEqD0(ItemHandle item, int32_t unit) {
    GrdApiTrace trace("grdSetItemAxisEqD0 %d", unit);
    return trace.done(setAxis(item, F_EQ_AXIS_D0, unit, AxisIn{}, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisEqD0(ItemHandle item, int32_t* unit, const char** unitText) {
    GrdApiTrace trace("grdGetItemAxisEqD0");
    return trace.done(getAxis(item, F_EQ_AXIS_D0, unit, unitText, AxisOut{}, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisEqD1(ItemHandle item, int32_t unit, int32_t xSize, float x0, float dx) {
    GrdApiTrace trace("grdSetItemAxisEqD1 %d %d %g %g", unit, xSize, double{x0}, double{dx});
    const AxisIn in{{xSize}, {x0}, {dx}, {}};
    return trace.done(setAxis(item, F_EQ_AXIS_D1, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisEqD1(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                     float* x0, float* dx) {
    GrdApiTrace trace("grdGetItemAxisEqD1");
    const AxisOut out{{xSize}, {x0}, {dx}, {}};
    return trace.done(getAxis(item, F_EQ_AXIS_D1, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisEqD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize, float x0,
                                     float y0, float dx, float dy) {
    GrdApiTrace trace("grdSetItemAxisEqD2 %d %d %d %g %g %g %g", unit, xSize, ySize, double{x0}, double{y0},
                      double{dx}, double{dy});
    const AxisIn in{{xSize, ySize}, {x0, y0}, {dx, dy}, {}};
    return trace.done(setAxis(item, F_EQ_AXIS_D2, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisEqD2(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                     int32_t* ySize, float* x0, float* y0, float* dx, float* dy) {
    GrdApiTrace trace("grdGetItemAxisEqD2");
    const AxisOut out{{xSize, ySize}, {x0, y0}, {dx, dy}, {}};
    return trace.done(getAxis(item, F_EQ_AXIS_D2, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisEqD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize, int32_t zSize,
                                     float x0, float y0, float z0, float dx, float dy, float dz) {
    GrdApiTrace trace("grdSetItemAxisEqD3 %d %d %d %d", unit, xSize, ySize, zSize);
    const AxisIn in{{xSize, ySize, zSize}, {x0, y0, z0}, {dx, dy, dz}, {}};
    return trace.done(setAxis(item, F_EQ_AXIS_D3, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisEqD3(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                     int32_t* ySize, int32_t* zSize, float* x0, float* y0, float* z0, float* dx,
                                     float* dy, float* dz) {
    GrdApiTrace trace("grdGetItemAxisEqD3");
    const AxisOut out{{xSize, ySize, zSize}, {x0, y0, z0}, {dx, dy, dz}, {}};
    return trace.done(getAxis(item, F_EQ_AXIS_D3, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisEqD4(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize, int32_t zSize,
                                     int32_t tSize, float x0, float y0, float z0, float t0, float dx, float dy,
                                     float dz, float dt) {
    GrdApiTrace trace("grdSetItemAxisEqD4 %d %d %d %d %d", unit, xSize, ySize, zSize, tSize);
    const AxisIn in{{xSize, ySize, zSize, tSize}, {x0, y0, z0, t0}, {dx, dy, dz, dt}, {}};
    return trace.done(setAxis(item, F_EQ_AXIS_D4, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisEqD4(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                     int32_t* ySize, int32_t* zSize, int32_t* tSize, float* x0, float* y0,
                                     float* z0, float* t0, float* dx, float* dy, float* dz, float* dt) {
    GrdApiTrace trace("grdGetItemAxisEqD4");
    const AxisOut out{{xSize, ySize, zSize, tSize}, {x0, y0, z0, t0}, {dx, dy, dz, dt}, {}};
    return trace.done(getAxis(item, F_EQ_AXIS_D4, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisNeqD1(ItemHandle item, int32_t unit, int32_t xSize, const double* xCoords,
                                      int32_t /*unused*/) {
    GrdApiTrace trace("grdSetItemAxisNeqD1 %d %d", unit, xSize);
    const AxisIn in{{xSize}, {}, {}, {xCoords}};
    return trace.done(setAxis(item, F_NEQ_AXIS_D1, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisNeqD1(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                      const double** xCoords) {
    GrdApiTrace trace("grdGetItemAxisNeqD1");
    const AxisOut out{{xSize}, {}, {}, {xCoords}};
    return trace.done(getAxis(item, F_NEQ_AXIS_D1, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisNeqD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                      const double* xCoords, const double* yCoords, int32_t /*unused*/) {
    GrdApiTrace trace("grdSetItemAxisNeqD2 %d %d %d", unit, xSize, ySize);
    const AxisIn in{{xSize, ySize}, {}, {}, {xCoords, yCoords}};
    return trace.done(setAxis(item, F_NEQ_AXIS_D2, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisNeqD2(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                      int32_t* ySize, const double** xCoords, const double** yCoords) {
    GrdApiTrace trace("grdGetItemAxisNeqD2");
    const AxisOut out{{xSize, ySize}, {}, {}, {xCoords, yCoords}};
    return trace.done(getAxis(item, F_NEQ_AXIS_D2, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisNeqD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize, int32_t zSize,
                                      const double* xCoords, const double* yCoords, const double* zCoords,
                                      int32_t /*unused*/) {
    GrdApiTrace trace("grdSetItemAxisNeqD3 %d %d %d %d", unit, xSize, ySize, zSize);
    const AxisIn in{{xSize, ySize, zSize}, {}, {}, {xCoords, yCoords, zCoords}};
    return trace.done(setAxis(item, F_NEQ_AXIS_D3, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisNeqD3(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                      int32_t* ySize, int32_t* zSize, const double** xCoords,
                                      const double** yCoords, const double** zCoords) {
    GrdApiTrace trace("grdGetItemAxisNeqD3");
    const AxisOut out{{xSize, ySize, zSize}, {}, {}, {xCoords, yCoords, zCoords}};
    return trace.done(getAxis(item, F_NEQ_AXIS_D3, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisCurveLinearD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                              const double* xNodes, const double* yNodes, int32_t /*unused*/) {
    GrdApiTrace trace("grdSetItemAxisCurveLinearD2 %d %d %d", unit, xSize, ySize);
    const AxisIn in{{xSize, ySize}, {}, {}, {xNodes, yNodes}};
    return trace.done(setAxis(item, F_CURVE_LINEAR_AXIS_D2, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisCurveLinearD2(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, int32_t* ySize, const double** xNodes,
                                              const double** yNodes) {
    GrdApiTrace trace("grdGetItemAxisCurveLinearD2");
    const AxisOut out{{xSize, ySize}, {}, {}, {xNodes, yNodes}};
    return trace.done(getAxis(item, F_CURVE_LINEAR_AXIS_D2, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisCurveLinearD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                              int32_t zSize, const double* xNodes, const double* yNodes,
                                              const double* zNodes, int32_t /*unused*/) {
    GrdApiTrace trace("grdSetItemAxisCurveLinearD3 %d %d %d %d", unit, xSize, ySize, zSize);
    const AxisIn in{{xSize, ySize, zSize}, {}, {}, {xNodes, yNodes, zNodes}};
    return trace.done(setAxis(item, F_CURVE_LINEAR_AXIS_D3, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisCurveLinearD3(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, int32_t* ySize, int32_t* zSize, const double** xNodes,
                                              const double** yNodes, const double** zNodes) {
    GrdApiTrace trace("grdGetItemAxisCurveLinearD3");
    const AxisOut out{{xSize, ySize, zSize}, {}, {}, {xNodes, yNodes, zNodes}};
    return trace.done(getAxis(item, F_CURVE_LINEAR_AXIS_D3, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisTvarD1(ItemHandle item, int32_t unit, int32_t xSize) {
    GrdApiTrace trace("grdSetItemAxisTvarD1 %d %d", unit, xSize);
    const AxisIn in{{xSize}, {}, {}, {}};
    return trace.done(setAxis(item, F_TVAR_AXIS_D1, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisTvarD1(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize) {
    GrdApiTrace trace("grdGetItemAxisTvarD1");
    const AxisOut out{{xSize}, {}, {}, {}};
    return trace.done(getAxis(item, F_TVAR_AXIS_D1, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisTvarD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize) {
    GrdApiTrace trace("grdSetItemAxisTvarD2 %d %d %d", unit, xSize, ySize);
    const AxisIn in{{xSize, ySize}, {}, {}, {}};
    return trace.done(setAxis(item, F_TVAR_AXIS_D2, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisTvarD2(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                       int32_t* ySize) {
    GrdApiTrace trace("grdGetItemAxisTvarD2");
    const AxisOut out{{xSize, ySize}, {}, {}, {}};
    return trace.done(getAxis(item, F_TVAR_AXIS_D2, unit, unitText, out, __LINE__));
}

int32_t TOVA_CALL grdSetItemAxisTvarD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                       int32_t zSize) {
    GrdApiTrace trace("grdSetItemAxisTvarD3 %d %d %d %d", unit, xSize, ySize, zSize);
    const AxisIn in{{xSize, ySize, zSize}, {}, {}, {}};
    return trace.done(setAxis(item, F_TVAR_AXIS_D3, unit, in, trace, __LINE__));
}

int32_t TOVA_CALL grdGetItemAxisTvarD3(ItemHandle item, int32_t* unit, const char** unitText, int32_t* xSize,
                                       int32_t* ySize, int32_t* zSize) {
    GrdApiTrace trace("grdGetItemAxisTvarD3");
    const AxisOut out{{xSize, ySize, zSize}, {}, {}, {}};
    return trace.done(getAxis(item, F_TVAR_AXIS_D3, unit, unitText, out, __LINE__));
}

}  // extern "C"

int64_t grdItemCoordinateCount(const GrdItem* item, int32_t d) noexcept {
    return d >= 0 && d < 3 && d < axisDirections(item->axisType) ? coordinateCount(item->axisType, item->size, d) : 0;
}
