#include "parvel/foundation/PVCasts.h"

#include <gtest/gtest.h>

namespace parvel::testing {

struct Readable {
    virtual ~Readable() = default;
};
struct Countable {
    virtual ~Countable() = default;
};

}  // namespace parvel::testing

namespace parvel {

// Text is readable and countable, an array countable, and no other kind is either.
template <>
inline constexpr bool conformsTo<String, testing::Readable> = true;
template <>
inline constexpr bool conformsTo<String, testing::Countable> = true;
template <>
inline constexpr bool conformsTo<Array, testing::Countable> = true;

}  // namespace parvel

namespace parvel::testing {
namespace {

struct Figure {
    virtual ~Figure() = default;
};
struct Sheet : Figure, Readable {};
struct Book : Sheet, Countable {};
struct Untested {
    virtual ~Untested() = default;
};

const Value kText("text");
const Value kNumber(Number::signedInteger(1));
const Value kArray(Array{});

TEST(PVDynamicCast, GivesNullForAnotherKindOfValue) {
    EXPECT_EQ(PVDynamicCast(classOf<String>, &kNumber), nullptr);
    EXPECT_EQ(PVDynamicCast(classOf<Array>, &kText), nullptr);
}

TEST(PVDynamicCast, GivesTheValuesOwnContent) {
    const String* text = PVDynamicCast(classOf<String>, &kText);

    ASSERT_NE(text, nullptr);
    EXPECT_EQ(*text, "text");
    EXPECT_EQ(text, kText.as<String>());
}

TEST(PVDynamicCast, FindsEveryKindOfValue) {
    const Value null;
    const Value date(Date{1});
    const Value data(Data::copyOf("x"));
    const Value dictionary(Dictionary{});

    EXPECT_NE(PVDynamicCast(classOf<Null>, &null), nullptr);
    EXPECT_NE(PVDynamicCast(classOf<Number>, &kNumber), nullptr);
    EXPECT_NE(PVDynamicCast(classOf<Date>, &date), nullptr);
    EXPECT_NE(PVDynamicCast(classOf<Data>, &data), nullptr);
    EXPECT_NE(PVDynamicCast(classOf<Array>, &kArray), nullptr);
    EXPECT_NE(PVDynamicCast(classOf<Dictionary>, &dictionary), nullptr);
}

TEST(PVDynamicCast, TakesTheFourKindsOfNumberForOne) {
    for (const Number& number : {Number::boolean(true), Number::signedInteger(1),
                                 Number::unsignedInteger(1ULL << 63), Number::real(1)}) {
        const Value value(number);
        EXPECT_NE(PVDynamicCast(classOf<Number>, &value), nullptr);
    }
}

TEST(PVDynamicCast, GivesTheSameObjectForASubclass) {
    const std::shared_ptr<Figure> shape = std::make_shared<Book>();
    const std::shared_ptr<Sheet> sheet = PVDynamicCast(classOf<Sheet>, shape);

    EXPECT_EQ(sheet, shape);
    EXPECT_EQ(PVDynamicCast(classOf<Book>, shape), shape);
    EXPECT_EQ(PVDynamicCast(classOf<Figure>, shape), shape);
}

TEST(PVDynamicCast, GivesNullForASuperclass) {
    const std::shared_ptr<Figure> shape = std::make_shared<Sheet>();

    EXPECT_EQ(PVDynamicCast(classOf<Book>, shape), nullptr);
}

TEST(PVDynamicCast, KeepsAConstObjectConst) {
    const std::shared_ptr<const Figure> shape = std::make_shared<const Book>();
    const std::shared_ptr<const Book> book = PVDynamicCast(classOf<Book>, shape);

    EXPECT_EQ(book, shape);
}

TEST(PVDynamicCast, GivesNullForNull) {
    const Value* value = nullptr;
    const std::shared_ptr<Figure> shape;

    EXPECT_EQ(PVDynamicCast(classOf<String>, value), nullptr);
    EXPECT_EQ(PVDynamicCast(classOf<Figure>, shape), nullptr);
}

TEST(PVProtocolCast, GivesTheValueWhereItsKindConforms) {
    EXPECT_EQ(PVProtocolCast(protocolOf<Readable>, &kText), &kText);
    EXPECT_EQ(PVProtocolCast(protocolOf<Countable>, &kArray), &kArray);
}

TEST(PVProtocolCast, GivesNullForEveryKindThatDoesNotConform) {
    const Value values[] = {Value(),       kNumber,        Value(Date{1}),
                            Value(Data()), Value(Array{}), Value(Dictionary{})};
    for (const Value& value : values)
        EXPECT_EQ(PVProtocolCast(protocolOf<Readable>, &value), nullptr);
    EXPECT_EQ(PVProtocolCast(protocolOf<Untested>, &kText), nullptr);
}

TEST(PVProtocolCast, GivesTheSameObjectWhereItConforms) {
    const std::shared_ptr<Figure> book = std::make_shared<Book>();
    const std::shared_ptr<const Figure> sheet = std::make_shared<const Sheet>();

    EXPECT_EQ(PVProtocolCast(protocolOf<Countable>, book), book);
    EXPECT_EQ(PVProtocolCast(protocolOf<Readable>, sheet), sheet);
    EXPECT_EQ(PVProtocolCast(protocolOf<Countable>, sheet), nullptr);
}

TEST(PVProtocolCast, GivesNullForNull) {
    const Value* value = nullptr;
    const std::shared_ptr<Figure> shape;

    EXPECT_EQ(PVProtocolCast(protocolOf<Readable>, value), nullptr);
    EXPECT_EQ(PVProtocolCast(protocolOf<Readable>, shape), nullptr);
}

TEST(PVClassAndProtocolCast, WithACountOf0IsTheClassTestAlone) {
    const std::shared_ptr<Figure> sheet = std::make_shared<Sheet>();

    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 0), kText.as<String>());
    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 0, protocolOf<Untested>),
              kText.as<String>());
    EXPECT_EQ(PVClassAndProtocolCast(&kNumber, classOf<String>, 0), nullptr);
    EXPECT_EQ(PVClassAndProtocolCast(sheet, classOf<Sheet>, 0), sheet);
    EXPECT_EQ(PVClassAndProtocolCast(sheet, classOf<Book>, 0), nullptr);
}

