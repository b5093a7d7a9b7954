// Language models of groups of help books.
#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "platform/ThreadSafety.h"
#include "platform/Value.h"

class LUXModelFile;
class LUXModelTrainer;
class LUXModelView;
class LUXTokenCounts;

// Who holds a model (HelpLUXModel::activity()).

inline constexpr int kLUXModelActivityNone = 0;
inline constexpr int kLUXModelActivityQuerying = 1;
inline constexpr int kLUXModelActivityBuilding = 2;
inline constexpr int kLUXModelActivityPreloading = 3;

/// The model of one group of books in one language: a folder that holds a file
/// (docs/formats/lux-model.md), and the books that are being collected for the next one.
///
/// The class functions tell what is known of groups without opening a model. A group is a family of
/// books that are searched together; groups and weights come from a group list
/// (docs/formats/group-list.md), a property list:
///
///     {"DefaultGroup": "Applications",
///      "Groups": {"System": {"Weight": 1.5, "Books": {"org.zeb.manual": {"Weight": 2.0}}}}}
///
/// A book that no group names belongs to the default group; of several groups that name one, the
/// first by name has it in which it is not for smoothing only. A weight that is not given, or not
/// above 0, is 0, which means: no weight. Identifiers are taken as they are, versions included.
///
/// Thread-safety: internally synchronised. Collecting is for one thread at a time, and saving takes
/// what was collected until then.
class HelpLUXModel {
 public:
  /// The list in force from now on; what is not as above counts as not there. Without a list there
  /// is the default group "Default" alone.
  static void setGroupList(const platform::Value& groupList);
  /// The list of a property list file. False, with the list in force unchanged, when it cannot be
  /// read or is none.
  static bool setGroupListFromFile(const std::string& path);

  static std::string modelGroupNameForHelpbookID(std::string_view helpbookID);
  static float combiningWeightForModelGroupName(std::string_view modelGroupName);
  static float combiningWeightForHelpbookID(std::string_view helpbookID);

  /// What the list says of a book in a group: a dictionary with, where given, "SmoothingOnly"
  /// (boolean: its pages lend the model their words and are never found) and "Weight".
  static platform::Value helpbookPropertiesForHelpbookID(std::string_view helpbookID,
                                                         std::string_view modelGroupName);
  /// The groups of the list and the default group, in order of bytes.
  static std::vector<std::string> allModelGroupNames();
  /// The books that the list names for the group; not those that belong to it by default.
  static std::set<std::string> copyHelpbookIDsForModelGroupName(std::string_view modelGroupName,
                                                                bool includeSmoothingBooks);

  /// The folder of a group's model: one below the user's caches folder, whatever the names are.
  /// Empty where there is no caches folder.
  static std::string directoryPathForModelGroupName(std::string_view modelGroupName,
                                                    std::string_view language);
  /// Whether a model was saved there, of whatever version.
  static bool modelExistsForGroupName(std::string_view modelGroupName, std::string_view language);
  /// The same for the group that the book belongs to.
  static bool modelExistsForHelpbookID(std::string_view helpbookID, std::string_view language);

  /// The model in a folder, which need not be there yet. Nothing is read before it is needed. Null
  /// for an empty path and for that of something that is no folder.
  static std::shared_ptr<HelpLUXModel> initWithDirectoryPath(std::string path,
                                                             std::string language);

  ~HelpLUXModel();
  HelpLUXModel(const HelpLUXModel&) = delete;
  HelpLUXModel& operator=(const HelpLUXModel&) = delete;

  const std::string& modelDirectoryPath() const noexcept;
  /// Folder name ("English").
  const std::string& language() const noexcept { return _language; }

  /// Who holds the model; of no consequence here. kLUXModelActivityNone at first.
  int activity() const noexcept { return _activity.load(std::memory_order_acquire); }
  void setActivity(int activity) noexcept { _activity.store(activity, std::memory_order_release); }

  // What was saved.

  /// Whether there is no saved model, or none that this version reads, or one for another language
  /// or from another version of the tokenizer, or one that loadLSMMap() found damaged.
  bool needsBuild() const;

  /// The saved model, null where there is none that can be read. A view stays as it is when the
  /// model is saved anew or deleted. After damage that the header does not show it answers, but not
  /// well; loadLSMMap() tells. Takes microseconds where nothing has changed, below a millisecond
  /// else.
  std::shared_ptr<const LUXModelView> view() const;

  /// Opens the saved model, whose phrases are the suggestions. The same as view().
  std::shared_ptr<const LUXModelView> suggestions() const { return view(); }

  /// Reads the saved model whole, so that the next query finds it in memory, and looks for damage:
  /// a damaged model is not used, and needs to be built.
  void loadLSMMap();

  /// Called by a thread that will not use the model any more. Nothing is kept for single threads,
  /// so there is nothing to release.
  void currentThreadIsAboutToComplete() {}

  /// The full identifiers of the books, in the order in which they were added: of those collected
  /// since reset() where there was one after the last save, else of the saved model.
  std::vector<std::string> allHelpbookIDs() const;

  // Making a new one.

  /// Begins a new collection without books. The saved model is left as it is until the next save.
  /// The folder is made if that is possible, so that other files can be put there.
  void reset();

  /// A book whose pages may be found. Without reset() before it, a collection begins with it.
  void addHelpbookID(std::string_view helpbookID);

  /// A page. Without a file it counts for the statistics and is never found; with one, which is its
  /// path within the book, its book is added as well. Keywords count as words of the title. Throws
  /// platform::Exception "InvalidArgumentException" when there are more tokens than a model can
  /// have.
  void addTokenCounts(const LUXTokenCounts& tokenCounts, const std::optional<std::string>& forFile,
                      const std::optional<std::vector<std::string>>& keywords,
                      std::string_view withBookIdentifier);

  /// Makes a model of what was collected and puts it in the place of the old one in one step; the
  /// collection is over then, saved or not. `options` is a dictionary or absent; see
  /// LUXModelTrainer::finish() for "SuggestionThresholdsPerBook". False, logged at level 1 with the
  /// old model unchanged, when it cannot be made or written; false without a message when nothing
  /// was collected since the last save, not even by reset(). Takes all processors for seconds when
  /// there are tens of thousands of pages.
  bool saveWithOptions(const platform::Value& options);

 private:
  HelpLUXModel(std::string path, std::string language);

  LUXModelTrainer& _collection() REQUIRES(_mutex);

  const std::string _language;
  const std::unique_ptr<LUXModelFile> _file;
  std::atomic<int> _activity{kLUXModelActivityNone};
  mutable platform::Mutex _mutex;
  std::unique_ptr<LUXModelTrainer> _trainer GUARDED_BY(_mutex);
};
