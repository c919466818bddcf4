// Qmx_CorrPtrSwizzlerT: turns pooled objects into their 32-bit handles and back, so that
// records can refer to items and explicit relationships by handle. Each pool manager has one.
#ifndef QMX_CORRPTRSWIZZLERT_H
#define QMX_CORRPTRSWIZZLERT_H

template <class T, class H>
class Qmx_CorrPtrSwizzlerT {
public:
    virtual ~Qmx_CorrPtrSwizzlerT() = default;
    virtual H GetHandle(T* object) = 0;
    virtual T* GetPtr(H handle) = 0;
};

#endif
