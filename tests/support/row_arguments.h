#pragma once
#include "host_strings.h"
#include "picturezor/host_picture.h"
#include "picturezor/picture.h"
#include "support/every_store.h"
#include "support/row_call.h"

namespace picturezor {

/// Two small pictures of one size and format, and an object of every other type that a declaration can name:
/// enough to call any row, well or badly.
class RowArguments {
 public:
  static constexpr int Width = 7, Height = 6;

  RowArguments(StoredPicture::Kind kind, Format format);
  ~RowArguments();
  RowArguments(const RowArguments&) = delete;

  const Picture& Self() const { return First.Get(); }
  /// A value that the row can work with.
  Value Ordinary(const model::MethodEntry& row, const model::Parameter& parameter) const;
  std::vector<Value> Ordinary(const model::MethodEntry& row) const;
  /// The value of an assignment.
  Value Assigned(const model::MethodEntry& row) const;
  /// What no caller should give, but some will: extremes, nil, pictures that were closed or never built.
  std::vector<Value> Hostile(const model::TypeName& type) const;
  /// Pictures on which a row may be called though nothing can be done with them, or not much.
  const std::vector<Picture>& OddPictures() const { return Odd; }
  bool SurroundingsIntact() const { return First.SurroundingsIntact() && Second.SurroundingsIntact(); }

 private:
  StoredPicture First, Second;
  std::vector<Picture> Odd;
  HostPicture Dot;
  MemoryBlock Block, EmptyBlock;
  IntegerArray Numbers, NoNumbers, FewNumbers, ExtremeNumbers;
  TemporaryFile Path;
  FolderItem File, NoFile, Folder;
  PictureFactory Factory, EmptyFactory;
  std::vector<HostPicture> Hosts;
  model::StringRecord *Text, *EmptyText;
};

/// A picture that no constructor has run on.
Picture UnbuiltPicture();

/// False where the caller breaks a promise that the module can't test: that his block holds the rows.
bool KeepsPromises(const model::MethodEntry& row, const std::vector<Value>& arguments);

}
