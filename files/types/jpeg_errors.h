#pragma once
// jpeglib.h needs FILE.
#include <cstdio>
// clang-format off
#include <jpeglib.h>
#include <jerror.h>
// clang-format on

#include <cerrno>
#include <csetjmp>
#include <cstring>
#include <filesystem>

#include "failure.h"

namespace picturezor::files {

/// libjpeg reports by a call that mustn't return: a jump, which becomes a Failure here.
struct JPEGErrors {
  jpeg_error_mgr Manager;
  std::jmp_buf Back;
  char Reason[JMSG_LENGTH_MAX + 32] = {};

  JPEGErrors() {
    jpeg_std_error(&Manager);
    Manager.error_exit = OnError;
    Manager.emit_message = OnMessage;
  }

  /// `call` may hold nothing that needs a destructor, since libjpeg jumps out of it.
  template <class Call>
  void Try(const std::filesystem::path& file, Call call) {
    if (setjmp(Back) == 0)
      call();
    else
      throw Failure(file, Reason);
  }

  static void OnError(j_common_ptr file) {
    auto& self = *reinterpret_cast<JPEGErrors*>(file->err);
    char message[JMSG_LENGTH_MAX];
    file->err->format_message(file, message);
    switch (file->err->msg_code) {
      case JERR_FILE_WRITE:
      case JERR_FILE_READ: std::snprintf(self.Reason, sizeof self.Reason, "%s", std::strerror(errno)); break;
      case JERR_NO_BACKING_STORE:
      case JERR_OUT_OF_MEMORY:
        std::snprintf(self.Reason, sizeof self.Reason, "%s",
                      file->is_decompressor
                          ? "a progressive JPEG of this size needs more memory than --memory-limit allows"
                          : "not enough memory");
        break;
      case JWRN_JPEG_EOF:
      case JERR_INPUT_EOF: std::snprintf(self.Reason, sizeof self.Reason, "the JPEG file is cut off"); break;
      default: std::snprintf(self.Reason, sizeof self.Reason, "corrupt JPEG: %s", message);
    }
    std::longjmp(self.Back, 1);
  }

  /// What libjpeg would make up for by gray or noise is an error.
  static void OnMessage(j_common_ptr file, int level) {
    if (level >= 0) return;
    switch (file->err->msg_code) {
      case JWRN_EXTRANEOUS_DATA:
      case JWRN_ADOBE_XFORM:
      case JWRN_JFIF_MAJOR: return;
      default: OnError(file);
    }
  }
};

}
