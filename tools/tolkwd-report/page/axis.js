// The axis: ticks at round times of the log's clock, and above them the day, or the year, that they
// are in.

const kSteps = [
    ...[1, 5, 10, 30].map((n) => ({seconds: n, every: d3.utcSecond.every(n), form: '%H:%M:%S'})),
    ...[1, 5, 10, 30].map((n) => ({seconds: n * kMinuteSeconds, every: d3.utcMinute.every(n),
                                   form: '%H:%M'})),
    ...[1, 3, 6, 12].map((n) => ({seconds: n * kHourSeconds, every: d3.utcHour.every(n),
                                  form: '%H:%M'})),
    {seconds: kDaySeconds, every: d3.utcDay, form: '%-d %b'},
    {seconds: 2 * kDaySeconds, every: d3.utcDay.every(2), form: '%-d %b'},
    {seconds: 7 * kDaySeconds, every: d3.utcMonday, form: '%-d %b'},
    {seconds: 28 * kDaySeconds, every: d3.utcMonth, form: '%b'},
    {seconds: 90 * kDaySeconds, every: d3.utcMonth.every(3), form: '%b'},
    ...[1, 2, 5, 10, 50, 100].map((n) => ({seconds: n * 365 * kDaySeconds,
                                           every: d3.utcYear.every(n), form: '%Y'})),
];
const kDays = {every: d3.utcDay, form: d3.utcFormat('%a %-d %b %Y')};
const kYears = {every: d3.utcYear, form: d3.utcFormat('%Y')};

const kTickPixels = 68;
const kContextPixels = 124;
const kTicksHeight = 40;

function stepfor(view, width) {
    const least = (kTickPixels * view.length) / Math.max(width, 1);
    return kSteps.find(({seconds}) => seconds >= least) ?? kSteps[kSteps.length - 1];
}

// Where the clock shows the round times of `every` in what is shown: their places and dates.
function roundtimes(every, view, clock) {
    return clock.stretches(view.from, view.to).flatMap(({from, to, offset}) =>
        every.range(every.ceil(new Date((from + offset) * 1000)), new Date((to + offset) * 1000 + 1))
            .map((date) => ({place: date / 1000 - offset, date})));
}

// Without those that would run into the one before.
function apart(ticks, scale, pixels) {
    let last = -Infinity;
    return ticks.filter(({place}) => {
        const x = scale(place);
        const fits = x - last >= pixels;
        last = fits ? x : last;
        return fits;
    });
}

// The days or years: each where it begins, and the one in which the picture begins at its edge.
function contexts(step, view, clock, scale) {
    if (step.every === kSteps[kSteps.length - 1].every || step.form === '%Y') {
        return [];
    }
    const {every, form} = step.seconds < kDaySeconds ? kDays : kYears;
    const begun = roundtimes(every, view, clock)
        .map(({place, date}) => ({x: scale(place), text: form(date), edge: false}));
    const first = begun.length > 0 ? begun[0].x : Infinity;
    const edge = {x: 0, text: form(new Date(clock.at(view.from) * 1000)), edge: true};
    const all = first >= kContextPixels ? [edge, ...begun] : begun;
    let last = -Infinity;
    return all.filter(({x}) => {
        const fits = x - last >= kContextPixels;
        last = fits ? x : last;
        return fits;
    });
}

// All that axis and lines draw for a view on `width` pixels.
function ticksof(view, clock, width) {
    const scale = d3.scaleLinear().domain([view.from, view.to]).range([0, width]);
    const step = stepfor(view, width);
    const form = d3.utcFormat(step.form);
    const ticks = apart(roundtimes(step.every, view, clock), scale, kTickPixels * 0.6);
    return {
        scale,
        ticks: ticks.map(({place, date}) => ({x: scale(place), text: form(date)})),
        contexts: contexts(step, view, clock, scale),
        seams: clock.changed(view.from, view.to)
            .map(({place, by}) => ({x: scale(place), by})),
    };
}

function linesdown(group, className, data, height) {
    group.selectAll(`line.${className}`).data(data).join('line').attr('class', className)
        .attr('x1', ({x}) => x).attr('x2', ({x}) => x).attr('y1', 0).attr('y2', height);
}

function drawaxis(svg, {ticks, contexts: days, seams}, width) {
    svg.attr('viewBox', `0 0 ${width} ${kTicksHeight}`);
    svg.selectAll('line.tick').data(ticks).join('line').attr('class', 'tick')
        .attr('x1', ({x}) => x).attr('x2', ({x}) => x)
        .attr('y1', kTicksHeight - 5).attr('y2', kTicksHeight);
    svg.selectAll('text.tick').data(ticks).join('text').attr('class', 'tick')
        .attr('y', kTicksHeight - 9).attr('x', ({x}) => x)
        .attr('text-anchor', ({x}) => (x < 20 ? 'start' : x > width - 20 ? 'end' : 'middle'))
        .text(({text}) => text);
    svg.selectAll('text.context').data(days).join('text').attr('class', 'context')
        .attr('y', 13).attr('x', ({x, edge}) => (edge ? 0 : x + 4))
        .text(({text}) => text)
        .attr('visibility', ({x}) => (x + kContextPixels * 0.8 > width && x > 0 ? 'hidden' : null));
    svg.selectAll('line.begin').data(days.filter(({edge}) => !edge)).join('line')
        .attr('class', 'begin').attr('x1', ({x}) => x).attr('x2', ({x}) => x)
        .attr('y1', 3).attr('y2', kTicksHeight);
    linesdown(svg, 'seam', seams, kTicksHeight);
}
