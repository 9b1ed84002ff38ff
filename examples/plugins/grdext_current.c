/*
 * Example extension plug-in for the gridded data files of data type 7 (or
 * -7): it offers the file's items followed by two derived items computed from
 * the horizontal velocity components (quantity types VelocityX and
 * VelocityY):
 *   - current speed (CurrentSpeed, m/s): hypot(u, v);
 *   - current direction (CurrentDirection, deg): the direction the current
 *     flows towards, clockwise from north, atan2(u, v), in [0, 360).
 * A delete value in either component gives the float delete value. The
 * velocity items may be float or double, on any axis that the derived items
 * can take: equidistant of 0 to 3 dimensions.
 *
 * Built as the loadable module grdExt_7 (grdExt_7.so, .dylib or .dll); put it
 * where the platform loader finds libraries, and call grdEnablePlugin after
 * grdFileRead. It reads the file through the public API while the library
 * calls it, so it needs nothing but tova/grdext.h.
 */
#include <math.h>
#include <stdlib.h>
#include <string.h>

#include "tova/grdext.h"

enum {
    kVelocityX = 40202,
    kVelocityY = 40203,
    kCurrentSpeed = 40205,
    kCurrentDirection = 40206,
    kMetrePerSecond = 20700,
    kDegree = 20601,
    kFloat = 1,
    kDouble = 2,
    kNoStatus = 1 /* "not given": the library keeps what the item had */
};

static const double kDegreesPerRadian = 57.29577951308232;

/* What the plug-in keeps for one header: the file's items of the current
 * time step (one buffer per item) and the two derived arrays. */
typedef struct Session {
    HeaderHandle header;
    int32_t fileItems;     /* N: the file's own item count */
    int32_t uItem, vItem;  /* 1-based numbers of the velocity components */
    int32_t dims;          /* axis of the derived items: EqD0 ... EqD3 */
    int32_t axisUnit;
    int32_t sizes[3];
    float starts[3];
    float steps[3];
    int64_t fileBytes;     /* length of the file: no stored item is longer */
    void** values;         /* values[k - 1]: item k of the current time step */
    size_t* capacity;      /* bytes allocated for values[k - 1] */
    float* derived[2];     /* speed, direction */
    size_t derivedCapacity; /* values each derived array can hold */
    size_t count;          /* values of the current time step */
    struct Session* next;
} Session;

static Session* sessions = NULL;

static Session* findSession(HeaderHandle header) {
    Session* s = sessions;
    while (s != NULL && s->header != header) s = s->next;
    return s;
}

static void freeSession(Session* s) {
    int32_t k;
    if (s->values != NULL)
        for (k = 0; k < s->fileItems; ++k) free(s->values[k]);
    free(s->values);
    free(s->capacity);
    free(s->derived[0]);
    free(s->derived[1]);
    free(s);
}

/* Grows *buffer to hold bytes; 0 when memory fails. */
static int reserve(void** buffer, size_t* capacity, size_t bytes) {
    void* grown;
    if (bytes <= *capacity) return 1;
    grown = realloc(*buffer, bytes);
    if (grown == NULL) return 0;
    *buffer = grown;
    *capacity = bytes;
    return 1;
}

/* The equidistant axis of the velocity items, for the derived items. */
static int takeAxis(Session* s, ItemHandle item) {
    int32_t* n = s->sizes;
    float* x0 = s->starts;
    float* dx = s->steps;
    switch (grdGetItemAxisType(item)) {
        case F_EQ_AXIS_D0:
            s->dims = 0;
            return grdGetItemAxisEqD0(item, &s->axisUnit, NULL) == 0;
        case F_EQ_AXIS_D1:
            s->dims = 1;
            return grdGetItemAxisEqD1(item, &s->axisUnit, NULL, &n[0], &x0[0], &dx[0]) == 0;
        case F_EQ_AXIS_D2:
            s->dims = 2;
            return grdGetItemAxisEqD2(item, &s->axisUnit, NULL, &n[0], &n[1], &x0[0], &x0[1], &dx[0], &dx[1]) == 0;
        case F_EQ_AXIS_D3:
            s->dims = 3;
            return grdGetItemAxisEqD3(item, &s->axisUnit, NULL, &n[0], &n[1], &n[2], &x0[0], &x0[1], &x0[2],
                                      &dx[0], &dx[1], &dx[2]) == 0;
        default:
            return 0;
    }
}

/* Finds the velocity components among the file's items (the header shows the
 * file's items while the plug-in is called). */
