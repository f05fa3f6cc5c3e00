// SPDX-License-Identifier: Apache-2.0
#include "cli/Options.h"

#include <algorithm>
#include <charconv>
#include <cmath>

#include "cli/Failure.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

[[noreturn]] void refuse(std::string message) { throw Failure(ExitCode::Usage, std::move(message)); }

Command importRequest(const Arguments& arguments) {
  ImportRequest request;
  request.nulSeparated = arguments.has("-0");
  request.filesFromInput = request.nulSeparated;
  for (std::string& file : arguments.all("FILE")) {
    if (file == "-") {
      request.filesFromInput = true;
    } else {
      request.files.push_back(std::move(file));
    }
  }
  if (request.files.empty() && !request.filesFromInput) refuse("FILE is missing: name the files to import");
  request.collection = arguments.first("--collection");
  return request;
}

Command listRequest(const Arguments& arguments) { return ListRequest{arguments.first("COLLECTION")}; }

Command showRequest(const Arguments& arguments) { return ShowRequest{*arguments.first("OBJECT")}; }

Command infoRequest(const Arguments& arguments) { return InfoRequest{arguments.all("FILE")}; }

Command newRequest(const Arguments& arguments) {
  const std::string title = *arguments.first("TITLE");
  if (title.empty()) refuse("TITLE is empty");
  if (!isText(title)) refuse("TITLE is not UTF-8, or has control characters");
  if (arguments.first("KIND") == "document")
    return NewDocumentRequest{title, arguments.first("--collection"),
                              arguments.first("--type").value_or("Interactive")};
  for (const char* option : {"--collection", "--type"})
    if (arguments.has(option)) refuse(std::string(option) + " goes with \"new document\" only");
  return NewCollectionRequest{title};
}

Command setRequest(const Arguments& arguments) {
  SetRequest request{*arguments.first("OBJECT"), {}};
  for (const std::string& assignment : arguments.all("KEY=VALUE")) {
    const std::size_t equals = assignment.find('=');
    if (equals == std::string::npos || equals == 0) refuse(inQuotes(assignment) + " is not of the form KEY=VALUE");
    const std::string key = assignment.substr(0, equals);
    for (const auto& [earlier, value] : request.values)
      if (earlier == key) refuse(inQuotes(key) + " is given twice");
    const std::string value = assignment.substr(equals + 1);
    // Any bytes can be a file's name.
    if (key != "poster" && key != "theme" && !isText(value))
      refuse("The value of " + inQuotes(key) + " is not UTF-8, or has control characters");
    request.values.emplace_back(key, value);
  }
  return request;
}

double readTimecode(const std::string& text) {
  double seconds = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), seconds);
  if (error != std::errc() || end != text.data() + text.size() || !std::isfinite(seconds) || seconds < 0)
    refuse("--timecode is a number of seconds, not " + inQuotes(text));
  return seconds;
}

AddRequest::Kind kindOf(const Arguments& arguments) {
  struct Choice {
    const char* option;
    AddRequest::Kind kind;
  };
  constexpr Choice choices[] = {{"--montage", AddRequest::Kind::Montage},
                                {"--dual", AddRequest::Kind::DualSource},
                                {"--extra-of", AddRequest::Kind::Extras},
                                {"--commentary-of", AddRequest::Kind::Commentary}};
  const Choice* chosen = nullptr;
  for (const Choice& choice : choices) {
    if (!arguments.has(choice.option)) continue;
    if (chosen) refuse(std::string(chosen->option) + " and " + choice.option + " do not go together");
    chosen = &choice;
  }
  return chosen ? chosen->kind : AddRequest::Kind::Items;
}

Command addRequest(const Arguments& arguments) {
  AddRequest request{*arguments.first("DOCUMENT"), arguments.all("SOURCE"), kindOf(arguments),
                     arguments.first("--title"), arguments.first("--commentary")};
  using Kind = AddRequest::Kind;
  if (request.kind == Kind::Extras) request.item = arguments.first("--extra-of");
  if (request.kind == Kind::Commentary) request.item = arguments.first("--commentary-of");
  for (const std::string& text : arguments.all("--timecode")) request.timecodes.push_back(readTimecode(text));

  const bool areMany = request.sources.size() > 1 && request.kind != Kind::Montage && request.kind != Kind::DualSource;
  if (request.title && !isText(*request.title)) refuse("--title is not UTF-8, or has control characters");
  if (request.title && areMany) refuse("--title goes with one item; add the files one by one");
  if (request.commentary && areMany) refuse("--commentary goes with one item; add the files one by one");
  if (request.commentary && request.item) refuse("--commentary goes with new items only");
  if (request.kind == Kind::Commentary && areMany) refuse("An item has one commentary: name one file");
  if (request.timecodes.size() > request.sources.size()) refuse("There are more timecodes than sources");
  return request;
}

