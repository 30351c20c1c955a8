#include "Host/Sqlite/SqliteError.h"

#include <sqlite3.h>

namespace palisade {
namespace {

struct Meaning {
  StoreErrorCode code;
  std::string_view advice;
};

// A disk without space is told apart from a failing one; a quota that is used up is not, which its advice has to make good for.
Meaning meaningOf(int resultCode) {
  switch (resultCode & 0xff) {
    case SQLITE_FULL: return {StoreErrorFull, "the disk is full; free some space and try again"};
    case SQLITE_READONLY:
    case SQLITE_PERM:
    case SQLITE_AUTH:
      return {StoreErrorNotWritable, "it cannot be written; make the file and its folder writable for this user"};
    case SQLITE_CANTOPEN:
      return {StoreErrorNotWritable, "it cannot be opened; check that the folder exists and is writable for this user"};
    case SQLITE_CORRUPT:
    case SQLITE_NOTADB: return {StoreErrorDamaged, "it is damaged; restore it from a copy"};
    case SQLITE_BUSY:
    case SQLITE_LOCKED: return {StoreErrorBusy, "another process is using it; end that process or try again"};
    case SQLITE_CONSTRAINT: return {StoreErrorConstraint, "that contradicts what is stored"};
    case SQLITE_IOERR:
      return {StoreErrorOther, "the disk failed or a quota is used up; look at the free space and into the system's log"};
    case SQLITE_NOMEM: return {StoreErrorOther, "there is not enough memory"};
    default: return {StoreErrorOther, ""};
  }
}

std::string sentence(const std::filesystem::path& path, std::string_view during, std::string_view reason) {
  std::string text = path.string();
  text.append(": cannot ").append(during).append(": ").append(reason);
  return text;
}

}  // namespace

SqliteError::SqliteError(StoreErrorCode code, const std::filesystem::path& path, std::string_view during,
                         std::string_view reason)
    : std::runtime_error(sentence(path, during, reason)),
      _code(code) {}

SqliteError SqliteError::fromResult(int resultCode, const std::filesystem::path& path, std::string_view during,
                                    std::string_view detail) {
  const Meaning meaning = meaningOf(resultCode);
  std::string reason(meaning.advice);
  if (!reason.empty()) reason += ' ';
  reason.append("(").append(sqlite3_errstr(resultCode));
  if (!detail.empty() && detail != sqlite3_errstr(resultCode)) reason.append(": ").append(detail);
  reason += ')';
  return {meaning.code, path, during, reason};
}

}  // namespace palisade
