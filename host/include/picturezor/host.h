#pragma once
#include <cstdint>
#include <exception>
#include <filesystem>
#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace picturezor {

/// The module can't be loaded, or lacks a method that was asked for.
class ModuleError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

/// An exception that the module raised in the host.
class HostException : public std::runtime_error {
 public:
  /// Of the class that is named.
  HostException(std::string className, const std::string& message)
      : std::runtime_error(message), Name(std::move(className)) {}
  /// "OutOfBoundsException" or "NilObjectException".
  const std::string& ClassName() const { return Name; }

 private:
  std::string Name;
};

/// The ways in which a host can hold the pixels of its pictures: in a GWorld of 32, 24 or 16 bits, in one of
/// three forms that nobody can look into but that can be drawn, in a table of rows, or in a way that can't be
/// asked for at all.
enum class PictureForm { GWorld32, GWorld24, GWorld16, Form1, Form2, Form3, Rows, None };

/// The host that the module runs in: object model, strings, memory blocks, events, exceptions and services.
///
/// There is one a process, since the module keeps process-wide state and stays loaded. Different pictures may
/// be used on different threads at once; one picture, or other object, belongs to one thread at a time. So
/// each of several threads that read one picture takes a view of its own. A factory and the hook of `OnYield`
/// are called on the thread whose call needs them. What else is set here is set while no other thread is in
/// the host.
class Host {
 public:
  /// What the module finds at load, and for good.
  struct Options {
    /// The version that the host says it has.
    double Version = 2011.01;
    /// Names of services that this host doesn't know.
    std::vector<std::string> Hidden{};
    /// How its pictures hold their pixels. The module takes the first one that it meets for all.
    PictureForm Pictures = PictureForm::GWorld32;
    /// Bytes of a pixel in a new GWorld of 24 bits, 3 or 4; not checked.
    int BytesOfDepth24 = 3;
  };

  ///@{
  /// Loads the module; once more with the same path does nothing, whatever the options. Throws ModuleError
  /// for a file that isn't a module, and where another one is loaded already.
  static void Load(const std::filesystem::path& module, const Options& options);
  static void Load(const std::filesystem::path& module) { Load(module, Options()); }
  ///@}
  /// Loads the module named by the environment variable PICTUREZOR_MODULE, or else the one beside this
  /// library or program, or where an installation puts it. Throws ModuleError where there is none.
  static void Load();
  /// Whether a module has been loaded; it stays so.
  static bool IsLoaded();
  /// A file that is installed with the module, by its path from there on: looked for beside the module that
  /// has been loaded, and then where `Load` looks for one. Empty where there is none.
  static std::filesystem::path Beside(const std::filesystem::path& file);

  /// Called when the module lets other host threads run; empty for nothing. An exception that it throws comes
  /// out of the call that yielded, once the module has returned.
  static void OnYield(std::function<void()> hook);

  /// The form of pictures that are made from now on.
  static void MakePicturesAs(PictureForm form);

  /// Hides a service from now on, or shows it again. What the module has looked up already it keeps; services
  /// of pictures and of QuickDraw fail then. A class can be hidden too, and "DrawPicture".
  static void Hide(const std::string& service, bool hidden = true);
  /// Makes services that create something fail: the next `successes` creations of objects, strings and blocks
  /// work, all later ones give null. A negative number ends it.
  static void FailCreationsAfter(int successes);

  /// What is alive now. A program that has dropped all it holds sees zeros.
  struct Alive {
    ///@{
    /// How many.
    int Objects = 0, Strings = 0, MemoryBlocks = 0;
    ///@}
    ///@{
    /// Descriptions of pictures that are open, GWorlds, and times that pixels were locked and not unlocked.
    int OpenDescriptions = 0, GWorlds = 0, PixelLocks = 0;
    ///@}
    /// Whether all of them are equal.
    bool operator==(const Alive&) const = default;
  };
  /// What is alive now, counted over all threads.
  static Alive Count();
  /// Objects of one class that are alive; 0 for an unknown class.
  static int CountOf(std::string_view className);

  /// A row as the module declares it.
  struct MethodInfo {
    /// As in "HMirror" or "Channel(index as integer) as PictureZOR".
    std::string Declaration;
    /// As they stand in the row.
    std::uintptr_t Flags;
    /// Whether the method can stand on the left of an assignment.
    bool Assignable;
  };
  /// A property as the module declares it.
  struct PropertyInfo {
    ///@{
    /// As the module writes them.
    std::string Name, Type;
    ///@}
    /// As they stand in the row.
    std::uintptr_t Flags;
    /// Whether it can be set.
    bool Writable;
  };
  ///@{
  /// The vocabulary of a class, in the order of its tables. Throws ModuleError for an unknown class.
  static std::vector<MethodInfo> Methods(std::string_view className);
  static std::vector<MethodInfo> SharedMethods(std::string_view className);
  static std::vector<PropertyInfo> Properties(std::string_view className);
  ///@}
  /// The value of a constant, as its declaration says. Throws ModuleError for an unknown class or constant.
  static std::int64_t Constant(std::string_view className, std::string_view name);
  /// The names of a class's constants with their values, as the module declares them. Throws ModuleError for
  /// an unknown class.
  static std::vector<std::string> ConstantDeclarations(std::string_view className);
};

}
