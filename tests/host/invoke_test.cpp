#include "invoke.h"

#include <gmock/gmock.h>

// A class of the test's own is registered, whose functions write down how they were called.

namespace picturezor::model {
namespace {

std::string Called;

template <class... Values>
void Note(const char* row, const Values&... values) {
  Called = row;
  ((Called += " " + std::to_string(values)), ...);
}

struct Instance {
  std::int32_t Number;
  unsigned char Flag;
  void* Other;
};

Instance& InstanceIn(void* object) { return *reinterpret_cast<Instance*>(InstanceOf(object)); }

std::int32_t Plain(void*, std::int32_t a) { return Note("integer", a), a + 1; }
std::int32_t OfDouble(void*, double a) { return Note("double", a), 1; }
std::int32_t OfColor(void*, std::int32_t a) { return Note("color", a), 2; }
std::int32_t WithBooleans(void*, double a, unsigned char b, unsigned char c) {
  return Note("booleans", a, b, c), 3;
}
std::int32_t WithCount(void*, double a, std::int32_t n, unsigned char b, unsigned char c) {
  return Note("count", a, n, b, c), 4;
}
void NineIntegers(void*, double a, std::int32_t b, std::int32_t c, std::int32_t d, std::int32_t e,
                  std::int32_t f, std::int32_t g, std::int32_t h, std::int32_t i, std::int32_t j) {
  Note("nine", a, b, c, d, e, f, g, h, i, j);
}
void* Same(void* self, void* dest) {
  Note("same", dest ? 1 : 0);
  Lock(dest ? dest : self);
  return dest ? dest : self;
}
std::int32_t ReadAt(void* self, std::int32_t index) { return InstanceIn(self).Number + index; }
void WriteAt(void* self, std::int32_t index, std::int32_t value) { InstanceIn(self).Number = value - index; }
std::int64_t Twice(std::int32_t a) { return std::int64_t{2} * a; }
std::int32_t GetDouble(void* self, zor::Word) { return 2 * InstanceIn(self).Number; }
void SetDouble(void* self, zor::Word, std::int32_t value) { InstanceIn(self).Number = value / 2; }

void Ended(void* self) {
  // As a class does that gives itself to somebody while it ends.
  Lock(self);
  Unlock(self);
  Note("ended", InstanceIn(self).Number);
}

template <class Function>
zor::Word Address(Function* function) {
  return reinterpret_cast<zor::Word>(function);
}

zor::MethodRecord Methods[] = {
    {Address(WithCount), 0,
     "Blur(r as double, n as integer, v as boolean=true, h as boolean=true) as integer", 4},
    {Address(WithBooleans), 0, "Blur(r as double, v as boolean=true, h as boolean = false) as integer", 4},
    {Address(OfColor), 0, "Take(a as color) as integer", 4},
    {Address(Plain), 0, "Take(a as integer) as integer", 4},
    {Address(OfDouble), 0, "Take(a as double) as integer", 4},
    {Address(NineIntegers), 0,
     "Turn(a as double, b as integer=1, c as integer=-2, d as integer=3, e as integer=4, f as integer=5, "
     "g as integer=6, h as integer=7, i as integer=8, j as integer=9)",
     4},
    {Address(Same), 0, "Same(dest as PictureZOR=nil) as PictureZOR", 4},
    {Address(ReadAt), Address(WriteAt), "At(index as integer) as integer", 4},
};
zor::MethodRecord SharedMethods[] = {{Address(Twice), 0, "Twice(a as integer) as Int64", 4}};
zor::PropertyRecord Properties[] = {
    {0, "Number", "Integer", 6, zor::DirectField, zor::DirectField, offsetof(Instance, Number), {}},
    {0, "Flag", "Boolean", 6, zor::DirectField, 0, offsetof(Instance, Flag), {}},
    {0, "Other", "PictureZOR", 6, zor::DirectField, zor::DirectField, offsetof(Instance, Other), {}},
    {0, "Doubled", "Integer", 6, Address(GetDouble), Address(SetDouble), 0, {}},
};
zor::ConstantRecord Constants[] = {{"Ten = &h0000000A", 0, 0}};

const Class& TestClass() {
  static zor::ClassRecord record = [] {
    zor::ClassRecord made{};
    made.Version = zor::RecordVersion;
    made.ClassName = "TestClass";
    made.DataSize = sizeof(Instance);
    made.DestructorFunction = Address(Ended);
    made.Methods = Methods;
    made.MethodCount = std::size(Methods);
    made.SharedMethods = SharedMethods;
    made.SharedMethodCount = std::size(SharedMethods);
    made.Properties = Properties;
    made.PropertyCount = std::size(Properties);
    made.Constants = Constants;
    made.ConstantCount = std::size(Constants);
    return made;
  }();
  static const bool registered = (Register(&record), true);
  EXPECT_TRUE(registered);
  return ClassNamed("testclass");
}

Picture NewTestObject() { return Picture(Object::Adopt(NewObject(TestClass()))); }

template <class... A>
std::string Took(const Picture& self, const char* name, const A&... arguments) {
  InvokeShort<std::int32_t>(self, name, arguments...);
  return Called;
}

TEST(Invoke, ChoosesTheRowByItsTypes) {
  const Picture self = NewTestObject();
  EXPECT_EQ(Took(self, "Take", 7), "integer 7");
  EXPECT_EQ(Took(self, "tAKE", 0.5), "double 0.500000");
  EXPECT_EQ(Took(self, "Take", Color{1, 2, 3}), "color 66051");
  EXPECT_EQ(Took(self, "Blur", 0.5), "booleans 0.500000 1 0");
  EXPECT_EQ(Took(self, "Blur", 0.5, false), "booleans 0.500000 0 0");
  EXPECT_EQ(Took(self, "Blur", 0.5, false, true), "booleans 0.500000 0 1");
  EXPECT_EQ(Took(self, "Blur", 0.5, 3), "count 0.500000 3 1 1");
  EXPECT_EQ(Took(self, "Blur", 0.5, 3, false), "count 0.500000 3 0 1");
  EXPECT_EQ(Invoke<std::int32_t>(self, "Take", 7), 8);
  EXPECT_EQ((InvokeShared<std::int64_t>("TestClass", "Twice", 0x7FFFFFFF)), 0xFFFFFFFE);

  EXPECT_THROW(Took(self, "Take"), ModuleError);
  EXPECT_THROW(Took(self, "Take", true), ModuleError);
  EXPECT_THROW(Took(self, "Take", 1, 2), ModuleError);
  EXPECT_THROW(Took(self, "Taken", 1), ModuleError);
  EXPECT_THROW(Took(Picture(), "Take", 1), ModuleError);
  EXPECT_THROW((InvokeShared<std::int64_t>("TestClass", "Take", 1)), ModuleError);
  EXPECT_THROW((InvokeShared<std::int64_t>("NoClass", "Twice", 1)), ModuleError);
}

TEST(Invoke, FillsDefaultsIn) {
  const Picture self = NewTestObject();
  InvokeShort<void>(self, "Turn", 0.25);
  EXPECT_EQ(Called, "nine 0.250000 1 -2 3 4 5 6 7 8 9");
  InvokeShort<void>(self, "Turn", 0.25, 11, 12, 13, 14, 15, 16, 17, 18);
  EXPECT_EQ(Called, "nine 0.250000 11 12 13 14 15 16 17 18 9");
  EXPECT_EQ(InvokeShort<Picture>(self, "Same"), self);
  EXPECT_EQ(Called, "same 0");
}

TEST(Invoke, AssignsThroughTheSetter) {
  const Picture self = NewTestObject();
  Assign(self, "At", 10, 3);
  EXPECT_EQ(Invoke<std::int32_t>(self, "At", 4), 11);
  EXPECT_THROW(Assign(self, "At", true, 3), ModuleError);
  EXPECT_THROW(Assign(self, "Take", 1, 3), ModuleError);
}

TEST(Invoke, ReadsAndWritesProperties) {
  const Picture self = NewTestObject();
  Set(self, "number", 21);
  EXPECT_EQ(self.IntegerProperty("Number"), 21);
  EXPECT_EQ(self.IntegerProperty("Doubled"), 42);
  Set(self, "Doubled", 10);
  EXPECT_EQ(self.IntegerProperty("NUMBER"), 5);
  EXPECT_FALSE(self.BooleanProperty("Flag"));
  InstanceIn(self.Address()).Flag = 3;  // anything but 0 is true
  EXPECT_TRUE(self.BooleanProperty("Flag"));
  EXPECT_THROW(Set(self, "Flag", true), ModuleError);
  EXPECT_THROW(self.BooleanProperty("Number"), ModuleError);
  EXPECT_THROW(self.IntegerProperty("Nothing"), ModuleError);
  EXPECT_THROW(Picture().IntegerProperty("Number"), ModuleError);
  EXPECT_EQ(Host::Constant("testCLASS", "TEN"), 10);
  EXPECT_THROW(Host::Constant("TestClass", "Eleven"), ModuleError);
}

// Catches a reference too few or too many, and a destructor that runs early, twice or never.
TEST(Objects, LiveAsLongAsTheirReferences) {
  Called.clear();
  Picture first = NewTestObject();
  Set(first, "Number", 1);
  EXPECT_EQ(first.References(), 1);
  {
    const Picture copy = first;
    EXPECT_EQ(first.References(), 2);
    Picture moved = first;
    const Picture into = std::move(moved);
    EXPECT_EQ(first.References(), 3);
  }
  EXPECT_EQ(first.References(), 1);
  EXPECT_EQ(Host::CountOf("TestClass"), 1);

  Picture holder = NewTestObject();
  Set(holder, "Number", 2);
  Set(holder, "Other", first);
  Set(holder, "Other", first);
  EXPECT_EQ(first.References(), 2);
  EXPECT_EQ(Get<Picture>(holder, "Other"), first);
  EXPECT_EQ(first.References(), 2);
  EXPECT_EQ(InvokeShort<Picture>(holder, "Same", first), first);
  EXPECT_EQ(first.References(), 2);
  first = Picture();
  EXPECT_EQ(Called, "same 1");
  EXPECT_EQ(Host::CountOf("TestClass"), 2);
  holder = Picture();
  EXPECT_EQ(Called, "ended 1") << "the object that the other one held ends last";
  EXPECT_EQ(Host::CountOf("TestClass"), 0);
}

zor::MethodRecord WrongMethod[] = {{Address(Plain), 0, "Take(a as nonsense)", 4}};

TEST(Register, RefusesAWrongRow) {
  zor::ClassRecord record{};
  record.ClassName = "WrongClass";
  record.Methods = WrongMethod;
  record.MethodCount = 1;
  EXPECT_THROW(Register(&record), ModuleError);
  EXPECT_EQ(FindClass("WrongClass"), nullptr);
}

}
}
