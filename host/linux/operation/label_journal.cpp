// What files carried before a load labelled them, so that a load that was killed can be undone by
// whoever comes next. It is written before the first label is given, and read up to its end or to
// where its writer died; a lock on it tells whether that still lives. Files are reached through
// their directories, known by device and inode, so that nothing is put back on what has taken a
// place meanwhile.
#include "host/linux/operation/label_journal.h"

#include <fcntl.h>
#include <linux/limits.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <istream>
#include <utility>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/common/write_all.h"
#include "host/linux/files/directory_entry.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kJournalPurpose[] = "journal of labels";
constexpr std::size_t kWrittenAtOnce = 1 << 16;

// What a line of the journal begins with. The first line names the attribute; the files that follow
// a directory lie in it. Every line ends with a NUL, as names may hold anything else.
constexpr char kAttribute = 'A';
constexpr char kDirectory = 'D';
constexpr char kCarries = 'F';
constexpr char kCarriesNothing = 'N';

std::string JournalBeside(const std::string& statePath) {
  return statePath.substr(0, statePath.rfind('/') + 1) + "labels.undo";
}

bool IsLabel(const std::optional<std::string>& carried, std::uint32_t id) {
  return carried && carried->size() == sizeof id &&
         std::memcmp(carried->data(), &id, sizeof id) == 0;
}

bool IsLink(const char* name) {
  struct stat status {};
  return lstat(name, &status) == 0 && S_ISLNK(status.st_mode);
}

// What a file carried; empty for nothing.
struct KeptLabel {
  std::string name;
  std::optional<std::string> value;
};

// Reads a journal up to its end, or to where its writer has died.
class JournalReader {
 public:
  explicit JournalReader(std::istream& journal) : input(journal) {}

  // 0 at the end.
  char Next() {
    char kind = 0;
    return input.get(kind) ? kind : '\0';
  }

  bool ReadText(std::string& text) {
    return static_cast<bool>(std::getline(input, text, '\0')) && !input.eof();
  }

  bool ReadDirectory(DirectoryPlace& place) {
    return input >> place.device >> place.inode && input.get() == ' ' && ReadText(place.path);
  }

  bool ReadKept(KeptLabel& kept) {
    std::size_t size = 0;
    if (!(input >> size) || size > XATTR_SIZE_MAX || input.get() != ' ') return false;
    kept.value.emplace(size, '\0');
    input.read(kept.value->data(), static_cast<std::streamsize>(size));
    return input && ReadText(kept.name);
  }

 private:
  std::istream& input;
};

// One after the other puts the files of a journal back.
class Undoing {
 public:
  void UseAttribute(std::string name) { attribute = std::move(name); }

  void Enter(DirectoryPlace place) {
    directory = std::move(place);
    error = visit.Enter(directory) ? 0 : errno;
  }

  void PutBack(const KeptLabel& kept) {
    const int failure = error != 0 ? error : TryPutBack(kept.name.c_str(), kept.value);
    if (failure != 0) done.failures.push_back({JoinPath(directory.path, kept.name), failure});
  }

  LabelsPutBack Done() { return std::move(done); }

 private:
  int TryPutBack(const char* name, const std::optional<std::string>& before) {
    const auto now = ReadCarried(name, attribute);
    if (!now && errno != ENODATA) return errno;
    if (now == before) return 0;
    if (IsLink(name)) return ENOENT;
    const int result = ChangeLabel([&](const char* /*chosen*/) {
      return before ? lsetxattr(name, attribute.c_str(), before->data(), before->size(), 0)
                    : lremovexattr(name, attribute.c_str());
    });
    if (result != 0) return errno;
    ++done.count;
    return 0;
  }

  std::string attribute;
  DirectoryVisit visit;
  DirectoryPlace directory;
  int error = ENOENT;
  LabelsPutBack done;
};

bool PutLineBack(JournalReader& reader, Undoing& undoing) {
  KeptLabel kept;
  DirectoryPlace place;
  std::string text;
  switch (reader.Next()) {
    case kAttribute:
      if (!reader.ReadText(text)) return false;
      undoing.UseAttribute(std::move(text));
      return true;
    case kDirectory:
      if (!reader.ReadDirectory(place)) return false;
      undoing.Enter(std::move(place));
      return true;
    case kCarries:
      if (!reader.ReadKept(kept)) return false;
      undoing.PutBack(kept);
      return true;
    case kCarriesNothing:
      if (!reader.ReadText(kept.name)) return false;
      undoing.PutBack(kept);
      return true;
    default:
      return false;
  }
}

}  // namespace

