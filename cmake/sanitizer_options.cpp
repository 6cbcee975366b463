// Linked into every program that is built with a sanitizer, so that it holds wherever one is started.

/// The sanitizer keeps a list of each thread's variables in modules that were loaded later, to look for leaks
/// behind them. For a block that the C library allocated it guesses the size from the 16 bytes before it,
/// where older C libraries kept one, if the block lies 16 bytes behind the start of a page. Workers stay
/// parked with such a block, the guess is nonsense now and then, and the search at the end runs into memory
/// that isn't there. What the module keeps a thread, two flags, leads to no memory.
extern "C" [[gnu::visibility("default")]] const char* __asan_default_options() {
  return "intercept_tls_get_addr=0";
}

/// The library behind HEIC and AVIF, and the decoders and encoders behind that, keep blocks of broken pictures and
/// of settings. What of theirs is held for a picture, files/ gives back by owners.
extern "C" [[gnu::visibility("default")]] const char* __lsan_default_suppressions() {
  return "leak:libheif\nleak:libdav1d\nleak:libde265\nleak:libaom\nleak:libx265\n";
}

/// A test forks while workers are parked; and what is suppressed is known by the older of two stacks.
extern "C" [[gnu::visibility("default")]] const char* __tsan_default_options() {
  return "die_after_fork=0:history_size=7";
}

/// A picture that arrives is mapped chunk by chunk by whoever touches it first. The others read it as soon as
/// the processor lets them, and no lock tells the sanitizer of that.
extern "C" [[gnu::visibility("default")]] const char* __tsan_default_suppressions() {
  return "race:picturezor::flow::ArrivingPicture::Show\nrace:picturezor::flow::ArrivingPicture::Hide\n";
}
