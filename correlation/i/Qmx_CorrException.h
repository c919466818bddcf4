// Qmx_CorrException: every error the correlation library reports to its caller. All classes
// derive from Base, which derives from Vesk::Exception, so a caller may catch the specific
// class, Base, Vesk::Exception or std::exception. A class carries no data of its own: its
// what() is the class's fixed text, or its detail format completed with the detail strings.
// Every constructor takes the component ("Quillmark"), the throwing source file, its revision
// stamp and the line; throw through QMX_CORR_THROW, which fills them in.
#ifndef QMX_CORREXCEPTION_H
#define QMX_CORREXCEPTION_H
#include "QmxCorrExport.h"
#include "Vesk_Exception.h"

// Throws Qmx_CorrException::cls by value from the current line. The enclosing source file
// defines kSourceFile and kRevision (its name as traces give it, and its revision stamp).
#define QMX_CORR_THROW(cls, ...) \
    throw Qmx_CorrException::cls("Quillmark", kSourceFile, kRevision, __LINE__, ##__VA_ARGS__)

namespace Qmx_CorrException {

class QMX_CORR_EXPORT Base : public Vesk::Exception {
public:
    Base(const char* component, const char* file, const char* revision, int line,
         const char* description);
    Base(const char* component, const char* file, const char* revision, int line);
    Base(const Base& other);
    ~Base() override;
};

// "Container '<container>' already contains an item or container named '<object>'."
class QMX_CORR_EXPORT DuplicateObjectFound : public Base {
public:
    DuplicateObjectFound(const char* component, const char* file, const char* revision, int line);
    DuplicateObjectFound(const char* component, const char* file, const char* revision, int line,
                         const char* containerName, const char* objectName);
};

class QMX_CORR_EXPORT SrcAndDstIdentical : public Base {
public:
    SrcAndDstIdentical(const char* component, const char* file, const char* revision, int line);
};

class QMX_CORR_EXPORT InvalidSrcItem : public Base {
public:
    InvalidSrcItem(const char* component, const char* file, const char* revision, int line);
    InvalidSrcItem(const char* component, const char* file, const char* revision, int line,
                   const char* itemName);
};

class QMX_CORR_EXPORT InvalidDstItem : public Base {
public:
    InvalidDstItem(const char* component, const char* file, const char* revision, int line);
    InvalidDstItem(const char* component, const char* file, const char* revision, int line,
                   const char* itemName);
};

class QMX_CORR_EXPORT IncorrectPropertyAccessor : public Base {
public:
    IncorrectPropertyAccessor(const char* component, const char* file, const char* revision,
                              int line);
    IncorrectPropertyAccessor(const char* component, const char* file, const char* revision,
                              int line, const char* propertyName);
};

class QMX_CORR_EXPORT IncorrectPropertyType : public Base {
public:
    IncorrectPropertyType(const char* component, const char* file, const char* revision, int line);
    IncorrectPropertyType(const char* component, const char* file, const char* revision, int line,
                          const char* propertyName);
};

class QMX_CORR_EXPORT PropertyDoesNotExist : public Base {
public:
    PropertyDoesNotExist(const char* component, const char* file, const char* revision, int line);
    PropertyDoesNotExist(const char* component, const char* file, const char* revision, int line,
                         const char* propertyName);
};

class QMX_CORR_EXPORT CannotDeleteTopContainer : public Base {
public:
    CannotDeleteTopContainer(const char* component, const char* file, const char* revision,
                             int line);
};

// The detail is a database or stream name.
class QMX_CORR_EXPORT CannotReadDatabase : public Base {
public:
    CannotReadDatabase(const char* component, const char* file, const char* revision, int line);
    CannotReadDatabase(const char* component, const char* file, const char* revision, int line,
                       const char* name);
};

// The detail is a database or stream name.
class QMX_CORR_EXPORT CannotWriteDatabase : public Base {
public:
    CannotWriteDatabase(const char* component, const char* file, const char* revision, int line);
    CannotWriteDatabase(const char* component, const char* file, const char* revision, int line,
                        const char* name);
};

// The detail is a database or stream name.
class QMX_CORR_EXPORT InvalidDatabaseFormat : public Base {
public:
    InvalidDatabaseFormat(const char* component, const char* file, const char* revision, int line);
    InvalidDatabaseFormat(const char* component, const char* file, const char* revision, int line,
                          const char* name);
};

class QMX_CORR_EXPORT DatabaseIsReadonly : public Base {
public:
    DatabaseIsReadonly(const char* component, const char* file, const char* revision, int line);
    DatabaseIsReadonly(const char* component, const char* file, const char* revision, int line,
                       const char* databaseName);
};

class QMX_CORR_EXPORT InvalidDirection : public Base {
public:
    InvalidDirection(const char* component, const char* file, const char* revision, int line);
};

class QMX_CORR_EXPORT BadExpression : public Base {
public:
    BadExpression(const char* component, const char* file, const char* revision, int line);
    BadExpression(const char* component, const char* file, const char* revision, int line,
                  const char* expression);
};

// The detail says what was asked.
class QMX_CORR_EXPORT InvalidRequest : public Base {
public:
    InvalidRequest(const char* component, const char* file, const char* revision, int line);
    InvalidRequest(const char* component, const char* file, const char* revision, int line,
                   const char* request);
};

}  // namespace Qmx_CorrException

#endif
