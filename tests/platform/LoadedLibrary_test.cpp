#include "parvel/platform/linux/LoadedLibrary.h"

#include <gtest/gtest.h>
#include <stdlib.h>

#include "parvel/platform/linux/Libcrypto.h"
#include "parvel/platform/linux/Libicui18n.h"
#include "parvel/platform/linux/Libisal.h"
#include "parvel/platform/linux/Libsystemd.h"
#include "parvel/platform/linux/Libzip.h"
#include "tests/support/AbsentLibrary.h"

namespace parvel::testing {
namespace {

class TheCLibrary : public host::LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const TheCLibrary& named(const char* soname) { return loadedOnce<TheCLibrary>(soname); }

    PARVEL_LOADED_FUNCTION(atoi);
};

TEST(LoadedLibrary, EachHasAllOfItsFunctionsHere) {
    EXPECT_TRUE(host::Libcrypto::host().isComplete());
    EXPECT_TRUE(host::Libicui18n::host().isComplete());
    EXPECT_TRUE(host::Libisal::host().isComplete());
    EXPECT_TRUE(host::Libsystemd::host().isComplete());
    EXPECT_TRUE(host::Libzip::host().isComplete());
}

TEST(LoadedLibrary, HasTheFunctionsThatAreLinkedByName) {
    EXPECT_EQ(host::Libzip::host().zip_fread, &::zip_fread);
    EXPECT_EQ(host::Libsystemd::host().sd_bus_new, &::sd_bus_new);
}

TEST(LoadedLibrary, IsLoadedByTheFirstCallThatFindsItAndKept) {
    EXPECT_FALSE(TheCLibrary::named("libabsent.so.1").isComplete());
    const TheCLibrary& found = TheCLibrary::named("libc.so.6");

    EXPECT_TRUE(found.isComplete());
    EXPECT_EQ(found.atoi("7"), 7);
    EXPECT_EQ(&TheCLibrary::named("libabsent.so.1"), &found);
}

TEST(LoadedLibrary, IsNotCompleteWhereThereIsNone) {
    EXPECT_FALSE(absentLibrary<host::Libzip>().isComplete());
    EXPECT_EQ(absentLibrary<host::Libzip>().zip_fread, nullptr);
}

TEST(LoadedLibrary, IsNotCompleteWhereItLacksAFunction) {
    const host::Libzip another("libc.so.6");

    EXPECT_FALSE(another.isComplete());
}

}  // namespace
}  // namespace parvel::testing
