// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

namespace quilt::cli {

/// What the user asked for, before anything was looked at: the parser makes it, a Delegate carries it out. Objects and
/// files are as they were typed.

struct ImportRequest {
  std::vector<std::string> files{};
  bool filesFromInput = false;  ///< more files are listed on the standard input …
  bool nulSeparated = false;    ///< … ended by NUL bytes, else by line ends
  std::optional<std::string> collection{};
  bool operator==(const ImportRequest&) const = default;
};

struct ListRequest {
  std::optional<std::string> collection{};
  bool operator==(const ListRequest&) const = default;
};

struct ShowRequest {
  std::string object;
  bool operator==(const ShowRequest&) const = default;
};

struct InfoRequest {
  std::vector<std::string> files{};
  bool operator==(const InfoRequest&) const = default;
};

struct NewCollectionRequest {
  std::string title;
  bool operator==(const NewCollectionRequest&) const = default;
};

struct NewDocumentRequest {
  std::string title;
  std::optional<std::string> collection{};
  std::string type;
  bool operator==(const NewDocumentRequest&) const = default;
};

struct SetRequest {
  std::string object;
  std::vector<std::pair<std::string, std::string>> values{};  ///< key and value; an empty value clears
  bool operator==(const SetRequest&) const = default;
};

struct AddRequest {
  /// What the sources become: an item each, one item of all, or companions of an item that is there.
  enum class Kind { Items, Montage, DualSource, Extras, Commentary };
  std::string document;
  std::vector<std::string> sources{};  ///< files and web addresses
  Kind kind = Kind::Items;
  std::optional<std::string> title{};
  std::optional<std::string> commentary{};  ///< a file, for new items
  std::vector<double> timecodes{};          ///< seconds, of the sources in their order
  std::optional<std::string> item{};        ///< whom Extras and Commentary go with
  bool operator==(const AddRequest&) const = default;
};

struct MoveRequest {
  std::string document;
  std::vector<std::string> items{};
  std::size_t to = 0;  ///< the place of the first of them after the move
  bool operator==(const MoveRequest&) const = default;
};

struct ConvertRequest {
  std::string document;
  std::vector<std::string> formats{};  ///< never empty
  bool operator==(const ConvertRequest&) const = default;
};

struct RemoveRequest {
  std::vector<std::string> objects{};
  std::optional<std::string>
      from;  ///< the document that holds the items; none: `objects` is one document or collection
  bool force = false;
  bool operator==(const RemoveRequest&) const = default;
};

struct ExportRequest {
  std::string document;
  std::string folder;
  bool zip = false;
  std::vector<std::string> formats{};  ///< never empty
  std::optional<std::string> theme{};
  bool operator==(const ExportRequest&) const = default;
};

struct FinalizeRequest {
  std::string document;
  bool operator==(const FinalizeRequest&) const = default;
};

struct BuildRequest {
  std::string manifest;
  std::string output;  ///< a folder
  bool zip = false;
  std::vector<std::string> formats{};  ///< empty: the manifest says
  std::optional<std::string> theme{};
  bool operator==(const BuildRequest&) const = default;
};

struct ThemesRequest {
  bool operator==(const ThemesRequest&) const = default;
};

struct CheckRequest {
  std::vector<std::string> documents{};  ///< empty: all of the library
  bool operator==(const CheckRequest&) const = default;
};

struct ServeRequest {
  std::string document;
  std::uint16_t port = 0;  ///< 0: any that is free
  bool open = false;       ///< in the user's browser
  bool operator==(const ServeRequest&) const = default;
};

struct DoctorRequest {
  bool operator==(const DoctorRequest&) const = default;
};

struct HelpRequest {
  std::optional<std::string> command{};
  std::string as = "text";  ///< "text", "man" (a manual page), "bash", "zsh" or "fish" (completions)
  bool operator==(const HelpRequest&) const = default;
};

struct VersionRequest {
  bool operator==(const VersionRequest&) const = default;
};

using Command =
    std::variant<ImportRequest, ListRequest, ShowRequest, InfoRequest, NewCollectionRequest, NewDocumentRequest,
                 SetRequest, AddRequest, MoveRequest, ConvertRequest, RemoveRequest, ExportRequest, FinalizeRequest,
                 BuildRequest, ThemesRequest, CheckRequest, ServeRequest, DoctorRequest, HelpRequest, VersionRequest>;

enum class ProgressStyle { Automatic, Json, None };

/// What holds for every command.
struct Settings {
  std::optional<std::string> library{};  ///< as typed; none: the environment says
  bool json = false;
  bool quiet = false;
  bool verbose = false;
  bool noColor = false;
  bool dryRun = false;
  ProgressStyle progress = ProgressStyle::Automatic;
  std::chrono::milliseconds wait{0};  ///< for what another process is changing
  bool operator==(const Settings&) const = default;
};

struct Request {
  Settings settings;
  Command command;
  bool operator==(const Request&) const = default;
};

}  // namespace quilt::cli
