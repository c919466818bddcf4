#include "Qmx_CorrException.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrTestSource";
constexpr const char* kRevision = "7.3";

struct Case {
    std::string name;
    std::function<void()> raise;
    std::string text;
};

// Every class in its short and detail forms, with the whole expected text. Mind the texts
// that end without a line break and the two blanks after "BadExpression." and
// "InvalidRequest.".
std::vector<Case> AllCases() {
    return {
        {"DuplicateObjectFound", [] { QMX_CORR_THROW(DuplicateObjectFound); },
         "Qmx_CorrException::DuplicateObjectFound\n"},
        {"DuplicateObjectFound detail", [] { QMX_CORR_THROW(DuplicateObjectFound, "/rtl", "u1"); },
         "Qmx_CorrException::DuplicateObjectFound. Container '/rtl' already contains an item or "
         "container named 'u1'.\n"},
        {"SrcAndDstIdentical", [] { QMX_CORR_THROW(SrcAndDstIdentical); },
         "Qmx_CorrException::SrcAndDstIdentical. Both the source and correlation items provided "
         "are the same item.\n"},
        {"InvalidSrcItem", [] { QMX_CORR_THROW(InvalidSrcItem); },
         "Qmx_CorrException::InvalidSrcItem."},
        {"InvalidSrcItem detail", [] { QMX_CORR_THROW(InvalidSrcItem, "/a/x"); },
         "Qmx_CorrException::InvalidSrcItem. The correlation item '/a/x' is not a valid "
         "relationship source for the attempted operation."},
        {"InvalidDstItem", [] { QMX_CORR_THROW(InvalidDstItem); },
         "Qmx_CorrException::InvalidDstItem."},
        {"InvalidDstItem detail", [] { QMX_CORR_THROW(InvalidDstItem, "/b/y"); },
         "Qmx_CorrException::InvalidDstItem. The correlation item '/b/y' is not a valid "
         "relationship destination for the attempted operation."},
        {"IncorrectPropertyAccessor", [] { QMX_CORR_THROW(IncorrectPropertyAccessor); },
         "Qmx_CorrException::IncorrectPropertyAccessor\n"},
        {"IncorrectPropertyAccessor detail", [] { QMX_CORR_THROW(IncorrectPropertyAccessor, "p"); },
         "Qmx_CorrException::IncorrectPropertyAccessor. Accessing property 'p'.\n"},
        {"IncorrectPropertyType", [] { QMX_CORR_THROW(IncorrectPropertyType); },
         "Qmx_CorrException::IncorrectPropertyType\n"},
        {"IncorrectPropertyType detail", [] { QMX_CORR_THROW(IncorrectPropertyType, "p"); },
         "Qmx_CorrException::IncorrectPropertyType. Accessing property 'p'.\n"},
        {"PropertyDoesNotExist", [] { QMX_CORR_THROW(PropertyDoesNotExist); },
         "Qmx_CorrException::PropertyDoesNotExist\n"},
        {"PropertyDoesNotExist detail", [] { QMX_CORR_THROW(PropertyDoesNotExist, "p"); },
         "Qmx_CorrException::PropertyDoesNotExist. Accessing property 'p'.\n"},
        {"CannotDeleteTopContainer", [] { QMX_CORR_THROW(CannotDeleteTopContainer); },
         "Qmx_CorrException::CannotDeleteTopContainer. The top level container may not be "
         "deleted.\n"},
        {"CannotReadDatabase", [] { QMX_CORR_THROW(CannotReadDatabase); },
         "Qmx_CorrException::CannotReadDatabase\n"},
        {"CannotReadDatabase detail", [] { QMX_CORR_THROW(CannotReadDatabase, "d.cpd"); },
         "Qmx_CorrException::CannotReadDatabase. Unable to read 'd.cpd'.\n"},
        {"CannotWriteDatabase", [] { QMX_CORR_THROW(CannotWriteDatabase); },
         "Qmx_CorrException::CannotWriteDatabase\n"},
        {"CannotWriteDatabase detail", [] { QMX_CORR_THROW(CannotWriteDatabase, "d.cpd"); },
         "Qmx_CorrException::CannotWriteDatabase. Unable to write 'd.cpd'.\n"},
        {"InvalidDatabaseFormat", [] { QMX_CORR_THROW(InvalidDatabaseFormat); },
         "Qmx_CorrException::InvalidDatabaseFormat\n"},
        {"InvalidDatabaseFormat detail", [] { QMX_CORR_THROW(InvalidDatabaseFormat, "d.cpd"); },
         "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'd.cpd'.\n"},
        {"DatabaseIsReadonly", [] { QMX_CORR_THROW(DatabaseIsReadonly); },
         "Qmx_CorrException::DatabaseIsReadonly\n"},
        {"DatabaseIsReadonly detail", [] { QMX_CORR_THROW(DatabaseIsReadonly, "d.cpd"); },
         "Qmx_CorrException::DatabaseIsReadonly. Unable to commit to 'd.cpd'. Database is read "
         "only.\n"},
        {"InvalidDirection", [] { QMX_CORR_THROW(InvalidDirection); },
         "Qmx_CorrException::InvalidDirection\n"},
        {"BadExpression", [] { QMX_CORR_THROW(BadExpression); },
         "Qmx_CorrException::BadExpression\n"},
        {"BadExpression detail", [] { QMX_CORR_THROW(BadExpression, "(a"); },
         "Qmx_CorrException::BadExpression.  '(a' is not a valid regular expresssion.\n"},
        {"InvalidRequest", [] { QMX_CORR_THROW(InvalidRequest); },
         "Qmx_CorrException::InvalidRequest\n"},
        {"InvalidRequest detail", [] { QMX_CORR_THROW(InvalidRequest, "SeekPos"); },
         "Qmx_CorrException::InvalidRequest.  'SeekPos'\n"},
    };
}