TEST(PVClassAndProtocolCast, WantsEveryProtocol) {
    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 2, protocolOf<Readable>,
                                     protocolOf<Countable>),
              kText.as<String>());
    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 2, protocolOf<Readable>,
                                     protocolOf<Untested>),
              nullptr);
    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 2, protocolOf<Untested>,
                                     protocolOf<Readable>),
              nullptr);
}

TEST(PVClassAndProtocolCast, TestsOnlyAsManyProtocolsAsCounted) {
    EXPECT_EQ(PVClassAndProtocolCast(&kText, classOf<String>, 1, protocolOf<Readable>,
                                     protocolOf<Untested>),
              kText.as<String>());
}

TEST(PVClassAndProtocolCast, WantsTheClassToo) {
    EXPECT_EQ(PVClassAndProtocolCast(&kArray, classOf<String>, 1, protocolOf<Countable>), nullptr);
}

TEST(PVClassAndProtocolCast, GivesTheSameObjectOfASubclass) {
    const std::shared_ptr<const Figure> book = std::make_shared<const Book>();
    const std::shared_ptr<const Sheet> cast = PVClassAndProtocolCast(
        book, classOf<Sheet>, 2, protocolOf<Readable>, protocolOf<Countable>);

    EXPECT_EQ(cast, book);
    EXPECT_EQ(PVClassAndProtocolCast(book, classOf<Sheet>, 1, protocolOf<Untested>), nullptr);
}

TEST(PVClassAndProtocolCast, GivesNullForNull) {
    const Value* value = nullptr;
    const std::shared_ptr<Figure> shape;

    EXPECT_EQ(PVClassAndProtocolCast(value, classOf<String>, 0), nullptr);
    EXPECT_EQ(PVClassAndProtocolCast(shape, classOf<Figure>, 1, protocolOf<Readable>), nullptr);
}

TEST(PVRefTypeCast, WantsTheValuesOwnKind) {
    EXPECT_EQ(PVRefTypeCast(TypeID::String, &kText), &kText);
    EXPECT_EQ(PVRefTypeCast(TypeID::Number, &kNumber), &kNumber);
    EXPECT_EQ(PVRefTypeCast(TypeID::String, &kNumber), nullptr);
    EXPECT_EQ(PVRefTypeCast(TypeID::Null, nullptr), nullptr);
}

TEST(PVRefTypeCast, WantsTheObjectsExactClass) {
    const std::shared_ptr<Figure> book = std::make_shared<Book>();

    EXPECT_EQ(PVRefTypeCast(typeid(Book), book), book);
    EXPECT_EQ(PVRefTypeCast(typeid(Sheet), book), nullptr);
    EXPECT_EQ(PVRefTypeCast(typeid(Figure), std::shared_ptr<Figure>()), nullptr);
}

}  // namespace
}  // namespace parvel::testing
