#include <archive.h>
#include <archive_entry.h>

#include "failure.h"
#include "target.h"
#include "temporary_files.h"

namespace picturezor::tiles {

namespace {

struct FreeEntry {
  void operator()(archive_entry* entry) const { archive_entry_free(entry); }
};

}

struct ZipTarget::Archive {
  archive* Of = archive_write_new();
  Archive() = default;
  Archive(const Archive&) = delete;
  ~Archive() { archive_write_free(Of); }
};

ZipTarget::ZipTarget(const std::filesystem::path& file, const std::string& folder)
    : File(std::make_unique<files::OutputFile>(file)), Folder(folder), Of(std::make_unique<Archive>()) {
  Check(archive_write_set_format_zip(Of->Of));
  Check(archive_write_zip_set_compression_store(Of->Of));
  Check(archive_write_open_fd(Of->Of, File->Descriptor()));
}
ZipTarget::~ZipTarget() = default;

void ZipTarget::Check(int result) const {
  if (result != ARCHIVE_OK) throw files::Failure(File->Target(), archive_error_string(Of->Of));
}

std::unique_ptr<files::Output> ZipTarget::Begin(const std::string& name) const {
  return std::make_unique<files::OutputBytes>(Folder / name);
}

void ZipTarget::Add(files::Output& file) {
  const Bytes& bytes = static_cast<files::OutputBytes&>(file).Result;
  const std::unique_ptr<archive_entry, FreeEntry> entry(archive_entry_new());
  archive_entry_set_pathname(entry.get(), file.Target().c_str());
  archive_entry_set_size(entry.get(), std::int64_t(bytes.size()));
  archive_entry_set_filetype(entry.get(), AE_IFREG);
  archive_entry_set_perm(entry.get(), 0644);
  Check(archive_write_header(Of->Of, entry.get()));
  if (archive_write_data(Of->Of, bytes.data(), bytes.size()) != la_ssize_t(bytes.size()))
    Check(ARCHIVE_FATAL);
}

void ZipTarget::Commit() {
  Check(archive_write_close(Of->Of));
  File->Commit();
}

}
