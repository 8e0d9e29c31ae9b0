#pragma once

#include "runtime/core/exceptions.h"
#include "runtime/core/objects.h"

namespace zq {

class TFiler;

/// The text of a refused Assign: class of the source, class of the destination.
inline constexpr TResStringRec SAssignError{0, u"Cannot assign a %s to a %s"};

/// Base of what can be assigned and streamed.
///
/// A class overrides Assign for the sources and AssignTo for the destinations that it knows, and hands the rest to its
/// parent.
class ZQ_API TPersistent : public TObject {
 public:
  /// Copies the content of ASource. Raises EConvertError (SAssignError) where neither side knows how, and for nullptr.
  virtual void Assign(const TPersistent* ASource);

 protected:
  ~TPersistent() override = default;
  virtual void AssignTo(TPersistent* ADest) const;
  virtual void DefineProperties(TFiler*) {}
  [[noreturn]] void AssignError(const TPersistent* ASource) const;
};

}  // namespace zq