// Empty when there is none. Throws EWOULDBLOCK when another process has it.
std::optional<LabelJournal> LabelJournal::TakeIfThere(const std::string& path) {
  if (access(path.c_str(), F_OK) != 0 && errno == ENOENT) return std::nullopt;
  RequirePrivateFile(path, kJournalPurpose);
  Descriptor file(open(path.c_str(), O_RDWR | O_NOFOLLOW | O_CLOEXEC));
  if (!file.IsOpen()) ThrowErrno("Unable to open the journal of labels ", path);
  if (flock(file.Number(), LOCK_EX | LOCK_NB) != 0) {
    ThrowErrno("Another process has the journal of labels ", path);
  }
  LabelJournal journal(path, std::move(file));
  // Whoever had it before may have removed it since it was opened.
  if (journal.IsStillThere()) return journal;
  journal.path.clear();
  return std::nullopt;
}

bool LabelJournal::IsStillThere() const {
  struct stat opened {};
  struct stat there {};
  return fstat(file.Number(), &opened) == 0 && stat(path.c_str(), &there) == 0 &&
         opened.st_dev == there.st_dev && opened.st_ino == there.st_ino;
}

LabelJournal::LabelJournal(const std::string& statePath) : file(-1) {
  const std::string wanted = JournalBeside(statePath);
  for (;;) {
    PreparePrivateFile(wanted, kJournalPurpose);
    auto taken = TakeIfThere(wanted);
    if (!taken) continue;
    taken->PutBack();
    path = std::exchange(taken->path, "");
    file = std::move(taken->file);
    if (ftruncate(file.Number(), 0) == 0) return;
    ThrowErrno("Unable to write the journal of labels ", path);
  }
}

LabelJournal::LabelJournal(LabelJournal&& other) noexcept
    : path(std::exchange(other.path, "")), file(std::move(other.file)) {}

LabelJournal::~LabelJournal() {
  if (!path.empty()) unlink(path.c_str());
}

void LabelJournal::Keep(const NotedLabels& labels) {
  const std::string attribute = LabelAttribute();
  std::string text = kAttribute + attribute + '\0';
  const DirectoryPlace* entered = nullptr;
  bool willChange = false;
  labels.ForEach([&](const DirectoryPlace& directory, const char* name, std::uint32_t id) {
    const auto carried = ReadCarried(name, attribute);
    // What cannot be read is not given a label either.
    if (!carried && errno != ENODATA) return;
    willChange = willChange || !IsLabel(carried, id);
    if (&directory != entered) {
      text +=
          kDirectory + StrCat(directory.device, " ", directory.inode, " ", directory.path) + '\0';
    }
    entered = &directory;
    text += carried ? kCarries + StrCat(carried->size(), " ") + *carried
                    : std::string(1, kCarriesNothing);
    text.append(name).push_back('\0');
    if (text.size() < kWrittenAtOnce) return;
    Write(text);
    text.clear();
  });
  Write(text);
  // The labels come before the commit, and until then the state tells nobody that they change.
  if (willChange) unlink(HostState::Current().LabelIndexPath().c_str());
}

void LabelJournal::Write(const std::string& text) const {
  if (!WriteAll(file.Number(), text)) ThrowErrno("Unable to write the journal of labels ", path);
}

LabelsPutBack LabelJournal::PutBack() const {
  std::ifstream input(path, std::ios::binary);
  JournalReader reader(input);
  Undoing undoing;
  while (PutLineBack(reader, undoing)) continue;
  return undoing.Done();
}

bool LabelJournal::IsThere(const std::string& statePath) {
  return access(JournalBeside(statePath).c_str(), F_OK) == 0;
}

void LabelJournal::DiscardLeftOver(const std::string& statePath) {
  unlink(JournalBeside(statePath).c_str());
}

std::optional<LabelsPutBack> LabelJournal::PutBackLeftOver(const std::string& statePath) {
  try {
    const auto journal = TakeIfThere(JournalBeside(statePath));
    if (!journal) return std::nullopt;
    return journal->PutBack();
  } catch (const HostError& error) {
    if (error.Code() != EWOULDBLOCK && error.Code() != ENOENT) throw;
    return std::nullopt;
  }
}

}  // namespace LinuxHost
