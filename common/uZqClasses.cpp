#include "common/uZqClasses.h"

#include "runtime/core/start_count.h"
#include "runtime/values/typeinfo.h"

namespace zq {

namespace {
constinit TStartCount Starts;
}

void uZqClasses::Start() {
  if (!Starts.Begins()) return;
  DescribeType<TZqAutoDestroy>(u"uZqClasses").EnumNames({u"radComputed", u"radFalse", u"radTrue"});
  DescribeType<TZqObjectOwnership>(u"uZqClasses").EnumNames({u"ooReference", u"ooOwned"});
  DescribeType<TZqCharacterSetType>(u"uZqClasses").EnumNames({u"SBCS", u"DBCS", u"MBCS"});
  DescribeType<TZqTextParserPosType>(u"uZqClasses")
      .EnumNames({u"tpPrevPos", u"tpCurPos", u"tpPeekPos", u"tpMarkPos1", u"tpMarkPos2", u"tpMarkPos3"});
  DescribeType<TZqTextParserSkipOp>(u"uZqClasses")
      .EnumNames({u"sopEq", u"sopLt", u"sopGt", u"sopUnEq", u"sopLtEq", u"sopGtEq", u"sopIn", u"sopNotIn"});
  DescribeType<TZqBinEncoding>(u"uZqClasses").EnumNames({u"beBase64", u"beHexEncoded"});
  DescribeType<TZqKeyDescStringList>(u"uZqClasses")
      .Property(u"KeyValues", &TZqKeyDescStringList::KeyValues, &TZqKeyDescStringList::SetKeyValues)
      .Property(u"Descriptions", &TZqKeyDescStringList::Descriptions, &TZqKeyDescStringList::SetDescriptions);
  DescribeType<TZqMemoListItem>(u"uZqClasses")
      .Property(u"Code", &TZqMemoListItem::Code, &TZqMemoListItem::SetCode)
      .Property(u"Memo", &TZqMemoListItem::Memo, &TZqMemoListItem::SetMemo);
  DescribeType<TZqMemoListItems>(u"uZqClasses").ElementType(TypeInfo<TZqMemoListItem>());
  DescribeType<TZqMemoList>(u"uZqClasses").Property(u"Items", &TZqMemoList::Items, &TZqMemoList::SetItems);
}

void uZqClasses::Stop() { Starts.Ends(); }

}  // namespace zq
