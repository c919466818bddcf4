// QmxCorrExport: the visibility mark of the correlation library's exported classes and
// functions; everything else in libqmxcorr.so stays hidden.
#ifndef QMX_CORR_EXPORT_H
#define QMX_CORR_EXPORT_H

#define QMX_CORR_EXPORT __attribute__((visibility("default")))

#endif
