#include "host/report/html/figure.h"

#include <fmt/format.h>

#include "host/record/clean_text.h"

namespace host {

std::string figureHtml(const Figure& figure,
                       std::string_view attributes,
                       std::string_view content,
                       std::string_view legend) {
    return fmt::format(
        R"(<figure>
<figcaption><h{level}>{title}</h{level}><p>{caption}</p></figcaption>
<p class="y-label" aria-hidden="true">{yLabel}</p>
<svg {attributes} role="img" aria-labelledby="{id}-title {id}-desc">
<title id="{id}-title">{title}</title>
<desc id="{id}-desc">{yLabel} over {xLabel}. {caption}</desc>
{content}
</svg>
<p class="x-label" aria-hidden="true">{xLabel}</p>
{legend}</figure>
)",
        fmt::arg("title", htmlText(figure.title)), fmt::arg("caption", htmlText(figure.caption)),
        fmt::arg("xLabel", htmlText(figure.xLabel)), fmt::arg("yLabel", htmlText(figure.yLabel)),
        fmt::arg("id", figure.id), fmt::arg("level", figure.level),
        fmt::arg("attributes", attributes), fmt::arg("content", content),
        fmt::arg("legend", legend));
}

}  // namespace host
