// The style sheet of the HTML page.
#pragma once

namespace vela {

/// Refers to nothing outside the page. Every state is shown by words and by a border or a pattern,
/// not by its colour alone.
inline constexpr const char* kHtmlStyle = R"css(
:root{color-scheme:light dark;--bg:#f3f5f7;--card:#fff;--text:#1c2128;--soft:#535c66;--line:#d3d9df;
--well:#e9edf1;--present:#1a7f4b;--missing:#c98a00;--missing-soft:#ffe9b3;--missing-text:#6b4a00;
--failed:#c62834;--failed-soft:#fdecec;--failed-text:#a31621;--on-failed:#fff;--accent:#2459a8}
@media (prefers-color-scheme:dark){:root{--bg:#10141a;--card:#1a2029;--text:#e5eaf0;--soft:#a0abb8;
--line:#343d49;--well:#11161d;--present:#3aa76d;--missing:#d9a227;--missing-soft:#4a3a10;
--missing-text:#f2cf7a;--failed:#ef5d66;--failed-soft:#361a1e;--failed-text:#ff9da3;
--on-failed:#2a0508;--accent:#8ab4f8}}
*{box-sizing:border-box}
body{margin:0;background:var(--bg);color:var(--text);
font:16px/1.45 system-ui,-apple-system,"Segoe UI",Roboto,"Helvetica Neue",Arial,sans-serif;
-webkit-text-size-adjust:100%}
body>header,main,footer{max-width:90rem;margin:0 auto;padding:0 1rem}
h1,h2,p,dl,dd,ul,fieldset{margin:0;padding:0}
h1{font-size:1.6rem;line-height:1.2;padding-top:1.5rem}
.lead{color:var(--soft);margin:.25rem 0 1rem}
.panel{background:var(--card);border:1px solid var(--line);border-radius:.75rem;padding:1rem}
.headline{font-size:1.05rem;margin-bottom:.6rem}
.headline b{font-size:1.5rem}
.bar{display:flex;gap:2px;height:1.1rem;overflow:hidden;border-radius:.55rem;background:var(--well)}
.bar.thin{height:.4rem;border-radius:.2rem;margin:.5rem 0 .75rem}
.bar span{flex:0 0 auto;min-width:4px}
span.present{background:var(--present)}
span.missing{background:repeating-linear-gradient(135deg,var(--missing) 0 4px,var(--missing-soft)
4px 7px)}
span.failed{background:var(--failed)}
.legend{display:flex;flex-wrap:wrap;gap:.4rem 1.5rem;list-style:none;margin-top:.75rem;
font-size:.9rem}
.legend li{display:flex;align-items:center;gap:.5rem}
.legend i{width:1.1rem;height:1.1rem;flex:none;border-radius:.25rem;background:var(--well)}
.legend i.done{border:1px solid var(--line);background:var(--present)}
.legend i.missing{border:2px dashed var(--missing);background:var(--missing-soft)}
.legend i.failed{border:2px solid var(--failed);background:var(--failed)}
.numbers{display:grid;grid-template-columns:repeat(auto-fill,minmax(7.5rem,1fr));gap:.75rem;
margin-top:1rem;border-top:1px solid var(--line);padding-top:1rem}
.numbers div{display:flex;flex-direction:column-reverse;justify-content:flex-end}
.numbers dt{color:var(--soft);font-size:.85rem}
.numbers dd{font-size:1.35rem;font-weight:600;font-variant-numeric:tabular-nums;line-height:1.2}
.show{display:flex;flex-wrap:wrap;gap:.25rem 1.25rem;border:0;margin:1rem 0 0;font-size:.9rem}
.show legend{float:left;padding:.35rem 0;color:var(--soft)}
.show label{display:flex;align-items:center;gap:.4rem;padding:.35rem 0;cursor:pointer}
.show input{margin:0;accent-color:var(--accent)}
body:has(#show-work:checked) .tile.done,body:has(#show-failed:checked) .tile:not(.failed){
display:none}
section{margin-top:1.75rem}
h2{font-size:1.05rem;line-height:1.35;overflow-wrap:anywhere}
.queued{display:inline-block;margin-left:.5rem;padding:.05rem .55rem;border:1px solid var(--accent);
border-radius:1rem;color:var(--accent);font-size:.78rem;font-weight:600;vertical-align:.1em;
white-space:nowrap}
.counts{color:var(--soft);font-size:.9rem;margin-top:.15rem}
.counts span:not(:last-child)::after{content:" · "}
.grid{display:grid;grid-template-columns:repeat(auto-fill,minmax(9.25rem,1fr));gap:.6rem;
list-style:none}
.tile{display:flex;flex-direction:column;min-width:0;padding-bottom:.5rem;background:var(--card);
border:1px solid var(--line);border-radius:.6rem;overflow:hidden;content-visibility:auto;
contain-intrinsic-size:auto 9.25rem auto 10rem}
.tile.missing,.tile.unknown{border:2px dashed var(--missing)}
.tile.failed{border:2px solid var(--failed);background:var(--failed-soft)}
.pic{position:relative;display:flex;aspect-ratio:4/3;background:var(--well)}
.pic img{position:absolute;inset:0;width:100%;height:100%;object-fit:contain;
font-size:.75rem;color:var(--soft)}
.none{margin:auto;color:var(--soft);font-size:.8rem}
.mark{position:absolute;top:.4rem;left:.4rem;padding:.05rem .5rem;border-radius:.3rem;
font-size:.75rem;line-height:1.45;background:var(--missing-soft);color:var(--missing-text);
border:1px solid var(--missing)}
.failed .mark{background:var(--failed);color:var(--on-failed);border-color:var(--failed)}
.name,.note{padding:0 .6rem;overflow-wrap:anywhere}
.name{display:-webkit-box;-webkit-box-orient:vertical;-webkit-line-clamp:2;overflow:hidden;
flex:none;margin-top:.45rem;font-size:.85rem;font-weight:500;line-height:1.35}
.note{margin-top:.3rem;font-size:.76rem;line-height:1.4;color:var(--soft)}
.failed .note{color:var(--failed-text)}
.note time{white-space:nowrap}
.empty{color:var(--soft);font-size:.9rem;margin-top:.5rem}
footer{padding-top:2rem;padding-bottom:2rem;color:var(--soft);font-size:.8rem}
@media (min-width:40rem){.grid{grid-template-columns:repeat(auto-fill,minmax(10.5rem,1fr));
gap:.75rem}body>header,main,footer{padding-left:1.5rem;padding-right:1.5rem}}
@media print{.show{display:none}.tile{content-visibility:visible;break-inside:avoid}}
)css";

}  // namespace vela
