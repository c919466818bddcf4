// A small tour of what the library offers so far: a traced operation, a compressed file
// written and read back through the portability layer, a database file committed and opened
// again, and an error as a host receives it.
#include <cstdio>
#include <iostream>

#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream.h"
#include "Vesk_File.h"
#include "Vesk_Stream.h"

namespace {

constexpr const char* kSourceFile = "examples/corr_example";
constexpr const char* kRevision = "1";

int Run(const Vesk::StringBase<char>& path) {
    Qmx_CorrDbg::s_Tracer->SetTraceLevel("ARCHIVE", 5);
    QMX_CORR_TRACE("ARCHIVE", 5, "Writing '" << path << "' in the compressed form.");

    Vesk::Stream* out = Vesk::File::open(path, Vesk::File::kWrite | Vesk::File::kCompressed, true);
    if (!out) QMX_CORR_THROW(CannotWriteDatabase, path.c_str());
    out->writestring("/rtl/u_core/alu/add_3_reg[12]");
    out->writeuint32(258);
    if (!Vesk::File::close(out)) QMX_CORR_THROW(CannotWriteDatabase, path.c_str());

    Vesk::Stream* in = Vesk::File::open(path, Vesk::File::kRead, false);
    if (!in) QMX_CORR_THROW(CannotReadDatabase, path.c_str());
    Vesk::StringBase<char> name;
    in->readstring(name);
    const unsigned value = in->readuint32();
    Vesk::File::close(in);
    std::cout << "read back: " << name << " " << value << " (" << Vesk::File::getsize_noopen(path)
              << " bytes on disk)\n";

    const Vesk::StringBase<char> dbPath = path + ".cpd";
    {
        Qmx_CorrDb_Internal db(dbPath);
        Qmx_CorrStream* stream = db.OpenStream("lineage", 6);
        stream->WriteString("/syn/u_core/alu/add_3_reg[12] <- /rtl/u_core/alu/add_3");
        stream->WriteUINT32(3);
        db.CloseStream(stream);
        db.Commit();
    }
    {
        Qmx_CorrDb_Internal db(dbPath);
        Qmx_CorrStream* stream = db.OpenStream("lineage", 1);
        const Vesk::StringBase<char> text = stream->ReadString();
        std::cout << "database " << dbPath << " (" << Vesk::File::getsize_noopen(dbPath)
                  << " bytes) holds: " << text << " (stage " << stream->ReadUINT32() << ")\n";
        db.CloseStream(stream);
    }
    Vesk::File::remove_f(dbPath);

    try {
        QMX_CORR_THROW(InvalidDatabaseFormat, path.c_str());
    } catch (const Qmx_CorrException::Base& e) {
        std::cout << "a host sees: " << e.what();
        std::cout << "raised in " << e.getComponent() << " " << e.getSourceFile() << "("
                  << e.getLine() << ")\n";
    }
    Qmx_CorrDbg::Println(std::cout, 1, "%s", "dump lines are indented by three spaces a level");
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    std::cout.setf(std::ios::unitbuf);  // keep the order of traces and output
    const Vesk::StringBase<char> path = argc > 1 ? argv[1] : "example.bin";
    try {
        const int status = Run(path);
        Vesk::File::remove_f(path);
        return status;
    } catch (const Vesk::Exception& e) {
        std::cerr << "corr_example: " << e.what() << "\n";
        return 1;
    }
}
