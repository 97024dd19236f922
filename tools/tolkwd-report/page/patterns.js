// How states and marks look. Each state has a colour and, but for the calm one, a pattern of its
// own, so that it is known without the colour. The colours themselves are in the style.

const kTile = 8;
const kRising = 'M-2,2l4,-4M0,8l8,-8M6,10l4,-4';
const kFalling = 'M-2,6l4,4M0,0l8,8M6,-2l4,4';

// What a state means, and the lines of its pattern in a tile.
const kLooks = {
    'up': {means: 'runs, and works as far as it is checked', lines: ''},
    'busy': {means: 'over a threshold: runs, its checks are skipped', lines: 'M2,2h.01M6,6h.01',
             dots: true},
    'not-watched': {means: 'no thread watches it', lines: 'M0,8l8,-8'},
    'command-not-recognised': {means: 'runs, but its check cannot be run', lines: 'M2,0v8M6,0v8'},
    'suspect': {means: 'its status command failed and is being retried', lines: kRising},
    'functional-failure': {means: 'its check failed and is being retried', lines: kFalling},
    'recovering': {means: 'stopped and started because of its status', lines: 'M0,2h8M0,6h8'},
    'functional-recovering': {means: 'stopped and started because of its check',
                              lines: 'M0,6l4,-4l4,4'},
    'unknown-service': {means: 'its status command does not know it; no longer watched',
                        lines: 'M0,4h8M4,0v8'},
    'gave-up': {means: 'recovered in vain; no longer watched', lines: 'M1,1l6,6M7,1l-6,6'},
};

const kGuessMeans = 'inferred: no message of the log says that it began, or when';

// Signs of 8 by 8 around their middle, the gravest last: where several meet it is the one shown.
// The other kinds of marks show as the beginning of a state, if at all, and are told in words only.
const kSigns = [
    {name: 'other', path: 'M-1.5,0a1.5,1.5 0 1,0 3,0a1.5,1.5 0 1,0 -3,0z'},
    {name: 'recovered', means: 'recovered', path: 'M-3.5,0a3.5,3.5 0 1,0 7,0a3.5,3.5 0 1,0 -7,0z'},
    {name: 'recovery-tried', means: 'recovery tried', path: 'M0,-4l4,7.5h-8z'},
    {name: 'gave-up', means: 'given up', path: 'M-3.5,-3.5l7,7M3.5,-3.5l-7,7', line: true},
];

// Its place among them.
function signof({kind}) {
    return Math.max(0, kSigns.findIndex(({name}) => name === kind));
}

function drawpattern(defs, word, inferred) {
    const {lines = '', dots = false} = kLooks[word] ?? {};
    const pattern = defs.append('pattern')
        .attr('id', lookname(word, inferred))
        .attr('class', `look ${word}`)
        .attr('patternUnits', 'userSpaceOnUse')
        .attr('width', kTile)
        .attr('height', kTile);
    const whole = (className) => pattern.append('rect')
        .attr('class', className).attr('width', kTile).attr('height', kTile);
    whole('base');
    pattern.append('path').attr('class', dots ? 'ink dots' : 'ink').attr('d', lines);
    if (inferred) {
        whole('veil');
        pattern.append('path').attr('class', 'hatch').attr('d', kFalling);
    }
}

function drawpatterns(states) {
    const defs = d3.select('#patterns');
    for (const word of states) {
        drawpattern(defs, word, false);
        drawpattern(defs, word, true);
    }
}

function lookname(word, inferred) {
    return `look-${word}${inferred ? '-inferred' : ''}`;
}

function lookof(word, inferred) {
    return `url(#${lookname(word, inferred)})`;
}

// A small picture of a state for the text.
function swatch(word, inferred) {
    const svg = d3.create('svg').attr('class', 'swatch').attr('aria-hidden', 'true')
        .attr('viewBox', '0 0 24 16');
    svg.append('rect').attr('width', 24).attr('height', 16).attr('fill', lookof(word, inferred));
    return svg.node();
}

function signpicture(sign) {
    const svg = d3.create('svg').attr('class', 'sign').attr('aria-hidden', 'true')
        .attr('viewBox', '-6 -6 12 12');
    svg.append('path').attr('class', `mark ${sign.name}`).classed('line', sign.line === true)
        .attr('d', sign.path);
    return svg.node();
}

// A state in words, with its picture and, where it is one, the sign of an inference.
function stateword(word, inferred) {
    const shown = element('span', 'state');
    shown.append(swatch(word, inferred), element('span', '', word));
    if (inferred) {
        const guess = element('b', 'guess', '~');
        guess.title = kGuessMeans;
        shown.append(guess, element('span', 'unseen', ' (inferred)'));
    }
    return shown;
}

const kChangesTold = 3;

function changesinwords(clock, {from, to}) {
    const changes = clock.changed(from, to);
    const told = changes.slice(0, kChangesTold).map(({place, by}) =>
        `${by > 0 ? 'forward' : 'back'} ${spantext(Math.abs(by))}, to ${clocktext(clock.at(place))}`);
    const more = changes.length > told.length ? '; and more' : '';
    return `the clock of the log was set ${told.join('; ')}${more}`;
}

// What is in the time lines, and no more.
function drawlegend(target, {services, clock, extent}) {
    const spans = services.flatMap((service) => service.spans);
    const words = new Set(spans.map((span) => span.word));
    const signs = new Set(services.flatMap((service) => service.marks).map(signof));
    const list = element('ul');
    const add = (picture, term, means) => {
        const item = element('li');
        item.append(picture, element('b', '', term), element('span', '', means));
        list.append(item);
    };
    Object.keys(kLooks).filter((word) => words.has(word))
        .forEach((word) => add(swatch(word, false), word, kLooks[word].means));
    if (spans.some((span) => span.inferred)) {
        add(swatch('up', true), '~ lighter, hatched', kGuessMeans);
    }
    kSigns.filter((sign, i) => i > 0 && signs.has(i))
        .forEach((sign) => add(signpicture(sign), sign.means, ''));
    if (clock.changed(extent.from, extent.to).length > 0) {
        add(element('span', 'seam'), 'dashed', changesinwords(clock, extent));
    }
    target.replaceChildren(list);
}
