// Vesk::IOException: a stream or file operation that could not be carried out: a read past the
// end of the data, damaged compressed data, or a failure of the operating system. Callers that
// know what the bytes mean turn it into their own error.
#ifndef VESK_IOEXCEPTION_H
#define VESK_IOEXCEPTION_H
#include "VeskExport.h"
#include "Vesk_Exception.h"

namespace Vesk {

class VESK_EXPORT IOException : public Exception {
public:
    enum Kind {
        kEndOfData,    // fewer bytes left than a read asked for
        kDamagedData,  // compressed data that does not decode, or a string too long
        kSystemError,  // the operating system refused an operation
        kUnsupported,  // an operation the stream's form cannot do (seeking back in a
                       // compressed stream)
    };

    IOException(Kind kind, const char* sourceFile, int line, const char* description);

    Kind getKind() const { return m_kind; }

private:
    Kind m_kind;
};

}  // namespace Vesk

#endif
