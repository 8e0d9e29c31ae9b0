

#include "runtime/core/interfaces.h"
#include "tests/support/support.h"

namespace zq {
namespace {

struct IShape : Extends<IInterface> {
  static constexpr TGUID IID = "{11111111-0000-4000-8000-000000000001}"_guid;
  virtual int Corners() = 0;
};
struct ISolid : Extends<IShape> {
  static constexpr TGUID IID = "{11111111-0000-4000-8000-000000000002}"_guid;
  virtual int Faces() = 0;
};
// Bears the GUID of its parent.
struct ISolidEx : Extends<ISolid> {
  static constexpr TGUID IID = ISolid::IID;
  virtual int Edges() = 0;
};
struct IColour : Extends<IInterface> {
  static constexpr TGUID IID = "{11111111-0000-4000-8000-000000000003}"_guid;
  virtual int Hue() = 0;
};

struct TShape : Implements<TInterfacedObject, IShape> {
  explicit TShape(int& AAlive) : FAlive(AAlive) {
    const IntfRef<IShape> Self(this);  // whose end must not be the object's
    FAlive += Self->Corners() / 8;
  }
  int Corners() override { return 8; }
  ~TShape() override { --FAlive; }
  void BeforeDestruction() override {
    if (Refuses) throw EInvalidOperation(u"not yet");
    Implements::BeforeDestruction();
  }
  bool Refuses = false;
  int& FAlive;
};
// Corners, which ISolid asks for too, comes from the base class.
struct TSolid : Implements<TShape, ISolid> {
  using Implements::Implements;
  int Faces() override { return 6; }
};
struct TCube : Implements<TShape, IColour, ISolidEx> {
  using Implements::Implements;
  int Faces() override { return 6; }
  int Edges() override { return 12; }
  int Hue() override { return 3; }
};

struct Interface : testing::Test {
  ~Interface() override { EXPECT_EQ(FAlive, 0); }
  int FAlive = 0;
};

TEST_F(Interface, QueryAnswersForEveryInterfaceAndItsParents) {
  const IntfRef<IColour> Cube(New<TCube>(FAlive));
  EXPECT_EQ(Cube.As<IShape>()->Corners(), 8);
  EXPECT_EQ(Cube.As<ISolid>()->Faces(), 6);
  EXPECT_EQ(Cube.As<ISolidEx>()->Edges(), 12);
  EXPECT_EQ(Cube.As<IInterface>().As<IColour>()->Hue(), 3);
  EXPECT_EQ(Cube.As<IInterface>(), Cube.As<ISolidEx>().As<IInterface>()) << "one object has one identity";
}

TEST_F(Interface, SharedGuidDoesNotGrantTheLongerInterface) {
  const IntfRef<IShape> Solid(New<TSolid>(FAlive));
  EXPECT_EQ(Solid.As<ISolid>()->Corners(), 8);
  EXPECT_FALSE(Solid.Supports<ISolidEx>() || Solid.Supports<IColour>() || IntfRef<IShape>().Supports<IShape>());
  EXPECT_THROW(std::ignore = Solid.As<ISolidEx>(), EIntfCastError);
  void* Found = &Found;
  EXPECT_EQ(Solid->QueryInterface(IColour::IID, &Found), E_NOINTERFACE);
  EXPECT_EQ(Found, nullptr);
}

TEST_F(Interface, EveryWayOfTakingAndDroppingKeepsTheCount) {
  auto* const Object = New<TCube>(FAlive);
  IntfRef<IShape> A(Object), B = A;
  EXPECT_EQ(Object->RefCount(), 2);
  EXPECT_THROW(Object->Free(), Exception);
  A = std::move(B);
  EXPECT_EQ(Object->RefCount(), 1);
  A = std::as_const(A);
  const IntfRef<IInterface> Wider = A;
  std::ignore = A.Supports<ISolidEx>();
  std::ignore = A.Supports<IColour>();
  std::ignore = Supports<ISolidEx>(Object);
  EXPECT_EQ(Object->RefCount(), 2);
}

TEST_F(Interface, EndOfScopeSwallowsWhatResetLetsOut) {
  auto* const Object = New<TShape>(FAlive);
  Object->Refuses = true;
  EXPECT_NO_THROW({ const IntfRef<IShape> Scoped(Object); });
  IntfRef<IShape> Field(Object);
  EXPECT_NO_THROW(Field = nullptr);
  Field = Object;
  EXPECT_THROW(Field.Reset(), EInvalidOperation);
  EXPECT_FALSE(Field);
  EXPECT_EQ(FAlive, 1);
  Object->Refuses = false;
  Field = Object;
}

}  // namespace
}  // namespace zq
