#include <dlfcn.h>
#include <gmock/gmock.h>

#include <fstream>
#include <functional>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "frame/records.h"
#include "picturezor/picture.h"
#include "support/in_child.h"

// What happens at load: a module loads once a process, so each case runs in a child.

namespace picturezor {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::string MessageOf(const std::function<void()>& call) {
  try {
    call();
  } catch (const ModuleError& error) {
    return error.what();
  }
  return "nothing thrown";
}

zor::PluginMain Entry() {
  void* module = dlopen(PICTUREZOR_MODULE, RTLD_NOW | RTLD_LOCAL);
  return module ? reinterpret_cast<zor::PluginMain>(dlsym(module, "REALPluginMain")) : nullptr;
}

/// A host of a few lines, which writes down what it is asked.
struct SmallHost {
  std::vector<std::string> First, Second, Calls;
  std::vector<zor::ClassRecord*> Classes;
  std::map<std::string, void*> Knows;
  double Version = 2011;
};

SmallHost& Small() {
  static SmallHost host;
  return host;
}

template <class Function>
void* AddressOf(Function* function) {
  return reinterpret_cast<void*>(function);
}

void* AskSecond(const char* name) {
  Small().Second.push_back(name);
  const auto found = Small().Knows.find(name);
  return found == Small().Knows.end() ? nullptr : found->second;
}

void* AskFirst(const char* name) {
  Small().First.push_back(name);
  return AskSecond(name);
}

void PluginVersion(std::int32_t version) { Small().Calls.push_back("version " + std::to_string(version)); }
double HostVersion() {
  Small().Calls.push_back("host version");
  return Small().Version;
}
void RegisterClass(void* record) {
  Small().Classes.push_back(static_cast<zor::ClassRecord*>(record));
  Small().Calls.push_back(std::string("class ") + Small().Classes.back()->ClassName);
}

void KnowEverything() {
  Small().Knows = {{"ResolverPPC", AddressOf(AskSecond)},
                   {"RegisterPluginVersion", AddressOf(PluginVersion)},
                   {"REALGetRBVersion", AddressOf(HostVersion)},
                   {"PluginRegisterClass", AddressOf(RegisterClass)}};
}

// Catches another order, a name asked of the first resolver, and a wrong word in a record.
TEST(Load, ShowsItsRecordsToAnyHost) {
  InChild([] {
    KnowEverything();
    Entry()(AskFirst);
    SmallHost& host = Small();
    EXPECT_THAT(host.First, ElementsAre("ResolverPPC"));
    EXPECT_THAT(host.Calls,
                ElementsAre("version 9", "host version", "class PictureZOR", "class PictureFactoryZOR"));
    ASSERT_EQ(host.Classes.size(), 2u);

    const zor::ClassRecord &picture = *host.Classes[0], &factory = *host.Classes[1];
    EXPECT_EQ(picture.Version, 9u);
    EXPECT_EQ(picture.SuperName, nullptr);
    EXPECT_EQ(picture.DataSize % 16, 0u);
    const std::size_t least = 256;
    EXPECT_GE(picture.DataSize, least);
    EXPECT_TRUE(sizeof(void*) > 4 || picture.DataSize == least);
    EXPECT_EQ(picture.ConstructorFunction, 0u);
    EXPECT_NE(picture.DestructorFunction, 0u);
    EXPECT_EQ(picture.ClassFlags, 4u);
    EXPECT_EQ(picture.EventCount, 0u);

    EXPECT_EQ(factory.Version, 9u);
    EXPECT_EQ(factory.DataSize, 0u);
    EXPECT_EQ(factory.DestructorFunction, 0u);
    EXPECT_EQ(factory.MethodCount + factory.PropertyCount + factory.ConstantCount, 0u);
    ASSERT_EQ(factory.SharedMethodCount, 1u);
    EXPECT_STREQ(factory.SharedMethods[0].Declaration, "SetFactory(factory as PictureFactoryZOR)");
    EXPECT_EQ(factory.SharedMethods[0].Flags, 4u);
    ASSERT_EQ(factory.EventCount, 1u);
    EXPECT_STREQ(factory.Events[0].Declaration,
                 "NewPictureZOR(Width as integer, Height as integer, ImageFormat as integer) as PictureZOR");
    EXPECT_EQ(factory.ClassFlags, 4u);
  });
}

/// The rows of a class as a host is shown them, a line each.
std::string LinesOf(const zor::ClassRecord& record) {
  std::ostringstream lines;
  const auto method = [&](const char* kind, std::size_t number, const zor::MethodRecord& row) {
    lines << kind << ' ' << number << " 0x" << std::hex << row.Flags << std::dec
          << (row.Setter ? " assigned " : " ") << row.Declaration << '\n';
  };
  for (std::size_t i = 0; i < record.MethodCount; ++i) method("method", i + 1, record.Methods[i]);
  for (std::size_t i = 0; i < record.PropertyCount; ++i) {
    const zor::PropertyRecord& row = record.Properties[i];
    const zor::Word others[] = {row.Group, row.Reserved[0], row.Reserved[1], row.Reserved[2]};
    EXPECT_THAT(others, testing::Each(0u));
    lines << "property " << i + 1 << " 0x" << std::hex << row.Flags << std::dec << ' ' << row.Name << " as "
          << row.Type << (row.Getter == zor::DirectField ? ", read in the record" : ", read by a function")
          << (row.Setter == 0                  ? ", read-only"
              : row.Setter == zor::DirectField ? ", written in the record"
                                               : ", written by a function")
          << '\n';
  }
  for (std::size_t i = 0; i < record.ConstantCount; ++i) {
    EXPECT_EQ(record.Constants[i].Reserved | record.Constants[i].Value, 0u);
    lines << "constant " << record.Constants[i].Declaration << '\n';
  }
  for (std::size_t i = 0; i < record.SharedMethodCount; ++i) method("shared", i + 1, record.SharedMethods[i]);
  return lines.str();
}

// Catches a row, a flag, a setter or a constant that isn't what programs were written for. The file is kept
// by hand; nothing prints it.
TEST(Load, HandsOverTheClassThatProgramsKnow) {
  InChild([] {
    KnowEverything();
    Small().Version = 0;
    Entry()(AskFirst);
    ASSERT_EQ(Small().Classes.size(), 2u);
    const zor::ClassRecord& picture = *Small().Classes[0];
    std::ifstream file(PICTUREZOR_SOURCE_DIR "/tests/load/picture_class.txt");
    std::ostringstream known;
    known << file.rdbuf();
    EXPECT_EQ(LinesOf(picture), known.str());
    // A colour arrives as an integer does.
    for (const auto& [ofIntegers, ofColours] : {std::pair{0, 3}, {1, 4}, {5, 8}, {6, 9}})
      EXPECT_EQ(picture.Methods[ofIntegers].Function, picture.Methods[ofColours].Function);
  });
}

// Catches a service that is called though it didn't resolve, and one remembered as missing for good.
TEST(Load, LivesWithServicesThatAreMissing) {
  for (const char* missing :
       {"ResolverPPC", "RegisterPluginVersion", "REALGetRBVersion", "PluginRegisterClass"}) {
    SCOPED_TRACE(missing);
    InChild([&] {
      KnowEverything();
      Small().Knows.erase(missing);
      Entry()(AskFirst);
      const std::string name = missing;
      const bool registers = name != "ResolverPPC" && name != "PluginRegisterClass";
      EXPECT_EQ(Small().Classes.size(), registers ? 2u : 0u);
    });
  }
  InChild([] { Entry()(nullptr); });
  InChild([] {
    Host::Load(PICTUREZOR_MODULE, {.Version = 2011, .Hidden = {"newMemoryBlock", "REALBuildString"}});
    const Picture picture(3, 2, Format::RGB);
    EXPECT_TRUE(picture.Row(0).empty());
    EXPECT_TRUE(picture.DataStringInFormat(Format::RGB).empty());
    EXPECT_EQ(picture.ImageFormatString(), "");
    Host::Hide("newMemoryBlock", false);
    Host::Hide("REALBuildString", false);
    EXPECT_EQ(picture.Row(0).size(), 64u);
    EXPECT_EQ(picture.ImageFormatString(), "RGB");
  });
  // Without the services for exceptions a method still returns its failure value.
  for (const char* hidden : {"PluginNewInstance", "RuntimeRaiseException", "REALSetPropValueString"})
    InChild([&] {
      SCOPED_TRACE(hidden);
      Host::Load(PICTUREZOR_MODULE, {.Version = 2011, .Hidden = {hidden}});
      const Picture picture(3, 2, Format::RGB);
      bool raised = false;
      try {
        EXPECT_TRUE(picture.Row(2).empty());
      } catch (const HostException& exception) {
        raised = true;
        EXPECT_STREQ(exception.what(), "");
      }
      EXPECT_EQ(raised, std::string(hidden) == "REALSetPropValueString");
    });
}

std::map<std::string, std::uintptr_t> PropertyFlags() {
  std::map<std::string, std::uintptr_t> flags;
  for (const auto& property : Host::Properties("PictureZOR")) flags[property.Name] = property.Flags;
  return flags;
}

// Rows that deal with host pictures are shown by hosts that have their new kind, from 2010.029 on.
TEST(Load, SetsFlagsByTheVersionOfTheHost) {
  struct {
    double Version;
    bool Known, Changed;
  } cases[] = {{2010.028, true, false},
               {2010.029, true, true},
               {2011.01, true, true},
               {0, true, false},
               {2011.01, false, false}};
  for (const auto& [version, known, changed] : cases)
    InChild([&] {
      SCOPED_TRACE(version);
      const std::vector<std::string> none, noVersion = {"REALGetRBVersion"};
      Host::Load(PICTUREZOR_MODULE, {.Version = version, .Hidden = known ? none : noVersion});
      auto flags = PropertyFlags();
      for (const char* name : {"DebugPictureEnabled", "DebugPicture", "Target"}) {
        EXPECT_EQ(flags[name], changed ? 0x40006u : 0x40002u) << name;
        flags.erase(name);
      }
      for (const auto& [name, value] : flags) EXPECT_EQ(value, 6u) << name;
      for (const auto& row : Host::Methods("PictureZOR")) {
        const bool hostPictures = row.Flags & 0x40000;
        const std::uintptr_t others = row.Declaration.starts_with("Combine(") ? 0 : 4;
        EXPECT_EQ(row.Flags, !hostPictures ? others : changed ? 0x40004u : 0x40000u) << row.Declaration;
      }
    });
}

TEST(Load, HappensOnce) {
  EXPECT_THAT(MessageOf([] { Host::Load("/no/such/module.so"); }), HasSubstr("can't be loaded"));
  EXPECT_FALSE(Host::IsLoaded());
  EXPECT_THAT(MessageOf([] { Picture(1, 1, Format::G); }), HasSubstr("no module is loaded"));
  InChild([] {
    Host::Load(PICTUREZOR_MODULE);
    Host::Load(PICTUREZOR_MODULE);
    EXPECT_THAT(MessageOf([] { Host::Load("/no/such/module.so"); }), HasSubstr("loaded already"));
    EXPECT_EQ(Host::Count(), Host::Alive());
  });
}

}
}
