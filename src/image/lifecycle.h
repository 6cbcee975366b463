#pragma once
#include <utility>

#include "frame/host_services.h"
#include "image/picture_data.h"

namespace zor {

/// One more reference to a host object; the object again. Nil stays nil.
template <class Object>
Object* Locked(Object* object) {
  if (object) REALLockObject(object);
  return object;
}
/// Gives a reference back. Nil is ignored.
inline void Unlock(void* object) {
  if (object) REALUnlockObject(object);
}

/// A constructor builds a picture once: on one that was built before, closed or not, it does nothing.
inline bool IsNew(const PictureData& data) { return !data.Valid && !data.Samples; }

/// A new, empty object of the class with a reference for the caller; nil when the host has none to give.
PictureZOR* NewPictureObject();

/// Whether a factory is asked when a picture is made for this one.
bool HasFactory(const PictureData& data);

/// A picture of at least the given size that the picture's own factory gives, or the global one, with a
/// reference for the caller; nil without a factory that gives one. `data` may be null.
PictureZOR* AskFactories(const PictureData* data, std::int32_t width, std::int32_t height,
                         std::int32_t format);

/// A new picture in plain memory, with a reference for the caller; nil when there is none.
PictureZOR* NewPictureInMemory(std::int32_t width, std::int32_t height, std::int32_t format);

/// A new picture of at least the given size, with a reference for the caller: from the picture's own factory,
/// from the global one, or else in plain memory. A factory may give a larger picture, or another format. Nil
/// when there is none. `data` may be null.
PictureZOR* CreatePictureThroughFactory(const PictureData* data, std::int32_t width, std::int32_t height,
                                        std::int32_t format);

/// One reference to a picture, given back at the end of the scope unless it is handed on.
class Held {
 public:
  explicit Held(PictureZOR* object) : Of(object) {}
  Held(Held&& other) noexcept : Of(other.HandOn()) {}
  Held& operator=(Held&& other) noexcept {
    std::swap(Of, other.Of);
    return *this;
  }
  ~Held() { Unlock(Of); }
  explicit operator bool() const { return Of != nullptr; }
  PictureZOR* Object() const { return Of; }
  PictureData& Data() const { return DataOf(Of); }
  PictureZOR* HandOn() { return std::exchange(Of, nullptr); }

 private:
  PictureZOR* Of;
};

}
