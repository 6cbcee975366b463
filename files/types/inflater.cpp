#include "inflater.h"

#ifdef PICTUREZOR_ISAL
#include <isa-l/crc.h>
#include <isa-l/igzip_lib.h>
#else
#include <zlib.h>

#include <new>
#endif

#include <algorithm>

#include "failure.h"

namespace picturezor::files {

namespace {

constexpr std::size_t MostAtOnce = 1 << 30;

}

#ifdef PICTUREZOR_ISAL

struct Inflater::State {
  inflate_state Stream;
};

Inflater::Inflater() : Of(std::make_unique<State>()) {
  isal_inflate_init(&Of->Stream);
  Of->Stream.crc_flag = ISAL_ZLIB;
}

void Inflater::Unpack(std::span<const std::uint8_t>& in, std::span<std::uint8_t>& out) {
  inflate_state& stream = Of->Stream;
  const std::size_t given = std::min(in.size(), MostAtOnce), room = std::min(out.size(), MostAtOnce);
  stream.next_in = const_cast<std::uint8_t*>(in.data());
  stream.avail_in = std::uint32_t(given);
  stream.next_out = out.data();
  stream.avail_out = std::uint32_t(room);
  switch (isal_inflate(&stream)) {
    case ISAL_DECOMP_OK:
    case ISAL_END_INPUT:
    case ISAL_OUT_OVERFLOW: break;
    case ISAL_INVALID_LOOKBACK: throw Failure("invalid distance too far back");
    case ISAL_INCORRECT_CHECKSUM: throw Failure("incorrect data check");
    case ISAL_INVALID_WRAPPER:
    case ISAL_UNSUPPORTED_METHOD:
    case ISAL_NEED_DICT: throw Failure("incorrect header check");
    default: throw Failure("invalid code in packed data");
  }
  in = in.subspan(given - stream.avail_in);
  out = out.subspan(room - stream.avail_out);
}

bool Inflater::Ended() const { return Of->Stream.block_state == ISAL_BLOCK_FINISH; }

std::uint32_t Inflater::Checksum(std::uint32_t before, std::span<const std::uint8_t> bytes) {
  return crc32_gzip_refl(before, bytes.data(), bytes.size());
}

#else

struct Inflater::State {
  z_stream Stream{};
  bool Ended = false;
  State() {
    if (inflateInit(&Stream) != Z_OK) throw std::bad_alloc();
  }
  State(const State&) = delete;
  ~State() { inflateEnd(&Stream); }
};

Inflater::Inflater() : Of(std::make_unique<State>()) {}

void Inflater::Unpack(std::span<const std::uint8_t>& in, std::span<std::uint8_t>& out) {
  z_stream& stream = Of->Stream;
  const std::size_t given = std::min(in.size(), MostAtOnce), room = std::min(out.size(), MostAtOnce);
  stream.next_in = const_cast<std::uint8_t*>(in.data());
  stream.avail_in = uInt(given);
  stream.next_out = out.data();
  stream.avail_out = uInt(room);
  switch (inflate(&stream, Z_NO_FLUSH)) {
    case Z_STREAM_END: Of->Ended = true; break;
    case Z_OK:
    case Z_BUF_ERROR: break;
    case Z_MEM_ERROR: throw std::bad_alloc();
    default: throw Failure(stream.msg ? stream.msg : "invalid packed data");
  }
  in = in.subspan(given - stream.avail_in);
  out = out.subspan(room - stream.avail_out);
}

bool Inflater::Ended() const { return Of->Ended; }

std::uint32_t Inflater::Checksum(std::uint32_t before, std::span<const std::uint8_t> bytes) {
  // Without a place zlib takes it for a question.
  return bytes.empty() ? before : std::uint32_t(crc32_z(before, bytes.data(), bytes.size()));
}

#endif

Inflater::~Inflater() = default;

}
