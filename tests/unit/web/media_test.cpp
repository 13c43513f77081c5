#include "media.h"

#include <gtest/gtest.h>

namespace {

using web::ViewableType;

TEST(WebMedia, NothingThatABrowserRunsIsViewable) {
    for (const char* name :
         {"a.html", "a.htm", "a.svg", "a.xml", "a.xhtml", "a.js", "a.mjs", "a.pdf", "a.css",
          "a.swf", "a.txt", "a", "", ".", "png", "a.png.html", "a.png ", "a.svgz", "a.mht"}) {
        EXPECT_EQ(ViewableType(name), "") << name;
    }
}

TEST(WebMedia, PicturesFilmsAndSoundsAreKnownInAnyCase) {
    EXPECT_EQ(ViewableType("a.b.PNG"), "image/png");
    EXPECT_EQ(ViewableType("film.mp4"), "video/mp4");
    EXPECT_EQ(ViewableType("sound.Mp3"), "audio/mpeg");
}

}  // namespace
