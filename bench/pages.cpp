// SPDX-License-Identifier: Apache-2.0
// Pages of documents beside what else one would use, in one run: `pages FOLDER_OF_MEDIA`. Needs mutool, and cjpeg and
// pdftoppm where they are to be compared. Ratios are ours / theirs; below 1 is faster. Each figure is the best of
// several runs.
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "quilt/platform/install.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/mupdf/MupdfDocuments.h"

namespace {

namespace fs = std::filesystem;
using namespace quilt::platform;

struct Job {
  std::function<void()> run;
  fs::path made{};  ///< a file or folder that is not empty afterwards, unless it did not work
};

// The best of several runs of each; 0 of what did not work. They take turns, so that a machine that is busy for a while
// is busy for all of them.
std::vector<double> bestMilliseconds(int runs, const std::vector<Job>& jobs) {
  std::vector<double> best(jobs.size(), 1e12);
  for (int i = 0; i < runs; ++i) {
    for (std::size_t k = 0; k < jobs.size(); ++k) {
      const auto start = std::chrono::steady_clock::now();
      jobs[k].run();
      const std::chrono::duration<double, std::milli> time = std::chrono::steady_clock::now() - start;
      // Whether a program ended well does not tell: mutool complains of a damaged document that it drew whole.
      const fs::path& made = jobs[k].made;
      const bool isMade = made.empty() || (fs::exists(made) && !fs::is_empty(made));
      best[k] = isMade ? std::min(best[k], time.count()) : 0;
    }
  }
  return best;
}

// Runs a program, or two joined by a pipe, to the end.
class Pipeline {
 public:
  void run(std::vector<std::vector<std::string>> commands) {
    int input = -1;
    std::vector<pid_t> children;
    for (std::size_t i = 0; i < commands.size(); ++i) {
      int ends[2] = {-1, -1};
      if (i + 1 < commands.size() && pipe2(ends, O_CLOEXEC) != 0) return;
      children.push_back(start(commands[i], input, ends[1]));
      for (const int descriptor : {input, ends[1]}) {
        if (descriptor >= 0) close(descriptor);
      }
      input = ends[0];
    }
    for (const pid_t child : children) {
      if (child > 0) waitpid(child, nullptr, 0);
    }
  }

