#include "handle.h"

#include <algorithm>
#include <unordered_map>

namespace picturezor::python {

namespace {

/// A picture that comes back from the library another way finds its own.
std::shared_ptr<State> StateOf(const Object& object) {
  static std::mutex access;
  static std::unordered_map<void*, std::weak_ptr<State>> states;
  const std::lock_guard lock(access);
  std::weak_ptr<State>& entry = states[object.Address()];
  if (auto state = entry.lock()) return state;
  // The object lives as long as its state, so its address is nobody else's until then.
  std::shared_ptr<State> state(new State, [object](State* ended) {
    {
      const std::lock_guard erasing(access);
      // Another one may be there already.
      if (const auto old = states.find(object.Address()); old != states.end() && old->second.expired())
        states.erase(old);
    }
    delete ended;
  });
  entry = state;
  return state;
}

/// What a picture's samples belong to: the host's picture, or the picture that it is a view of.
Object RootOf(const Picture& picture) {
  if (HostPicture target = picture.Target()) return target;
  Picture root = picture;
  while (Picture parent = root.Parent()) root = std::move(parent);
  return root;
}

}

Handle::Handle(Picture picture, std::shared_ptr<const Origin> origin)
    : Of(std::move(picture)), From(std::move(origin)) {
  if (!Of || !Of.Valid()) throw Failed("not enough memory or disk space for such a picture");
  Own = StateOf(Of);
  const Object root = RootOf(Of);
  At = root == Of ? Own : StateOf(root);
}

HostHandle::HostHandle(HostPicture picture) : Of(std::move(picture)), At(StateOf(Of)) {}

const Picture& Opened(const Handle& handle) {
  if (handle.Own->Closed) throw std::invalid_argument("the picture is closed");
  return handle.Of;
}

files::StoreOptions StoresOf(const Handle& handle) {
  if (handle.From && handle.From->Stores) return *handle.From->Stores;
  return {files::Store::Auto, files::DefaultMemoryLimit(), files::DefaultTempDirectory()};
}

AtWork::AtWork(std::initializer_list<const Turn*> turns) {
  for (const Turn* turn : turns)
    if (turn) Held[Count++] = turn->get();
  // In one order everywhere, so that no two threads wait for each other.
  std::sort(Held.begin(), Held.begin() + Count);
  Count = std::size_t(std::unique(Held.begin(), Held.begin() + Count) - Held.begin());
  ++Working;
  for (std::size_t i = 0; i < Count; ++i) Held[i]->Access.lock();
}

AtWork::~AtWork() {
  for (std::size_t i = 0; i < Count; ++i) Held[i]->Access.unlock();
  --Working;
}

Reference::Reference(py::object object)
    : Of(new py::object(std::move(object)), [](py::object* reference) {
        // At the interpreter's end there is nobody to give it back to.
        if (!Py_IsInitialized()) return;
        const py::gil_scoped_acquire locked;
        delete reference;
      }) {}

}