Command moveRequest(const Arguments& arguments) {
  MoveRequest request{*arguments.first("DOCUMENT"), arguments.all("ITEM"), 0};
  const std::optional<std::string> to = arguments.first("--to");
  if (!to) refuse("--to is missing: name the place to move to, counted from 0");
  const auto [end, error] = std::from_chars(to->data(), to->data() + to->size(), request.to);
  if (error != std::errc() || end != to->data() + to->size())
    refuse("--to is a place counted from 0, not " + inQuotes(*to));
  return request;
}

std::vector<std::string> formatsOf(const Arguments& arguments) {
  std::vector<std::string> formats;
  for (std::string& format : arguments.all("--format"))
    if (std::find(formats.begin(), formats.end(), format) == formats.end()) formats.push_back(std::move(format));
  return formats;
}

Command convertRequest(const Arguments& arguments) {
  ConvertRequest request{*arguments.first("DOCUMENT"), formatsOf(arguments)};
  if (request.formats.empty()) refuse("--format is missing: name Desktop, 720p or 480p");
  return request;
}

Command removeRequest(const Arguments& arguments) {
  RemoveRequest request{arguments.all("OBJECT"), arguments.first("--from"), arguments.has("--force")};
  if (!request.from && request.objects.size() > 1)
    refuse("Remove one document or collection at a time; items take --from DOCUMENT");
  return request;
}

Command exportRequest(const Arguments& arguments) {
  ExportRequest request{*arguments.first("DOCUMENT"), *arguments.first("DIR"), arguments.has("--zip"),
                        formatsOf(arguments), arguments.first("--theme")};
  if (request.formats.empty()) request.formats.emplace_back("Desktop");
  return request;
}

Command finalizeRequest(const Arguments& arguments) { return FinalizeRequest{*arguments.first("DOCUMENT")}; }

Command buildRequest(const Arguments& arguments) {
  const std::optional<std::string> output = arguments.first("--output");
  if (!output) refuse("--output is missing: name the folder to write the package into");
  return BuildRequest{*arguments.first("MANIFEST"), *output, arguments.has("--zip"), formatsOf(arguments),
                      arguments.first("--theme")};
}

Command themesRequest(const Arguments&) { return ThemesRequest{}; }

Command checkRequest(const Arguments& arguments) { return CheckRequest{arguments.all("DOCUMENT")}; }

Command serveRequest(const Arguments& arguments) {
  ServeRequest request{*arguments.first("DOCUMENT"), 0, arguments.has("--open")};
  if (const std::optional<std::string> port = arguments.first("--port")) {
    const auto [end, error] = std::from_chars(port->data(), port->data() + port->size(), request.port);
    if (error != std::errc() || end != port->data() + port->size() || request.port == 0)
      refuse("--port is a number from 1 to 65535, not " + inQuotes(*port));
  }
  return request;
}

Command doctorRequest(const Arguments&) { return DoctorRequest{}; }

Command helpRequest(const Arguments& arguments) {
  HelpRequest request{arguments.first("COMMAND"), arguments.first("--as").value_or("text")};
  if (request.command && request.as != "text" && request.as != "man")
    refuse("Completions are for all commands together; leave COMMAND out");
  return request;
}

constexpr std::string_view kObject =
    "A DOCUMENT or COLLECTION is named by its UUID, by the beginning of it, by its title or by its path;\n"
    "an ITEM of a document by its UUID or the beginning of it.\n";

}  // namespace

std::vector<std::string> Arguments::all(std::string_view name) const {
  const auto found = _values.find(std::string(name));
  return found == _values.end() ? std::vector<std::string>() : found->second;
}

std::optional<std::string> Arguments::first(std::string_view name) const {
  const auto found = _values.find(std::string(name));
  if (found == _values.end()) return std::nullopt;
  return found->second.front();
}

const std::vector<Option>& commonOptions() {
  static const std::vector<Option> options{
      {"--library", "", "DIR",
       "the library (else $QUILT_LIBRARY, else $XDG_DATA_HOME/quilt/Library); made on first use"},
      {"--json", "", "", "print exactly one JSON document"},
      {"--progress", "", "STYLE", "auto, json (one event a line on stderr) or none", false, {"auto", "json", "none"}},
      {"--quiet", "-q", "", "print results and errors only"},
      {"--verbose", "-v", "", "print what the library logs"},
      {"--no-color", "", "", "print without colours (also: NO_COLOR)"},
      {"--help", "-h", "", "explain the program, or the command"},
      {"--version", "", "", "print the version"},
  };
  return options;
}