TEST(CorrException, EveryClassCarriesItsFixedTextAndOrigin) {
    for (const Case& c : AllCases()) {
        try {
            c.raise();
            ADD_FAILURE() << c.name << " did not throw";
        } catch (const Qmx_CorrException::Base& e) {
            EXPECT_EQ(std::string(e.what()), c.text) << c.name;
            EXPECT_EQ(e.getDescription(), c.text) << c.name;
            EXPECT_EQ(e.getComponent(), "Quillmark") << c.name;
            EXPECT_EQ(e.getSourceFile(), kSourceFile) << c.name;
            EXPECT_EQ(e.getRevision(), kRevision) << c.name;
            EXPECT_GT(e.getLine(), 0) << c.name;
            EXPECT_EQ(std::wstring(e.getLocalized()), std::wstring(c.text.begin(), c.text.end()));
            const Qmx_CorrException::Base copy(e);
            EXPECT_STREQ(copy.what(), e.what()) << c.name;
            EXPECT_EQ(copy.getLine(), e.getLine()) << c.name;
        }
    }
}

TEST(CorrException, EveryClassIsCaughtAsVeskAndStdException) {
    for (const Case& c : AllCases()) {
        EXPECT_THROW(c.raise(), Vesk::Exception) << c.name;
        EXPECT_THROW(c.raise(), std::exception) << c.name;
    }
}

TEST(CorrException, BaseDoesNotCatchOtherPlatformExceptions) {
    bool caughtAsBase = false;
    try {
        try {
            throw Vesk::Exception("Quillmark", "s/Qmx_CorrDb_Internal", "1", 3,
                                  "The correlation data has grown to be larger than 4GB.");
        } catch (const Qmx_CorrException::Base&) {
            caughtAsBase = true;
        }
    } catch (const Vesk::Exception& e) {
        EXPECT_EQ(e.getLine(), 3);
    }
    EXPECT_FALSE(caughtAsBase);
}

TEST(CorrException, SpecificClassCatchesOnlyItself) {
    EXPECT_THAT([] { QMX_CORR_THROW(CannotReadDatabase, "x.cpd"); },
                ::testing::ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(
                    ::testing::StrEq("Qmx_CorrException::CannotReadDatabase. Unable to read "
                                     "'x.cpd'.\n")));
    bool wrongClass = false;
    try {
        try {
            QMX_CORR_THROW(CannotWriteDatabase, "x.cpd");
        } catch (const Qmx_CorrException::CannotReadDatabase&) {
            wrongClass = true;
        }
    } catch (const Qmx_CorrException::CannotWriteDatabase&) {
    }
    EXPECT_FALSE(wrongClass);
}

TEST(CorrException, DetailIsDataNotFormat) {
    // A name with conversion characters must come out as it is.
    EXPECT_THAT([] { QMX_CORR_THROW(InvalidRequest, "%s%n%d"); },
                ::testing::ThrowsMessage<Qmx_CorrException::InvalidRequest>(
                    ::testing::StrEq("Qmx_CorrException::InvalidRequest.  '%s%n%d'\n")));
    EXPECT_THAT([] { QMX_CORR_THROW(InvalidRequest, nullptr); },
                ::testing::ThrowsMessage<Qmx_CorrException::InvalidRequest>(
                    ::testing::StrEq("Qmx_CorrException::InvalidRequest.  ''\n")));
}

}  // namespace
