/** @file
 * tova — call tracing. An indented tree of entered and left functions on
 * standard output; exported so that client programs can nest their own lines
 * with the library's. A single-threaded debugging aid: at most 5002 lines are
 * written per process, after which the process ends.
 */
#ifndef TOVA_TRACE_H
#define TOVA_TRACE_H

#include "status.h"

TOVA_EXTERN_C_BEGIN

/* Variadic forms use the platform's default calling convention. */
/** Prints an entry line at the current depth (printf-style format) and indents the lines after it. */
TOVA_API void DebugEnter(const char* format, ...);
/** Prints one line at the current depth, as an entry immediately followed by its exit (printf-style format).
 */
TOVA_API void DebugEnterExit(const char* format, ...);
/** Ends the indentation of the last DebugEnter and prints an exit line (printf-style format). */
TOVA_API int32_t DebugExit(const char* format, ...); /**< returns the line counter */
/** Prints one line at the current depth (printf-style format). */
TOVA_API void DebugPrint(const char* format, ...);

/** One-string forms for callers that cannot call variadic functions. */
TOVA_API void TOVA_CALL DebugEnterStr(const char* text);
/** DebugEnterExit with a ready-made text. */
TOVA_API void TOVA_CALL DebugEnterExitStr(const char* text);
/** DebugExit with a ready-made text; returns the line counter. */
TOVA_API int32_t TOVA_CALL DebugExitStr(const char* text);
/** DebugPrint with a ready-made text. */
TOVA_API void TOVA_CALL DebugPrintStr(const char* text);

/** Pushes the name of the function being entered onto the trace's name stack. */
TOVA_API void TOVA_CALL PutFunctionName(const char* nameSource);
/** The name on top of the trace's name stack; static text, "" when empty. */
TOVA_API const char* TOVA_CALL GetFunctionName(void);
/** Writes count blanks to standard output (the trace's indentation). */
TOVA_API void TOVA_CALL printnblank(int32_t count);

/** Switches the tracing of the file-open and logical-block layer; returns the
 * stored truth value (0 or 1). */
TOVA_API int32_t TOVA_CALL DebugFileIO(int32_t on);

TOVA_EXTERN_C_END

#endif /* TOVA_TRACE_H */
