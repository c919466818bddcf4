// Qmx_CorrObjectData: the shared data record of a correlation object: its database's owner and
// its property map. Objects hold their record through boost::shared_ptr, and objects without
// properties of their own share one, so that the many objects of a large database that never
// carry a property cost a pointer each. The record's holder count is the pointer's use count;
// an object changes properties only in a record it holds alone (see GetObjectDataForWrite of
// each object). This class is the container's record; Qmx_CorrItemData and Qmx_CorrRelData
// extend it for items and relationships.
//
// Property map record (inside every object-data record; UINT32 and string as the storage
// writes them):
//   count       UINT32   number of properties
//   then count times, in map order:
//     name      string
//     type tag  UINT32   0 INT32, 1 String
//     value     UINT32 (the integer's 32-bit pattern) for tag 0, string for tag 1
//
// Object-data block of a container (inside the container record; objectDataVersion 1):
//   private     Bool     true when the container alone holds its record
//   properties  property map record, only when private is true
#ifndef QMX_CORROBJECTDATA_H
#define QMX_CORROBJECTDATA_H
#include <boost/shared_ptr.hpp>

#include "QmxCorrExport.h"
#include "Qmx_CorrPropertyValue.h"

class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrObjectData {
public:
    // Empty property map.
    explicit Qmx_CorrObjectData(Qmx_CorrObjectOwner* owner);
    // Reads a property map record. Throws IncorrectPropertyType for a tag other than 0 or 1,
    // InvalidDatabaseFormat (database name) when the count cannot fit in the stream.
    Qmx_CorrObjectData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage);
    virtual ~Qmx_CorrObjectData();

    Qmx_CorrObjectOwner* GetOwner() const { return m_owner; }
    const Qmx_CorrPropertyMap& GetProperties() const { return m_properties; }
    // REQUIRES: the caller holds the record alone (it came from GetObjectDataForWrite).
    Qmx_CorrPropertyMap& GetPropertiesForWrite() { return m_properties; }

    // Writes the property map record. Throws IncorrectPropertyType for a value whose tag is
    // neither 0 nor 1; the record is then incomplete.
    void Archive(Qmx_CorrStorage& storage) const;

    static void WritePropertyMap(Qmx_CorrStorage& storage, const Qmx_CorrPropertyMap& map);
    // Replaces `map` with the record read; a name stored twice keeps the later value.
    static void ReadPropertyMap(Qmx_CorrStorage& storage, Qmx_CorrPropertyMap& map);

    // The containers' records. Every owner has one shared, empty default record, made on
    // first request and kept in a process-wide table until ReleaseDefaultObjectData (the
    // data manager's destructor).
    static boost::shared_ptr<Qmx_CorrObjectData> GetDefaultObjectData(Qmx_CorrObjectOwner* owner);
    static boost::shared_ptr<Qmx_CorrObjectData> CreateObjectData(Qmx_CorrObjectOwner* owner);
    static void ReleaseDefaultObjectData(Qmx_CorrObjectOwner* owner);
    // The object-data block of a container record; sets the storage's objectDataVersion to 1.
    static void ArchiveObjectData(Qmx_CorrStorage& storage,
                                  const boost::shared_ptr<Qmx_CorrObjectData>& record);
    // A private record read from the block, or the owner's default. Throws
    // InvalidDatabaseFormat (database name) unless the storage's objectDataVersion is 1.
    static boost::shared_ptr<Qmx_CorrObjectData> RestoreObjectData(Qmx_CorrStorage& storage,
                                                                   Qmx_CorrObjectOwner* owner);

private:
    Qmx_CorrObjectOwner* m_owner;  // not owned
    Qmx_CorrPropertyMap m_properties;
};

#endif
