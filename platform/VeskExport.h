// VeskExport: the visibility mark of the portability layer's exported classes and functions.
// Everything else in libvesk.so stays hidden.
#ifndef VESK_EXPORT_H
#define VESK_EXPORT_H

#define VESK_EXPORT __attribute__((visibility("default")))

// printf-style argument checking for variadic formatters; `fmt` and `args` count `this`.
#define VESK_PRINTF(fmt, args) __attribute__((format(printf, fmt, args)))

#endif
