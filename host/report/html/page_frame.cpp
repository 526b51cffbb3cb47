#include "host/report/html/page_frame.h"

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/report/html/style.h"

namespace host {

std::string pageStart(std::string_view title) {
    return fmt::format(
        R"(<!DOCTYPE html>
<html lang="en">
<head>
<meta charset="utf-8">
<meta name="viewport" content="width=device-width, initial-scale=1">
<meta name="color-scheme" content="light dark">
<meta http-equiv="Content-Security-Policy" content="default-src 'none'; style-src 'unsafe-inline'">
<title>{} · zrlab</title>
<style>
{}</style>
</head>
<body>
<a class="skip" href="#results">Skip to the results</a>
)",
        htmlText(title), kReportStyle);
}

std::string factHtml(std::string_view name, std::string_view value, std::string_view more) {
    return fmt::format("<div><dt>{}</dt><dd>{}{}</dd></div>\n", name, htmlText(value),
                       more.empty() ? "" : fmt::format(" <span>{}</span>", htmlText(more)));
}

}  // namespace host
