// SPDX-License-Identifier: Apache-2.0
// The model with services of the host's own, here the few that an unsaved item needs.
#include <quilt/media/QuiltMedia.h>
#include <quilt/platform/interfaces/Services.h>

#include <cstdio>
#include <cstdlib>
#include <string>

// Ends the program with the line that does not hold.
#define EXPECT(condition)                                                                 \
  do {                                                                                    \
    if (!(condition)) {                                                                   \
      std::fprintf(stderr, "%s:%d: does not hold: %s\n", __FILE__, __LINE__, #condition); \
      std::exit(1);                                                                       \
    }                                                                                     \
  } while (false)

namespace {

class CountingUuids final : public quilt::platform::UuidGenerator {
 public:
  std::string generateUUID() override { return "ITEM-" + std::to_string(++_count); }

 private:
  int _count = 0;
};

}  // namespace

int main() {
  quilt::platform::Services services;
  services.uuids = std::make_shared<CountingUuids>();
  quilt::platform::installServices(std::move(services));

  const auto media = quilt::QuiltMedia::init();
  std::string heard;
  const auto observation = media->observe(
      "title", [&heard](const quilt::platform::ChangeNotice& notice) { heard = std::string(notice.key); });
  media->setTitle("A title");
  media->addExtra(quilt::QuiltMediaExtra::init());

  EXPECT(media->uuid() == "ITEM-1");
  EXPECT(heard == "title");
  EXPECT(media->extraCount() == 1);
  EXPECT(media->extraAtIndex(0)->mediaOwner() == media);
  std::puts("model host: the model with services of its own");
}
