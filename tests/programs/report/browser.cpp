#include "programs/report/browser.hpp"

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>
#include <png.h>

#include "support/process.hpp"

namespace report::test {

namespace {

std::string write_page(const std::string& html, const std::string& folder)
{
    const std::string path = folder + "/page.html";
    std::ofstream(path, std::ios::binary) << html;
    return path;
}

/// The processes of a browser inherit no more than they need: as root it has no sandbox, and in a
/// container little shared memory.
kz::test::ProcessResult run_browser(const std::vector<std::string>& options,
                                    const std::string& folder, const std::string& page,
                                    uint32_t width, uint32_t height)
{
    std::vector<std::string> arguments = {browser(),
                                          "--no-sandbox",
                                          "--disable-gpu",
                                          "--disable-dev-shm-usage",
                                          "--disable-background-networking",
                                          "--hide-scrollbars",
                                          "--force-device-scale-factor=1",
                                          "--user-data-dir=" + folder + "/profile",
                                          "--window-size=" + std::to_string(width) + "," +
                                              std::to_string(height)};
    arguments.insert(arguments.end(), options.begin(), options.end());
    arguments.push_back("file://" + page);
    return kz::test::run(arguments);
}

Picture read_picture(const std::string& path)
{
    Picture picture;
    png_image image = {};
    image.version = PNG_IMAGE_VERSION;
    EXPECT_NE(0, png_image_begin_read_from_file(&image, path.c_str())) << image.message;
    image.format = PNG_FORMAT_RGB;
    picture.width = image.width;
    picture.height = image.height;
    picture.bytes.resize(PNG_IMAGE_SIZE(image));
    EXPECT_NE(0, png_image_finish_read(&image, nullptr, picture.bytes.data(), 0, nullptr))
        << image.message;
    return picture;
}

} // namespace

int Colour::distance(const Colour& other) const
{
    return std::max(
        {std::abs(red - other.red), std::abs(green - other.green), std::abs(blue - other.blue)});
}

Colour Picture::at(uint32_t x, uint32_t y) const
{
    const size_t place = 3 * (size_t{y} * width + x);
    return {bytes[place], bytes[place + 1], bytes[place + 2]};
}

size_t Picture::count(const Colour& colour, int within) const
{
    size_t near = 0;
    for (uint32_t y = 0; y < height; ++y) {
        for (uint32_t x = 0; x < width; ++x) {
            near += at(x, y).distance(colour) <= within ? 1U : 0U;
        }
    }
    return near;
}

std::string browser()
{
    for (const char* path : {"/usr/bin/chromium-headless-shell", "/usr/bin/chromium"}) {
        if (std::filesystem::exists(path)) {
            return path;
        }
    }
    return {};
}

Picture picture_of(const std::string& html, const std::string& folder, Theme theme, uint32_t width,
                   uint32_t height)
{
    const std::string path = folder + "/page.png";
    std::filesystem::remove(path);
    const auto done = run_browser(
        {std::string("--blink-settings=preferredColorScheme=") + (theme == Theme::dark ? "0" : "1"),
         "--screenshot=" + path},
        folder, write_page(html, folder), width, height);
    EXPECT_EQ(0, done.status) << done.err;
    return read_picture(path);
}

int overflow_of(const std::string& html, const std::string& folder, uint32_t width)
{
    // The page itself runs no script and allows none: a copy of it does.
    std::string probed = html;
    const size_t policy = probed.find("<meta http-equiv");
    probed.erase(policy, probed.find("/>", policy) + 2 - policy);
    const std::string probe =
        "<script>var e=document.documentElement;"
        "e.setAttribute('data-overflow',e.scrollWidth-e.clientWidth);</script>";
    probed.insert(probed.find("</body>"), probe);
    const auto done = run_browser({"--dump-dom"}, folder, write_page(probed, folder), width, 800);
    const std::string mark = "data-overflow=\"";
    const size_t found = done.out.find(mark);
    if (found == std::string::npos) {
        ADD_FAILURE() << "the page was not shown: " << done.err;
        return -1;
    }
    return std::atoi(done.out.c_str() + found + mark.size());
}

} // namespace report::test
