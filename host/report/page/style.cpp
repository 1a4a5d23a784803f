#include "host/report/page/style.h"

namespace quazor {

std::string_view pageStyle() {
  return R"css(
:root{color-scheme:light dark;--ground:#fff;--panel:#f5f6f8;--text:#1b1f24;--soft:#525b66;--line:#d5dae0;
--link:#0b57a4;--pass:#0b6b2e;--passground:#e3f4e8;--fail:#a3131f;--failground:#fde8e8;--error:#7a4300;
--errorground:#fff0d6;--skip:#45525f;--skipground:#e9edf1;--curve:#0b57a4;--second:#b04a00;--allowed:#9fd3b0}
@media (prefers-color-scheme:dark){:root{--ground:#14171b;--panel:#1d2127;--text:#e6e9ed;--soft:#a9b3be;--line:#39414a;
--link:#7db8f5;--pass:#7fdc9a;--passground:#12351f;--fail:#ff9a9a;--failground:#431a1d;--error:#ffc36b;
--errorground:#402c0c;--skip:#b6c0ca;--skipground:#2a3138;--curve:#7db8f5;--second:#ffb27a;--allowed:#2c6b40}}
*{box-sizing:border-box}
body{margin:0;background:var(--ground);color:var(--text);font:16px/1.5 system-ui,-apple-system,"Segoe UI",Roboto,
"Noto Sans","Liberation Sans",sans-serif;overflow-wrap:break-word}
header,main,footer{max-width:72rem;margin:0 auto;padding:0 1.25rem}
header{max-width:none;padding:0;color:#fff;background:#45525f}
header>div{max-width:72rem;margin:0 auto;padding:1.25rem}
header.pass{background:#0b6b2e}header.fail{background:#a3131f}header.error{background:#8a4b00}
h1,h2,h3,h4,h5,h6{line-height:1.25;margin:1.6rem 0 .6rem;font-weight:650}
h1{font-size:1.3rem;margin:.2rem 0;font-weight:600}h1 .word{font-size:3.2rem;line-height:1.1;
font-weight:750;letter-spacing:.02em;margin-right:.6rem}h1 .sentence{display:block}
.device{display:inline-block;border:2px solid;border-radius:4px;padding:.1rem .6rem;font-size:1.1rem;vertical-align:.6rem}
h2{font-size:1.45rem}h3{font-size:1.2rem}h4{font-size:1.05rem}h5,h6{font-size:1rem}
p{margin:.5rem 0}header p{margin:.1rem 0}
a{color:var(--link)}
a:focus-visible,summary:focus-visible,input:focus-visible,.scroll:focus-visible{outline:3px solid var(--link);
outline-offset:2px}
.stop{border-left:.4rem solid #a3131f;background:var(--failground);color:var(--fail);font-weight:650;padding:.7rem 1rem}
.finding{border:1px solid var(--line);border-left:.4rem solid var(--fail);background:var(--panel);padding:.2rem 1.2rem .8rem;
margin:1rem 0;border-radius:4px}
.finding.error{border-left-color:var(--error)}.finding.skip{border-left-color:var(--skip)}
.finding>:first-child{margin-top:.7rem}
.finding .what{font-size:1.1rem}
.badge{display:inline-block;padding:0 .5em;border-radius:4px;font-size:.875rem;font-weight:650;white-space:nowrap;
background:var(--skipground);color:var(--skip)}
.badge.pass{background:var(--passground);color:var(--pass)}.badge.fail{background:var(--failground);color:var(--fail)}
.badge.error,.badge.warn{background:var(--errorground);color:var(--error)}
.none,small,.soft{color:var(--soft)}
td small{display:block}
.scroll{overflow-x:auto}
table{border-collapse:collapse;margin:.6rem 0 1.2rem;font-size:.9375rem}
caption{text-align:left;color:var(--soft);padding:.2rem 0}
th,td{text-align:left;vertical-align:top;padding:.25rem .6rem .25rem .25rem;border-bottom:1px solid var(--line)}
thead th{border-bottom:2px solid var(--line);font-weight:600;vertical-align:bottom}
thead .number{white-space:normal}tbody th{font-weight:500;min-width:7rem}
.line,.whole,h1,h2,h3,h4,p{overflow-wrap:anywhere}
.number{text-align:right;font-variant-numeric:tabular-nums;white-space:nowrap}
tr.bad th,tr.bad td{background:var(--failground)}
.line,pre,code{white-space:pre-wrap;font-family:ui-monospace,"DejaVu Sans Mono",Menlo,Consolas,monospace;font-size:.875rem}
pre{background:var(--panel);border:1px solid var(--line);border-radius:4px;padding:.7rem 1rem;margin:.5rem 0}
.whole{max-height:8rem;overflow:auto;color:var(--soft)}
.first{color:var(--curve);font-weight:650}.second{color:var(--second);font-weight:650}
details{border:1px solid var(--line);border-radius:6px;margin:.8rem 0;padding:0 1.1rem}
details[open]{padding-bottom:.8rem}
summary{cursor:pointer;padding:.7rem 0}
summary :is(h2,h3,h4){display:inline;font-size:1.15rem;margin:0}
details details{border:0;padding:0;margin:.2rem 0}
details details summary{padding:.3rem 0}
details details summary :is(h3,h4,h5){font-size:1.05rem}
figure{margin:.6rem 0 1rem}figcaption{color:var(--soft);font-size:.875rem}
svg{display:block;max-width:100%}
svg.bar{width:160px;height:16px;margin-top:.25rem}
.axis{stroke:var(--line);stroke-width:1}.allowed{fill:var(--allowed)}.bound{stroke:var(--text);stroke-width:2}
circle.pass{fill:var(--pass)}circle.fail{fill:var(--fail)}circle{stroke:var(--ground);stroke-width:1}
svg.plot{width:720px}
.chart{width:720px;max-width:100%;height:220px}.live .dygraph-axis-label,.live .dygraph-legend{color:var(--soft);
background:none}.legend{min-height:1.5em;margin:.2rem 0}.buttons{margin:.2rem 0}
button{font:inherit;font-size:.875rem;padding:.2rem .7rem;color:var(--text);background:var(--panel);
border:1px solid var(--soft);border-radius:4px}
@media screen{.live>svg{display:none}}@media print{.chart,.legend,.buttons{display:none}}
.ground{fill:var(--panel);stroke:var(--line)}.curve,.curve0,.curve1{fill:none;stroke:var(--curve);stroke-width:1.5;
stroke-linejoin:round}
.curve1{stroke:var(--second)}.median{stroke:var(--soft);stroke-dasharray:4 4;fill:none}
.mark{stroke:var(--fail);stroke-width:1.5;stroke-opacity:.55;fill:none}
svg text{font-size:12px;fill:var(--soft)}svg .end{text-anchor:end}
.images{display:flex;flex-wrap:wrap;gap:.75rem}.image{margin:0;width:200px}
svg.samples{width:200px;height:60px;background:var(--panel)}
.filter{border:1px solid var(--line);border-radius:4px;display:inline-block;padding:.1rem .8rem .4rem}
.filter label{margin-right:.8rem;white-space:nowrap}
.log:has(.some:checked) tr.debug,.log:has(.errors:checked) tr:is(.debug,.default){display:none}
tr.debug td{color:var(--soft)}table tr.error td{color:var(--fail)}
footer{color:var(--soft);font-size:.875rem;padding-top:1.5rem;padding-bottom:2rem}
@media (max-width:40rem){h1 .word{font-size:2.4rem}header>div,main,footer{padding-left:.9rem;padding-right:.9rem}
details{padding:0 .7rem}svg.plot{min-width:560px}}
@media print{:root{color-scheme:light;--ground:#fff;--panel:#fff;--text:#000;--soft:#333;--line:#999;--link:#000;
--pass:#000;--passground:#fff;--fail:#000;--failground:#fff;--error:#000;--errorground:#fff;--skip:#000;
--skipground:#fff;--curve:#000;--second:#555;--allowed:#ccc}
body{font-size:10pt}header,header.pass,header.fail,header.error{color:#000;background:#fff;border-bottom:2pt solid #000}
details,details[open]{border:0;padding:0}details::details-content{content-visibility:visible;block-size:auto}
.badge{border:1px solid #000}.filter{display:none}.whole{max-height:none}
.log tr:is(.debug,.default,.error){display:table-row!important}
tr,figure,.finding{break-inside:avoid}thead{display:table-header-group}h2,h3,h4{break-after:avoid}
tr.bad th,tr.bad td{border-bottom:2pt solid #000;font-weight:700}}
)css";
}

}  // namespace quazor
