#include "Qmx_CorrException.h"

namespace Qmx_CorrException {

namespace {

// A missing detail is formatted as the empty text rather than handed to printf as null.
const char* Text(const char* detail) { return detail ? detail : ""; }

}  // namespace

Base::Base(const char* component, const char* file, const char* revision, int line,
           const char* description)
    : Vesk::Exception(component, file, revision, line, description) {}

Base::Base(const char* component, const char* file, const char* revision, int line)
    : Vesk::Exception(component, file, revision, line) {}

Base::Base(const Base& other) = default;

Base::~Base() = default;

DuplicateObjectFound::DuplicateObjectFound(const char* component, const char* file,
                                           const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::DuplicateObjectFound\n") {}

DuplicateObjectFound::DuplicateObjectFound(const char* component, const char* file,
                                           const char* revision, int line,
                                           const char* containerName, const char* objectName)
    : Base(component, file, revision, line) {
    setDescription(
        "Qmx_CorrException::DuplicateObjectFound. Container '%s' already contains an item or "
        "container named '%s'.\n",
        Text(containerName), Text(objectName));
}

SrcAndDstIdentical::SrcAndDstIdentical(const char* component, const char* file,
                                       const char* revision, int line)
    : Base(component, file, revision, line,
           "Qmx_CorrException::SrcAndDstIdentical. Both the source and correlation items provided "
           "are the same item.\n") {}

InvalidSrcItem::InvalidSrcItem(const char* component, const char* file, const char* revision,
                               int line)
    : Base(component, file, revision, line, "Qmx_CorrException::InvalidSrcItem.") {}

InvalidSrcItem::InvalidSrcItem(const char* component, const char* file, const char* revision,
                               int line, const char* itemName)
    : Base(component, file, revision, line) {
    setDescription(
        "Qmx_CorrException::InvalidSrcItem. The correlation item '%s' is not a valid relationship "
        "source for the attempted operation.",
        Text(itemName));
}

InvalidDstItem::InvalidDstItem(const char* component, const char* file, const char* revision,
                               int line)
    : Base(component, file, revision, line, "Qmx_CorrException::InvalidDstItem.") {}

InvalidDstItem::InvalidDstItem(const char* component, const char* file, const char* revision,
                               int line, const char* itemName)
    : Base(component, file, revision, line) {
    setDescription(
        "Qmx_CorrException::InvalidDstItem. The correlation item '%s' is not a valid relationship "
        "destination for the attempted operation.",
        Text(itemName));
}

IncorrectPropertyAccessor::IncorrectPropertyAccessor(const char* component, const char* file,
                                                     const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::IncorrectPropertyAccessor\n") {}

IncorrectPropertyAccessor::IncorrectPropertyAccessor(const char* component, const char* file,
                                                     const char* revision, int line,
                                                     const char* propertyName)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::IncorrectPropertyAccessor. Accessing property '%s'.\n",
                   Text(propertyName));
}

IncorrectPropertyType::IncorrectPropertyType(const char* component, const char* file,
                                             const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::IncorrectPropertyType\n") {}

IncorrectPropertyType::IncorrectPropertyType(const char* component, const char* file,
                                             const char* revision, int line,
                                             const char* propertyName)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::IncorrectPropertyType. Accessing property '%s'.\n",
                   Text(propertyName));
}

PropertyDoesNotExist::PropertyDoesNotExist(const char* component, const char* file,
                                           const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::PropertyDoesNotExist\n") {}

PropertyDoesNotExist::PropertyDoesNotExist(const char* component, const char* file,
                                           const char* revision, int line, const char* propertyName)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::PropertyDoesNotExist. Accessing property '%s'.\n",
                   Text(propertyName));
}

CannotDeleteTopContainer::CannotDeleteTopContainer(const char* component, const char* file,
                                                   const char* revision, int line)
    : Base(component, file, revision, line,
           "Qmx_CorrException::CannotDeleteTopContainer. The top level container may not be "
           "deleted.\n") {}

CannotReadDatabase::CannotReadDatabase(const char* component, const char* file,
                                       const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::CannotReadDatabase\n") {}

CannotReadDatabase::CannotReadDatabase(const char* component, const char* file,
                                       const char* revision, int line, const char* name)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::CannotReadDatabase. Unable to read '%s'.\n", Text(name));
}

CannotWriteDatabase::CannotWriteDatabase(const char* component, const char* file,
                                         const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::CannotWriteDatabase\n") {}

CannotWriteDatabase::CannotWriteDatabase(const char* component, const char* file,
                                         const char* revision, int line, const char* name)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::CannotWriteDatabase. Unable to write '%s'.\n", Text(name));
}

InvalidDatabaseFormat::InvalidDatabaseFormat(const char* component, const char* file,
                                             const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::InvalidDatabaseFormat\n") {}

InvalidDatabaseFormat::InvalidDatabaseFormat(const char* component, const char* file,
                                             const char* revision, int line, const char* name)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::InvalidDatabaseFormat. Unable to read '%s'.\n", Text(name));
}

DatabaseIsReadonly::DatabaseIsReadonly(const char* component, const char* file,
                                       const char* revision, int line)
    : Base(component, file, revision, line, "Qmx_CorrException::DatabaseIsReadonly\n") {}

DatabaseIsReadonly::DatabaseIsReadonly(const char* component, const char* file,
                                       const char* revision, int line, const char* databaseName)
    : Base(component, file, revision, line) {
    setDescription(
        "Qmx_CorrException::DatabaseIsReadonly. Unable to commit to '%s'. Database is read only.\n",
        Text(databaseName));
}

InvalidDirection::InvalidDirection(const char* component, const char* file, const char* revision,
                                   int line)
    : Base(component, file, revision, line, "Qmx_CorrException::InvalidDirection\n") {}

BadExpression::BadExpression(const char* component, const char* file, const char* revision,
                             int line)
    : Base(component, file, revision, line, "Qmx_CorrException::BadExpression\n") {}

BadExpression::BadExpression(const char* component, const char* file, const char* revision,
                             int line, const char* expression)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::BadExpression.  '%s' is not a valid regular expresssion.\n",
                   Text(expression));
}

InvalidRequest::InvalidRequest(const char* component, const char* file, const char* revision,
                               int line)
    : Base(component, file, revision, line, "Qmx_CorrException::InvalidRequest\n") {}

InvalidRequest::InvalidRequest(const char* component, const char* file, const char* revision,
                               int line, const char* request)
    : Base(component, file, revision, line) {
    setDescription("Qmx_CorrException::InvalidRequest.  '%s'\n", Text(request));
}

}  // namespace Qmx_CorrException