static int findComponents(Session* s) {
    int32_t k, type = 0, dataType = 0, uType = 0, vType = 0;
    for (k = 1; k <= s->fileItems; ++k) {
        if (grdGetItemInfo_(grdItemD(s->header, k), &type, NULL, NULL, &dataType) != 0) return 0;
        if (type == kVelocityX && s->uItem == 0) {
            s->uItem = k;
            uType = dataType;
        } else if (type == kVelocityY && s->vItem == 0) {
            s->vItem = k;
            vType = dataType;
        }
    }
    if (s->uItem == 0 || s->vItem == 0) return 0;
    if ((uType != kFloat && uType != kDouble) || (vType != kFloat && vType != kDouble)) return 0;
    return grdGetItemElements(grdItemD(s->header, s->uItem)) == grdGetItemElements(grdItemD(s->header, s->vItem));
}

/* Length of the file, the stream left where it was. */
static int64_t fileLength(FileHandle file) {
    const int64_t at = rcfTell64(file);
    int64_t length;
    rcfSeek64(file, 0, 0, 2);
    length = rcfTell64(file);
    rcfSeek64(file, (uint32_t)((uint64_t)at & 0xFFFFFFFFu), (uint32_t)((uint64_t)at >> 32), 0);
    return length;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtInitialize(HeaderHandle header, FileHandle file) {
    Session* s = (Session*)calloc(1, sizeof(Session));
    if (s == NULL) return F_ERR_MEMORY;
    s->header = header;
    s->fileBytes = fileLength(file);
    s->fileItems = grdGetNoOfItems(header);
    if (!findComponents(s) || !takeAxis(s, grdItemD(header, s->uItem))) {
        free(s);
        return F_ERR_VALUE; /* no velocity components this plug-in can use: refused */
    }
    s->values = (void**)calloc((size_t)s->fileItems, sizeof(void*));
    s->capacity = (size_t*)calloc((size_t)s->fileItems, sizeof(size_t));
    if (s->values == NULL || s->capacity == NULL) {
        freeSession(s);
        return F_ERR_MEMORY;
    }
    s->next = sessions;
    sessions = s;
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtTerminate(HeaderHandle header) {
    Session** link = &sessions;
    while (*link != NULL && (*link)->header != header) link = &(*link)->next;
    if (*link != NULL) {
        Session* s = *link;
        *link = s->next;
        freeSession(s);
    }
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetNoOfItems(HeaderHandle header) {
    const Session* s = findSession(header);
    return s != NULL ? s->fileItems + 2 : 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtIsItemDerived(HeaderHandle header, int32_t itemNo) {
    const Session* s = findSession(header);
    return s != NULL && itemNo > s->fileItems;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemInfo(HeaderHandle header, int32_t itemNo, int32_t* itemType,
                                               const char** name, int32_t* unit, const char** unitName,
                                               int32_t* dataType, const char** otherName) {
    const Session* s = findSession(header);
    (void)unitName;
    (void)otherName;
    if (s == NULL) return F_ERR_ARGUMENT;
    if (itemNo <= s->fileItems) return 0; /* the file's item as it is */
    if (itemNo == s->fileItems + 1) {
        *itemType = kCurrentSpeed;
        *name = "Current speed";
        *unit = kMetrePerSecond;
    } else {
        *itemType = kCurrentDirection;
        *name = "Current direction";
        *unit = kDegree;
    }
    *dataType = kFloat;
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemValueType(HeaderHandle header, int32_t itemNo) {
    const Session* s = findSession(header);
    int32_t valueType = -1;
    if (s != NULL && itemNo > s->fileItems) grdGetItemValueType(grdItemD(header, s->uItem), &valueType);
    return valueType; /* -1 for the file's items: kept */
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemStatsGlobal(HeaderHandle header, int32_t itemNo, double* minimum,
                                                      double* maximum, int32_t* deleteCount) {
    const Session* s = findSession(header);
    if (s == NULL || itemNo <= s->fileItems) return kNoStatus;
    /* Not known before the data are read. */
    *minimum = grdGetDeleteValDouble(header);
    *maximum = *minimum;
    *deleteCount = 0;
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisType(HeaderHandle header, int32_t itemNo) {
    const Session* s = findSession(header);
    return s != NULL && itemNo > s->fileItems ? s->dims : -1;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisEq(HeaderHandle header, int32_t itemNo, int32_t* unit,
                                                 int32_t sizes[3], float starts[3], float steps[3]) {
    const Session* s = findSession(header);
    int32_t d;
    if (s == NULL || itemNo <= s->fileItems) return kNoStatus;
    *unit = s->axisUnit;
    for (d = 0; d < s->dims; ++d) {
        sizes[d] = s->sizes[d];
        starts[d] = s->starts[d];
        steps[d] = s->steps[d];
    }
    return 0;
}

/* Component value i as a double; *missing when it is a delete value. */
static double component(const void* values, int32_t dataType, size_t i, float delFloat, double delDouble,
                        int* missing) {
    if (dataType == kFloat) {
        const float v = ((const float*)values)[i];
        *missing = *missing || v == delFloat;
        return v;
    } else {
        const double v = ((const double*)values)[i];
        *missing = *missing || v == delDouble;
        return v;
    }
}

static void derive(Session* s, size_t count) {
    HeaderHandle h = s->header;
    const void* u = s->values[s->uItem - 1];
    const void* v = s->values[s->vItem - 1];
    int32_t uType = 0, vType = 0;
    const float delFloat = grdGetDeleteValFloat(h);
    const double delDouble = grdGetDeleteValDouble(h);
    size_t i;
    grdGetItemInfo_(grdItemD(h, s->uItem), NULL, NULL, NULL, &uType);
    grdGetItemInfo_(grdItemD(h, s->vItem), NULL, NULL, NULL, &vType);
    for (i = 0; i < count; ++i) {
        int missing = 0;
        const double x = component(u, uType, i, delFloat, delDouble, &missing);
        const double y = component(v, vType, i, delFloat, delDouble, &missing);
        double towards = atan2(x, y) * kDegreesPerRadian;
        if (towards < 0.0) towards += 360.0;
        s->derived[0][i] = missing ? delFloat : (float)hypot(x, y);
        s->derived[1][i] = missing ? delFloat : (float)towards;
    }
}

/* Reads the file's items of the new time step, in order, and derives the
 * speed and direction. Buffer sizes are taken afresh every time: the element
 * counts change when the caller enables item compression. */
GRD_EXT_EXPORT int TOVA_CALL grdExtNewTimeStep(HeaderHandle header, FileHandle file) {
    Session* s = findSession(header);
    int32_t k, status;
    double time = 0.0;
    size_t count;
    if (s == NULL) return F_ERR_ARGUMENT;
    for (k = 1; k <= s->fileItems; ++k) {
        ItemHandle item = grdItemD(header, k);
        const int32_t bytes = grdGetItemBytes(item);
        if (bytes <= 0) return F_ERR_VALUE;
        /* The stored values are in the file: a damaged file whose item
         * claims more gets no buffer of that size. */
        if (grdGetUsedItemBytes(item) > s->fileBytes) return F_ERR_SIZE;
        if (!reserve(&s->values[k - 1], &s->capacity[k - 1], (size_t)bytes)) return F_ERR_MEMORY;
        status = grdReadItemTimeStep(header, file, &time, s->values[k - 1]);
        if (status != 0) return status;
    }
    count = (size_t)grdGetItemElements(grdItemD(header, s->uItem));
    if (count > s->derivedCapacity) {
        float* speed = (float*)realloc(s->derived[0], count * sizeof(float));
        float* direction;
        if (speed != NULL) s->derived[0] = speed;
        direction = (float*)realloc(s->derived[1], count * sizeof(float));
        if (direction != NULL) s->derived[1] = direction;
        if (speed == NULL || direction == NULL) return F_ERR_MEMORY;
        s->derivedCapacity = count;
    }
    s->count = count;
    derive(s, count);
    return 0;
}

/* Delivers the item under the cursor from what grdExtNewTimeStep kept. */
GRD_EXT_EXPORT int TOVA_CALL grdExtReadItemTimeStep(HeaderHandle header, FileHandle file, void* data) {
    const Session* s = findSession(header);
    int32_t itemNo = 0;
    (void)file;
    if (s == NULL || grdGetItemCursor(header, &itemNo, NULL) != 0) return F_ERR_ARGUMENT;
    if (data == NULL) return 0;
    if (itemNo >= 1 && itemNo <= s->fileItems) {
        /* The header shows the file's items here: item itemNo's size. */
        const int32_t bytes = grdGetItemBytes(grdItemD(header, itemNo));
        if (bytes <= 0 || (size_t)bytes > s->capacity[itemNo - 1]) return F_ERR_VALUE;
        memcpy(data, s->values[itemNo - 1], (size_t)bytes);
        return 0;
    }
    if (itemNo == s->fileItems + 1 || itemNo == s->fileItems + 2) {
        memcpy(data, s->derived[itemNo - s->fileItems - 1], s->count * sizeof(float));
        return 0;
    }
    return F_ERR_ITEMNO;
}