const std::vector<CommandDescription>& commands() {
  static const std::vector<CommandDescription> table{
      {"import",
       "make a document of each file",
       "Each file is copied into a new document of the collection \"Imports\", which is made when it is\n"
       "missing, or of the collection named. Prints a line a document: UUID, type, title. A file that\n"
       "cannot be imported is reported, and the rest is done.\n",
       {{"FILE", "a movie, an audio file, a PDF or an EPUB; \"-\": files listed on the standard input", false, true}},
       {{"--collection", "", "C", "the collection to import into"},
        {"-0", "", "", "the standard input lists files, each ended by a NUL byte"}},
       true,
       importRequest},
      {"list",
       "print the collections with their documents",
       "",
       {{"COLLECTION", "print this one alone", false}},
       {},
       false,
       listRequest},
      {"show",
       "print a document or collection with everything in it",
       kObject,
       {{"OBJECT", "a document or a collection"}},
       {},
       false,
       showRequest},
      {"info",
       "print what the library sees in a file",
       "Type identifier, MIME type, category, formats that it suits, codecs, size, duration, chapters and\n"
       "metadata. A file that cannot be used is reported with the reason.\n",
       {{"FILE", "any file", true, true}},
       {},
       false,
       infoRequest},
      {"new",
       "make an empty collection or document",
       "Prints its UUID. A document goes into the collection named, else into \"Imports\", which is made when\n"
       "it is missing.\n",
       {{"KIND", "collection or document", true, false, {"collection", "document"}}, {"TITLE", "its title"}},
       {{"--collection", "", "C", "the collection of the document"},
        {"--type",
         "",
         "T",
         "the type of the document: Interactive (the default), PDF, EPUB or Static",
         false,
         {"Interactive", "PDF", "EPUB", "Static"}}},
       true,
       newRequest},
      {"set",
       "change what describes a document, a collection or an item",
       "KEY is one of\n"
       "  of a document    title description author keywords category advisoryLabel jukeboxOrder theme poster\n"
       "  of a collection  title description author copyright keywords category advisoryLabel theme poster\n"
       "  of an item       title description\n"
       "A theme is an identifier or the path of a bundle, a poster the path of an image. An empty VALUE\n"
       "clears. Nothing is changed unless everything can be.\n",
       {{"OBJECT", "a document, a collection or an item"}, {"KEY=VALUE", "what to set", true, true}},
       {},
       true,
       setRequest},
      {"add",
       "add items to a document, or companions to an item",
       "Each SOURCE becomes an item, or all of them one montage or one dual-source item; with --extra-of they\n"
       "become extras of an item, with --commentary-of its audio commentary. Files are copied into the\n"
       "package. Prints a line an item: UUID, category, title; of companions the UUID. A file that cannot be\n"
       "added is reported, and the rest is done; of a montage or a dual-source item all or nothing.\n",
       {{"DOCUMENT", "the document"},
        {"SOURCE", "a movie, audio, image, PDF, EPUB or office file, or a web address", true, true}},
       {{"--title", "", "T", "the title (else that in the file, else its name)"},
        {"--montage", "", "", "make one montage of all images"},
        {"--dual", "", "", "make one item of two sources that play together"},
        {"--commentary", "", "FILE", "the audio commentary of the new item"},
        {"--timecode", "", "S", "seconds at which a source stands in its item; one for each, in order", true},
        {"--extra-of", "", "ITEM", "add extras to this item"},
        {"--commentary-of", "", "ITEM", "set the audio commentary of this item"}},
       true,
       addRequest},
      {"move",
       "move items of a document",
       "The items keep their order and stand together; the first of them comes to be at INDEX.\n",
       {{"DOCUMENT", "the document"}, {"ITEM", "an item of it", true, true}},
       {{"--to", "", "INDEX", "the place to move to, counted from 0"}},
       true,
       moveRequest},
      {"convert",
       "make the missing derivatives of a document",
       "Every source that is larger than a format gets a smaller copy of itself. Prints a line a new\n"
       "derivative: UUID, format, title of its source.\n",
       {{"DOCUMENT", "the document"}},
       {{"--format", "", "FORMAT", "Desktop, 720p or 480p", true, {"Desktop", "720p", "480p"}}},
       true,
       convertRequest},
      {"remove",
       "remove a document or collection, or items of a document, with the files",
       "Asks on a terminal; elsewhere --force is needed.\n",
       {{"OBJECT", "a document or a collection; with --from, items of it", true, true}},
       {{"--from", "", "DOCUMENT", "the document that holds the items"}, {"--force", "", "", "do not ask"}},
       true,
       removeRequest},
      {"export",
       "build the finished package of a document",
       "Copies, converts and finalizes what is needed, and writes a package (or its archive) of the\n"
       "document's title into DIR. Prints its path.\n",
       {{"DOCUMENT", "the document"}, {"DIR", "the folder to write into; made when it is missing"}},
       {{"--zip", "", "", "write a zip archive"},
        {"--format", "", "FORMAT", "Desktop (the default), 720p or 480p", true, {"Desktop", "720p", "480p"}},
        {"--theme", "", "THEME", "set the document's theme first: an identifier or the path of a bundle"}},
       true,
       exportRequest},
      {"finalize",
       "make a document ready to be played, in place",
       "Makes what is missing of previews and posters, applies the theme of an interactive document anew and\n"
       "writes the files that it reads.\n",
       {{"DOCUMENT", "the document"}},
       {},
       true,
       finalizeRequest},
      {"build",
       "build a finished package from a manifest",
       "The manifest is a JSON file that names title, theme, poster and items; schema/manifest.schema.json\n"
       "describes it. Relative names are meant from its folder. With --library the document is kept there, in\n"
       "the collection that the manifest names; else nothing but the package is left. When anything in the\n"
       "manifest is wrong, every problem is reported with its place, and nothing is exported. Prints the path\n"
       "of the package.\n",
       {{"MANIFEST", "the JSON file"}},
       {{"--output", "", "DIR", "the folder to write into; made when it is missing"},
        {"--zip", "", "", "write a zip archive"},
        {"--format",
         "",
         "FORMAT",
         "Desktop, 720p or 480p (else as the manifest says, else Desktop)",
         true,
         {"Desktop", "720p", "480p"}},
        {"--theme", "", "THEME", "an identifier or the path of a bundle (else as the manifest says, else Olive)"}},
       true,
       buildRequest},
      {"themes",
       "print the installed themes",
       "Identifier, name and path of each: those of the user, of the system and of the program.\n",
       {},
       {},
       false,
       themesRequest},
      {"check",
       "verify packages, and change nothing",
       "Records are readable, every file is there, in the package and of its recorded size, and nothing lies\n"
       "among the media that no record names. Prints a line a finding: UUID, kind, path, what is wrong.\n",
       {{"DOCUMENT", "a document; all of the library when none is named", false, true}},
       {},
       false,
       checkRequest},
      {"serve",
       "show a document in the browser, live, until stopped",
       "Finalizes what is stale, prints the address of the themed package on this machine, and serves it with\n"
       "the live document behind: what is edited in the page is saved. The address holds a secret; whoever has\n"
       "it can read and edit the document while the program runs. Ctrl-C stops it.\n",
       {{"DOCUMENT", "the document; Interactive, with a theme"}},
       {{"--port", "", "N", "the port to serve at (else any that is free)"},
        {"--open", "", "", "open the address in the user's browser"}},
       true,
       serveRequest},
      {"doctor", "print which decoders, encoders, renderers and themes are there", "", {}, {}, false, doctorRequest},
      {"help",
       "explain the program, or a command",
       "",
       {{"COMMAND", "the command", false}},
       {{"--as",
         "",
         "FORM",
         "text, man (a manual page), or completions for bash, zsh or fish",
         false,
         {"text", "man", "bash", "zsh", "fish"}}},
       false,
       helpRequest},
  };
  return table;
}

const CommandDescription* findCommand(std::string_view name) {
  for (const CommandDescription& command : commands())
    if (command.name == name) return &command;
  return nullptr;
}

std::vector<Option> optionsOf(const CommandDescription& command) {
  std::vector<Option> options = command.options;
  if (command.writes) {
    options.push_back({"--wait", "", "SECONDS", "wait so long for what another process is changing (else not at all)"});
    options.push_back({"--dry-run", "", "", "print what would be done, and change nothing"});
  }
  return options;
}

std::string usageOf(const Option& option) {
  std::string usage(option.name);
  if (!option.value.empty()) (usage += ' ') += option.value;
  return usage;
}

std::string usageOf(const CommandDescription& command) {
  std::string usage = "quilt ";
  usage += command.name;
  for (const Positional& positional : command.positionals) {
    const std::string name = std::string(positional.name) + (positional.repeats ? "..." : "");
    usage += positional.required ? " " + name : " [" + name + "]";
  }
  for (const Option& option : optionsOf(command)) usage += " [" + usageOf(option) + "]" + (option.repeats ? "..." : "");
  return usage;
}

}  // namespace quilt::cli
