#pragma once

#include <cstdint>
#include <optional>

#include "platform/files/FileManager.h"
#include "platform/net/URL.h"
#include "platform/text/ByteSource.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// The whole resource of a URL: read into memory in one blocking call over http and https, as it is
/// wanted from a file.
///
/// http and https: a final status of 200 is success and nothing else is; at most 20 redirects, to
/// http and https only; a compressed body is asked for and decompressed; a body cut short is a
/// failure. On any failure gives no value and fills the slot. More than `limit` bytes, counted
/// after decompression, are a failure too, and so is more than 1 MiB that is over 50 times its
/// compressed size. The charset of the Content-Type is the encoding hint. For the stall limit see
/// TransferRequest. For a file: URL see openWholeFile.
std::optional<ByteSource> readResource(const URL& url, ErrorSlot& error, std::uint64_t limit,
                                       int stallLimit);

}  // namespace platform
