#include <gmock/gmock.h>

#include <cstring>
#include <fstream>

#include "host_strings.h"
#include "object_model.h"
#include "support/every_store.h"

namespace picturezor::model {
namespace {

template <class Function>
Function* ServiceAs(const char* name) {
  return reinterpret_cast<Function*>(ServiceNamed(name));
}

void* BuildString(std::string_view bytes) {
  return ServiceAs<void*(const void*, std::int32_t)>("REALBuildString")(bytes.data(),
                                                                        std::int32_t(bytes.size()));
}

/// The bytes as the module finds them: behind the address in the second word.
std::string BytesBehind(const void* string) {
  std::uintptr_t words[2];
  std::memcpy(words, string, sizeof words);
  const auto& record = *static_cast<const StringRecord*>(string);
  return words[1] ? std::string(reinterpret_cast<const char*>(words[1] + 1), record.Bytes.size()) : "";
}

TEST(Strings, AreConvertedFromUTF16) {
  const auto setEncoding = ServiceAs<void(void*, std::uint32_t)>("REALSetStringEncoding");
  const auto convert = ServiceAs<void*(void*, std::uint32_t)>("REALConvertString");
  const auto unlock = ServiceAs<void(void*)>("REALUnlockString");
  struct {
    std::u16string Units;
    const char* UTF8;
  } cases[] = {
      {u"", ""},
      {u"az", "az"},
      {u"\u00E9\u20AC", "\xC3\xA9\xE2\x82\xAC"},
      {u"\U0001F600", "\xF0\x9F\x98\x80"},
      {{0xD83D}, "\xEF\xBF\xBD"},  // half a pair at the end
      {{0xDE00, u'a'},
       "\xEF\xBF\xBD"
       "a"},  // the second half alone
  };
  for (const auto& [units, text] : cases) {
    void* string = BuildString({reinterpret_cast<const char*>(units.data()), units.size() * 2});
    setEncoding(string, UTF16);
    void* converted = convert(string, UTF8);
    EXPECT_EQ(BytesBehind(converted), text);
    EXPECT_EQ(static_cast<StringRecord*>(converted)->Encoding, UTF8);
    unlock(string);
    unlock(converted);
  }
  // Other bytes stay as they are.
  void* raw = BuildString("\xFF\x01");
  setEncoding(raw, 0xFFFF);
  void* converted = convert(raw, UTF8);
  EXPECT_EQ(BytesBehind(converted), "\xFF\x01");
  unlock(raw);
  unlock(converted);
}

TEST(Strings, TurnIntoUTF16OnlyFromUTF8) {
  std::u16string units;
  EXPECT_TRUE(ToUTF16("a\xC3\xA9\xF0\x9F\x98\x80", units));
  EXPECT_EQ(units, u"a\u00E9\U0001F600");
  for (const char* wrong : {"\xFF", "\xC3",
                            "\xC3"
                            "a",
                            "\xC0\x80", "\xED\xA0\x80", "\xF4\x90\x80\x80", "\x80"})
    EXPECT_FALSE(ToUTF16(wrong, units));
}

struct Reference {
  bool Given;
  std::string Path;
  std::u16string Name;
};

Reference ReferenceTo(const FolderItem& item, bool withName) {
  static char path[4096];
  std::uint16_t name[256] = {};
  const auto ask = ServiceAs<unsigned char(void*, void*, void*)>("REALFSRefFromFolderItem");
  const bool given = ask(item.Address(), path, withName ? name : nullptr) != 0;
  if (!given) return {false, "", u""};
  return {true, path, {name + 1, name + 1 + name[0]}};
}

TEST(FolderItems, GiveReferencesInBothForms) {
  const TemporaryFile file;
  const std::string folder = file.Path().parent_path(), name = file.Path().filename();
  const FolderItem item(file.Path());
  EXPECT_FALSE(ReferenceTo(item, false).Given);
  EXPECT_EQ(ReferenceTo(item, true).Path, folder);
  EXPECT_EQ(ReferenceTo(item, true).Name, std::u16string(name.begin(), name.end()));
  std::ofstream(file.Path()) << "there";
  EXPECT_EQ(ReferenceTo(item, false).Path, file.Path());

  EXPECT_EQ(ReferenceTo(FolderItem(folder + "/\xC3\xA9"), true).Name, u"\u00E9");
  EXPECT_FALSE(ReferenceTo(FolderItem(file.Path() / "below a file"), true).Given);
  EXPECT_FALSE(ReferenceTo(FolderItem("/no such folder/file"), true).Given);
  EXPECT_FALSE(ReferenceTo(FolderItem(folder + "/" + std::string(256, 'n')), true).Given);
  EXPECT_FALSE(ReferenceTo(FolderItem(folder + "/\xFF"), true).Given);
  EXPECT_FALSE(ReferenceTo(FolderItem(), true).Given);
}

TEST(Arrays, AreReadByIndex) {
  const IntegerArray array({5, -6, 7});
  const auto bound = ServiceAs<std::int32_t(void*)>("RuntimeUBound");
  const auto read = ServiceAs<std::int32_t(void*, std::int32_t)>("RuntimeDirectReadIntArray");
  EXPECT_EQ(bound(array.Address()), 2);
  EXPECT_EQ(read(array.Address(), 1), -6);
  EXPECT_EQ(bound(nullptr), -1);
  EXPECT_EQ(bound(IntegerArray(std::vector<std::int32_t>()).Address()), -1);
  EXPECT_EQ(read(array.Address(), 3), 0);
  EXPECT_THROW(ThrowPending(), std::out_of_range);
}

TEST(Blocks, KnowTheirSize) {
  MemoryBlock block(3);
  EXPECT_THAT(block.Data(), testing::ElementsAre(0, 0, 0));
  EXPECT_EQ(Host::Count().MemoryBlocks, 1);
  std::uint8_t foreign[4] = {1, 2, 3, 4};
  const auto over = ServiceAs<void*(void*)>("PtrToMemoryBlock");
  MemoryBlock lent{Object::Adopt(over(foreign))};
  EXPECT_TRUE(lent.Data().empty());
  EXPECT_EQ(lent.Start(), foreign);
  lent.Limit(2);
  EXPECT_THAT(lent.Data(), testing::ElementsAre(1, 2));
  EXPECT_EQ(ServiceAs<void*(std::int32_t)>("newMemoryBlock")(-1), nullptr);
}

TEST(Services, CanBeHiddenAndMadeToFail) {
  EXPECT_EQ(ServiceNamed("NoSuchService"), nullptr);
  EXPECT_NE(ServiceNamed("newMemoryBlock"), nullptr);
  Host::Hide("newMemoryBlock");
  EXPECT_EQ(ServiceNamed("newMemoryBlock"), nullptr);
  Host::Hide("newMemoryBlock", false);
  EXPECT_NE(ServiceNamed("newMemoryBlock"), nullptr);

  const Picture picture(2, 2, Format::G);
  Host::FailCreationsAfter(1);
  EXPECT_FALSE(picture.RowInFormat(0, Format::G).empty());
  EXPECT_TRUE(picture.RowInFormat(0, Format::G).empty());
  EXPECT_FALSE(picture.RedChannel() || picture.GrayChannel() || picture.Clone());
  Host::FailCreationsAfter(-1);
  EXPECT_TRUE(picture.Clone().Valid());
}

}

// The name of the class and the message as the module gives them, also where only one of its classes is
// there.
TEST(Exceptions, ComeOutOfTheCall) {
  const Picture picture(2, 2, Format::G);
  EXPECT_EQ(RaisedBy([&] { picture.Channel(-1); }), "OutOfBoundsException: Channel index < 0");
  EXPECT_TRUE(picture.Channel(0).Valid()) << "an exception stayed behind";

  // The message comes after the raise; without the string there is none.
  Host::FailCreationsAfter(1);
  EXPECT_EQ(RaisedBy([&] { picture.Channel(1); }), "OutOfBoundsException: ");
  Host::FailCreationsAfter(0);
  EXPECT_FALSE(picture.Channel(1)) << "no exception object, so no exception";
  Host::FailCreationsAfter(-1);
}

TEST(Exceptions, OfAHandlerComeOutOfTheCallThatAsked) {
  const Picture picture(2, 2, Format::G);
  struct Refused {};
  picture.SetFactory(PictureFactory([](int, int, Format) -> Picture { throw Refused(); }));
  EXPECT_THROW(picture.CreatePicture(1, 1, Format::G), Refused);
  // What a call within the handler raised comes out just so.
  picture.SetFactory(PictureFactory([&](int, int, Format) { return picture.Channel(9); }));
  EXPECT_THROW(picture.CreatePicture(1, 1, Format::G), HostException);
  picture.SetFactory({});
  EXPECT_TRUE(picture.CreatePicture(1, 1, Format::G).Valid());
}

// Too few bytes never reach the module, which trusts its caller.
TEST(Bytes, AreCountedBeforeTheCall) {
  const Picture picture(3, 2, Format::RGB);
  const Samples few(5, 1), row(9, 1);
  EXPECT_THROW(picture.SetRowInFormat(0, Format::RGB, few), std::invalid_argument);
  EXPECT_THROW(picture.SetRowInFormat(0, Format::RGB, true, few), std::invalid_argument);
  EXPECT_THROW(picture.SetRowStringInFormat(0, Format::RGB, few), std::invalid_argument);
  EXPECT_THROW(picture.SetDataStringInFormat(Format::RGB, row), std::invalid_argument);
  EXPECT_THROW(picture.SetRow(0, row), std::invalid_argument);
  EXPECT_THROW(Picture(MemoryBlock(17), 3, 2, Format::RGB, 9), std::invalid_argument);
  EXPECT_THROW(Picture(MemoryBlock(39), 3, 2, Format::RGB, 20), std::invalid_argument);
  EXPECT_THROW(Picture(MemoryBlock(12), 3, 2, Format::RGB, 4), std::invalid_argument);
  EXPECT_TRUE(Picture(MemoryBlock(18), 3, 2, Format::RGB, 9).Valid());
  EXPECT_FALSE(Picture(MemoryBlock(18), 3, 2, Format::RGB, -9).Valid());
}

}