 private:
  static pid_t start(std::vector<std::string>& words, int input, int output) {
    std::vector<char*> pointers;
    for (std::string& word : words) pointers.push_back(word.data());
    pointers.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    if (input >= 0) posix_spawn_file_actions_adddup2(&actions, input, STDIN_FILENO);
    if (output >= 0) {
      posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    } else {
      posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    }
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    pid_t child = 0;
    const int failed = posix_spawnp(&child, pointers[0], &actions, nullptr, pointers.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    return failed ? -1 : child;
  }
};

void empty(const fs::path& folder) {
  fs::remove_all(folder);
  fs::create_directory(folder);
}

void printRatio(double ours, double theirs) {
  if (theirs > 0) {
    std::printf(" %9.2f %6.2f", theirs, ours / theirs);
  } else {
    std::printf(" %9s %6s", "none", "");
  }
}

std::shared_ptr<PagedDocument> open(const fs::path& file) {
  const auto opened = MupdfDocuments().openDocument(file);
  return opened ? *opened : nullptr;
}

void writePages(const fs::path& file, const fs::path& output, std::size_t first, std::size_t count,
                std::size_t step = 1) {
  const auto document = open(file);
  for (std::size_t i = first; document && i < count; i += step) {
    const Result<Size> points = document->sizeOfPage(i);
    if (!points) return;
    const Size fitted = FDYFitSizeToSize(*points, kHighDefinition);
    const auto whole = [](double side) { return static_cast<double>(static_cast<int>(side + 0.5)); };
    Result<Bitmap> bitmap = document->drawPage(i, {whole(fitted.width), whole(fitted.height)});
    if (!bitmap) return;
    const auto image = services().images->imageWithBitmap(*std::move(bitmap));
    if (!image || !(*image)->saveAsJPGAtPath(output / (std::to_string(i) + ".jpg"))) std::printf("not saved: ");
  }
}

// One at a time, and on two threads that share the pages out between them.
void comparePictures(const fs::path& folder, const fs::path& output) {
  std::printf("%-28s %6s %9s %9s %9s %6s %9s %6s\n", "pages as JPEG (ms a page)", "pages", "ours", "2 threads",
              "mutool+", "ratio", "pdftoppm", "ratio");
  for (const auto& [name, pageCount] : {std::pair{"pdf-policy-193p.pdf", 60},
                                        {"pdf-book-117p.pdf", 60},
                                        {"pdf-landscape-18p.pdf", 18},
                                        {"pdf-in-cc0.pdf", 10}}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    empty(output);
    const int count = pageCount;
    const auto pages = static_cast<std::size_t>(count);
    const std::string last = std::to_string(count);
    const std::string jpeg = (output / "page.jpg").string();
    const fs::path poppler = output / "poppler";
    fs::create_directory(poppler);
    const auto drawAll = [&] {
      Pipeline().run({{"mutool", "draw", "-q", "-w", "1280", "-h", "720", "-F", "ppm", "-o",
                       (output / "p%d.ppm").string(), file, "1-" + last}});
      for (int page = 1; page <= count; ++page) {
        const std::string drawn = (output / ("p" + std::to_string(page) + ".ppm")).string();
        Pipeline().run({{"cjpeg", "-quality", "85", "-outfile", jpeg, drawn}});
      }
    };
    const auto drawEach = [&] {
      for (int page = 1; page <= count; ++page) {
        const std::string number = std::to_string(page);
        Pipeline().run({{"mutool", "draw", "-q", "-w", "1280", "-h", "720", "-F", "ppm", "-o", "-", file, number},
                        {"cjpeg", "-quality", "85", "-outfile", jpeg}});
      }
    };
    const std::vector<double> best = bestMilliseconds(
        5, {{[&] { writePages(file, output, 0, pages); }},
            {[&] {
              std::thread other([&] { writePages(file, output, 1, pages, 2); });
              writePages(file, output, 0, pages, 2);
              other.join();
            }},
            {drawAll, jpeg},  // in one run, which saves most of the starts: the fairer peer
            {[&] {
               Pipeline().run({{"pdftoppm", "-jpeg", "-l", last, "-scale-to", "720", file, (poppler / "p").string()}});
             },
             poppler},
            {drawEach, jpeg}});
    std::printf("%-28s %6d %9.2f %9.2f", name, count, best[0] / count, best[1] / count);
    printRatio(best[0] / count, best[2] / count);
    printRatio(best[0] / count, best[3] / count);
    std::printf("   one start a page:");
    printRatio(best[0] / count, best[4] / count);
    std::printf("\n");
  }
}

void compareText(const fs::path& folder, const fs::path& output) {
  std::printf("\n%-28s %6s %9s %9s %6s\n", "text (ms a page)", "pages", "ours", "mutool", "ratio");
  for (const char* name : {"pdf-policy-193p.pdf", "pdf-book-117p.pdf", "pdf-landscape-18p.pdf"}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    empty(output);
    std::size_t count = 0;
    const fs::path theirs = output / "text.txt";
    const auto read = [&] {
      const auto document = open(file);
      count = document ? document->pageCount().hasValue() ? *document->pageCount() : 0 : 0;
      for (std::size_t i = 0; i < count; ++i) static_cast<void>(document->textOfPage(i));
    };
    const std::vector<double> best =
        bestMilliseconds(7, {{read},
                             {[&] {
                                Pipeline().run({{"mutool", "draw", "-q", "-F", "text", "-o", theirs, file}});
                              },
                              theirs}});
    const auto pages = static_cast<double>(count);
    std::printf("%-28s %6zu %9.2f", name, count, best[0] / pages);
    printRatio(best[0] / pages, best[1] / pages);
    std::printf("\n");
  }
}

void compareBooks(const fs::path& folder, const fs::path& output) {
  std::printf("\n%-28s %9s %9s %9s %9s %6s\n", "first 20 pages of a book (ms)", "count", "first", "20 JPEG", "mutool",
              "ratio");
  for (const char* name : {"epub3-moby-dick.epub", "epub3-debian-policy.epub", "epub2-leaves-of-grass.epub"}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    empty(output);
    const auto countPages = [&] {
      if (const auto document = open(file)) static_cast<void>(document->pageCount());
    };
    const std::vector<double> best =
        bestMilliseconds(5, {{countPages},
                             {[&] { writePages(file, output, 0, 1); }},
                             {[&] { writePages(file, output, 0, 20); }},
                             {[&] {
                                Pipeline().run({{"mutool", "draw", "-q", "-w", "1280", "-h", "720", "-F", "pnm", "-o",
                                                 (output / "e%d.pnm").string(), file, "1-20"}});
                              },
                              output / "e20.pnm"}});
    std::printf("%-28s %9.2f %9.2f %9.2f", name, best[0], best[1], best[2]);
    printRatio(best[2], best[3]);
    std::printf("\n");
  }
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount != 2) {
    std::fprintf(stderr, "usage: %s FOLDER_OF_MEDIA\n", arguments[0]);
    return 2;
  }
  install();
  // In memory where there is such a folder: pages are saved so that they survive a power cut, which the other programs
  // do not do, and the disk is not what is compared.
  const fs::path memory = "/dev/shm";
  std::string pattern = ((fs::exists(memory) ? memory : fs::temp_directory_path()) / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  const fs::path output = pattern;
  comparePictures(arguments[1], output);
  compareText(arguments[1], output);
  compareBooks(arguments[1], output);
  fs::remove_all(output);
  return 0;
}
