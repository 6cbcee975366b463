#pragma once
#include <filesystem>
#include <memory>
#include <string>

#include "image_file.h"
#include "output.h"

namespace picturezor::files {

// What a person names: `-` is standard input or output, everything else a file.

/// Opens an image to read. NAME[2] is the second picture of a file that has several, unless a file is called
/// just so.
std::unique_ptr<ImageReader> OpenNamed(const std::filesystem::path& name, ReadOptions options);

/// The type to write: that of `type`, a name as TypeByName knows it, or where that is empty the one that the
/// file's ending stands for. Throws UsageFailure.
const FileType& TypeToWrite(const std::filesystem::path& name, const std::string& type);
/// Nameless files that are needed on the way to standard output stand in `spool`.
std::unique_ptr<Output> OutputNamed(const std::filesystem::path& name, const FileType& type,
                                    const std::filesystem::path& spool);

}
