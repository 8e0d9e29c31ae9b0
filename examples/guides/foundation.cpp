#include "common/uZqClasses.h"
#include "common/uZqSysUtils.h"

namespace {

using namespace zq;

struct IOrder : Extends<IInterface> {
  static constexpr TGUID IID = "{9A3C5B0E-2D41-4F86-8E07-6B1C2F7D9E13}"_guid;
  virtual Integer Number() const = 0;

 protected:
  ~IOrder() = default;
};

class TOrder : public Implements<TZqObjectEx, IOrder> {
 public:
  Integer Number() const override { return 7; }

 protected:
  ~TOrder() override = default;
};

class EShopClosed : public EZqException {
 public:
  using EZqException::EZqException;
};

}  // namespace

int main() {
  const IntfRef<IOrder> Order = New<TOrder>();  // ends with its last reference
  const TOwned<TOrder> Owned(New<TOrder>());    // ends with the scope
  Owned->SetAutoDestroy(false);                 // so references only count

  ZqRegisterExceptionClass(u"shop", 7, EZqExceptionClass::Of<EShopClosed>());
  const ExceptionClass Found = ZqGetExceptionClass(u"shop", 7);

  TZqObjectList Orders;
  auto* const Shared = New<TOrder>();
  Shared->SetAutoDestroy(true);  // before it is added: the list counts it now
  Orders.Add(Shared);
  IntfRef<IOrder> Kept(Shared);
  Orders.Clear();  // Kept has the last count

  const TOwned<TZqKeyDescStringList> Sizes(New<TZqKeyDescStringList>(nullptr));
  Sizes->AddItem(38, u"small");
  Sizes->AddItem(42, u"large");
  const Integer Size = Sizes->GetIntKeyValue(u"large");

  return Order->Number() == 7 && Kept->Number() == 7 && Size == 42 && Found.ClassName() == u"EShopClosed" ? 0 : 1;
}
